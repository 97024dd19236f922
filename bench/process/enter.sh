#!/usr/bin/env bash
# enter.sh DESCRIPTORS COMMAND...: runs inside the sandbox: sets up a machine on which the daemon is
# installed, and becomes the command, of which the moment is recorded, with so many descriptors.
set -euo pipefail

mkdir -p /etc/opt/varden/tolk /opt/varden/tolk/bin
touch /etc/opt/varden/tolk/cimom /etc/opt/varden/tolk/wd.nxinstalled
# monit takes a control file only from its own user, and only if nobody else may read it.
[ ! -e /opt/bench/monitrc ] || install -m 600 /opt/bench/monitrc /tmp/monitrc

ulimit -Sn "$1"
shift
exec /opt/tools/launch "$@"
