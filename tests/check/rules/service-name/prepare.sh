#!/bin/sh
mkdir -p /run/systemd/system
touch /run/systemd/system/cron_2.x+y:z@.service
