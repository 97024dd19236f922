#!/bin/sh
set -eu
mkdir -p /opt/varden/tolk/bin
service cron start
# It becomes another process after it has written the file.
until [ "$(pidof cron)" = "$(cat /run/crond.pid)" ]; do sleep 0.05; done

# A program that root runs, and another user, too.
cp /bin/sleep /opt/sleeper
/opt/sleeper 600 >/dev/null 2>&1 &
setpriv --reuid=65534 --clear-groups /opt/sleeper 600 >/dev/null 2>&1 &
until [ "$(pidof /opt/sleeper | wc -w)" = 2 ]; do sleep 0.05; done
