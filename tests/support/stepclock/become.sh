#!/bin/sh
# become.sh OPTION...: inside the sandbox, becomes the daemon with these further options, on the
# clock that skips its pauses and with the machine's programs before all others. /run/daemon.pid has
# its process id.
set -eu

mkdir -p /etc/opt/varden/tolk /opt/varden/tolk/bin
touch /etc/opt/varden/tolk/cimom /etc/opt/varden/tolk/wd.nxinstalled
echo $$ >/run/daemon.pid

exec env PATH="/opt/machine:$PATH" LD_PRELOAD=/opt/clock.so STEPCLOCK_JOURNAL=/opt/results/journal \
    /opt/tolkwd/tolkwd -i /opt/results/tolkwd.xml -l /opt/results/tolkwd.log "$@"
