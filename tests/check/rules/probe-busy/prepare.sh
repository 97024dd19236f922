#!/bin/sh
set -eu
mkdir -p /opt/varden/tolk/bin
service cron start
# It becomes another process after it has written the file.
until [ "$(pidof cron)" = "$(cat /run/crond.pid)" ]; do sleep 0.05; done

# A program with three threads, under a name of its own.
cp "$(readlink -f /usr/bin/python3)" /opt/threads
/opt/threads -c '
import threading
import time
for _ in range(2):
    threading.Thread(target=time.sleep, args=(600,)).start()
open("/opt/threads-run", "w").close()
' >/dev/null 2>&1 &
until [ -e /opt/threads-run ]; do sleep 0.05; done
