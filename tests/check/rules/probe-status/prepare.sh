#!/bin/sh
set -eu
mkdir -p /opt/varden/tolk/bin
service cron start
# It becomes another process after it has written the file.
until [ "$(pidof cron)" = "$(cat /run/crond.pid)" ]; do sleep 0.05; done
