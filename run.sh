#!/usr/bin/env bash
# Builds tolkwd and runs it. See usage below.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/scripts/setup.sh"

usage() {
    cat <<'TEXT'
usage: run.sh
           Shows the daemon at work in a sandbox: a real service is killed and brought back.
           Takes about a minute and leaves the machine's own services alone.
       run.sh -i FILE -l FILE [-t SECONDS] [-g]
           Runs the daemon for real, in the foreground, as root:
           -i  the configuration          -t  seconds between refreshes (120 or more; 10800)
           -l  the log file               -g  debug lines too
TEXT
}

case "${1-}" in
    -h | --help)
        usage
        exit 0
        ;;
esac

# A clone that root has built in cannot be built in by others.
[ ! -d "$root/build" ] || [ -w "$root/build" ] || fail "$root/build is not yours: remove it as root"

if [ $# -eq 0 ]; then
    setup build demo
    build release -DBUILD_TESTING=OFF
    "$root/scripts/demo/run.sh" "$root/build/release/src/tolkwd" "$root/build/demo"
    cat <<'TEXT'

Its log is kept. What it tells, as a table and as a page to open in a browser:
    build/release/tools/tolkwd-report/tolkwd-report status build/demo/tolkwd.log
    build/release/tools/tolkwd-report/tolkwd-report html -o outage.html build/demo/tolkwd.log
TEXT
    exit
fi

# Standard output belongs to the daemon's log.
setup build >&2
build release -DBUILD_TESTING=OFF >&2
# The daemon expects the folder of its pings' output; without it every ping would fail. Where it
# will refuse its arguments anyway, the machine is left as it is.
case " $* " in
    *" -i "*" -l "* | *" -l "*" -i "*)
        if [ ! -d /opt/varden/tolk/bin ]; then
            as_root mkdir -p /opt/varden/tolk/bin
            printf 'made /opt/varden/tolk/bin for the output of the pings\n' >&2
        fi
        ;;
esac
as_root true # fails here, with its reason, where there is no way to become root
if [ "$(id -u)" -eq 0 ]; then
    exec "$root/build/release/src/tolkwd" "$@"
fi
exec sudo "$root/build/release/src/tolkwd" "$@"
