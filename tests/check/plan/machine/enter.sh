#!/bin/sh
# enter.sh SECONDS: runs inside the sandbox. Sets up a machine with the service web, which runs and
# works, and becomes the daemon, with this refresh period, on the clock that skips its pauses.
#
# What happens is told by the environment: after the third time that web was asked (AFTER=status)
# or checked (AFTER=check) it is no longer in the state LOST: it does not run (LOST=runs), or its
# check fails (LOST=works). HELPS=yes: its next start helps. BUSY=yes: it is busy until its check
# has failed once.
set -eu

touch /run/runs /run/works
[ -z "${BUSY-}" ] || touch /run/busy
exec /opt/become.sh -t "$1" -g
