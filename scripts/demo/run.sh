#!/usr/bin/env bash
# run.sh TOLKWD [FOLDER]: the demonstration of outage.sh with this program, in a sandbox. What the
# daemon logged is left in FOLDER, as tolkwd.log.
set -euo pipefail
demo=$(cd "$(dirname "$0")" && pwd)
tolkwd=$(realpath "$1")
keep=()
if [ $# -gt 1 ]; then
    mkdir -p "$2"
    keep=(--bind "$2" /opt/kept)
fi

exec "$demo/../sandbox.sh" "${keep[@]}" \
    --ro-bind "$tolkwd" /opt/varden/tolk/bin/tolkwd \
    --ro-bind "$demo" /opt/demo \
    --ro-bind "$demo/redis.conf" /etc/redis/redis.conf \
    --ro-bind "$demo/redis-server.default" /etc/default/redis-server \
    --ro-bind "$demo/nginx.conf" /etc/nginx/nginx.conf \
    -- /opt/demo/outage.sh
