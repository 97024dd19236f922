#!/usr/bin/env bash
# Runs inside the sandbox. tolkwd watches redis-server, on which nginx depends; redis-server is
# killed; the log must show how it is missed, tried again, and recovered. The daemon's clock runs
# eight times as fast as the services' own.
#
# Exits with 0 only if the recovery stands in the log, in order, and both services run again under
# new process ids and answer.
set -euo pipefail

readonly log=/var/log/tolkwd.log
readonly speed=8
readonly health_seconds=60 recovery_seconds=180

say() { printf '\n== %s\n' "$*"; }

fail() {
    printf '\ndemonstration failed: %s\n' "$*" >&2
    ps -ef >&2
    exit 1
}

# await SECONDS TEXT: until the log holds TEXT.
await() {
    local deadline=$((SECONDS + $1))
    until grep -qF -- "$2" "$log" 2>/dev/null; do
        [ "$SECONDS" -lt "$deadline" ] || fail "not in the log after $1 s: $2"
        kill -0 "$daemon" 2>/dev/null || fail "tolkwd has ended"
        sleep 0.2
    done
}

# in_order TEXT...: whether the log holds these texts, each in a later line than the one before.
in_order() {
    local line
    while read -r line; do
        case $line in *"$1"*) shift ;; esac
        [ $# -gt 0 ] || return 0
    done <"$log"
    printf 'not in the log where it should be: %s\n' "$1" >&2
    return 1
}

redis_pid() { cat /run/redis/redis-server.pid; }
nginx_pid() { cat /run/nginx.pid; }
redis_answers() { [ "$(timeout 5 redis-cli ping 2>&1)" = PONG ]; }
nginx_runs() { service nginx status | grep -q 'is running'; }

# Also of a demonstration that failed; for whoever started it.
keep_log() {
    [ -d /opt/kept ] && [ -e "$log" ] || return 0
    cp "$log" /opt/kept/tolkwd.log
    chown --reference=/opt/kept /opt/kept/tolkwd.log
    chmod 644 /opt/kept/tolkwd.log
}
trap keep_log EXIT

mkdir -p /var/log/redis /var/log/nginx
chown redis:redis /var/log/redis /var/lib/redis
mkdir -p /etc/opt/varden/tolk
touch /etc/opt/varden/tolk/cimom /etc/opt/varden/tolk/wd.nxinstalled

say "redis-server and nginx start, tolkwd watches them (its clock runs $speed times as fast)"
service redis-server start
service nginx start
redis_before=$(redis_pid)
nginx_before=$(nginx_pid)

# Only tolkwd's own clock. The check in tolkwd.xml takes the library away altogether: redis-cli's
# allocator waits for ever on it.
clock=(/usr/lib/*/faketime/libfaketimeMT.so.1)
LD_PRELOAD=${clock[0]} FAKETIME="+0 x$speed" FAKETIME_ONLY_CMDS=tolkwd \
    /opt/varden/tolk/bin/tolkwd -i /opt/demo/tolkwd.xml -l "$log" -g &
daemon=$!
await "$health_seconds" "Functionalping result correct functional ping"

say "redis-server (process $redis_before) is killed"
kill -KILL "$redis_before"

await "$recovery_seconds" \
    "General ping failed for service redis-server, but this service has been general recoverred successfully."
kill "$daemon"
wait "$daemon" 2>/dev/null || true

in_order \
    "Functionalping result correct functional ping" \
    "General ping failed for service redis-server. Try to general ping more times now, if failed 3 times, will generally recover this service." \
    "General ping will be tried 2 more time(s)" \
    "General ping will be tried 1 more time(s)" \
    "General ping will be tried 0 more time(s)" \
    "Entry of general recover after getting write lock" \
    "Try the general recover for service redis-server" \
    "Executing stop command service nginx stop" \
    "All dependent services stopped" \
    "Executing start command service redis-server start" \
    "Service command start dep:service nginx start" \
    "Exit of general recover after release write lock" \
    "General ping successful!" \
    "General ping failed for service redis-server, but this service has been general recoverred successfully." \
    || fail "the log does not show the recovery in order"

redis_after=$(redis_pid)
nginx_after=$(nginx_pid)
[ "$redis_after" != "$redis_before" ] || fail "redis-server has its old process id"
[ "$nginx_after" != "$nginx_before" ] || fail "nginx was not restarted"
redis_answers || fail "redis-server does not answer"
nginx_runs || fail "nginx does not run"

say "shown: redis-server was killed (process $redis_before), missed, tried three times, recovered together with nginx, and runs again (process $redis_after)"
