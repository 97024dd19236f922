#!/usr/bin/env bash
# Builds tolkwd and runs it. See usage below.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/scripts/setup.sh"

usage() {
    cat <<'TEXT'
usage: run.sh
           Shows the daemon at work in a sandbox: a real service is killed and brought back.
           Takes two minutes, and the time to install what is missing. Leaves the
           machine's own services alone.
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
    build release tolkwd -DBUILD_TESTING=OFF
    # The demonstration mostly waits.
    nice cmake --build "$root/build/release" --target tolkwd-report >"$root/build/report.out" 2>&1 &
    report=$!
    trap 'kill "$report" 2>/dev/null || true' EXIT
    "$root/scripts/demo/run.sh" "$root/build/release/src/tolkwd" "$root/build/demo"
    wait "$report" || fail "tolkwd-report does not build: $root/build/report.out"
    cat <<'TEXT'

The log is kept. To read it as a table, or as a page in a browser:
    build/release/tools/tolkwd-report/tolkwd-report status build/demo/tolkwd.log
    build/release/tools/tolkwd-report/tolkwd-report html -o outage.html build/demo/tolkwd.log

Not built yet: tolkwd-check, which checks a configuration, and the manual pages.
    cmake --build build/release     builds them (a minute)
    packaging/build.sh              builds everything and makes a Debian package of it
TEXT
    exit
fi

# Standard output belongs to the daemon's log.
setup build >&2
build release tolkwd -DBUILD_TESTING=OFF >&2
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
