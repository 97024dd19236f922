#!/bin/sh
set -eu
mkdir -p /opt/varden/tolk/bin
service cron start
