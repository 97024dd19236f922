#!/usr/bin/env bash
# run.sh TOLKWD: the demonstration of outage.sh with this program, in a sandbox.
set -euo pipefail
demo=$(cd "$(dirname "$0")" && pwd)
tolkwd=$(realpath "$1")

exec "$demo/../sandbox.sh" \
    --ro-bind "$tolkwd" /opt/varden/tolk/bin/tolkwd \
    --ro-bind "$demo" /opt/demo \
    --ro-bind "$demo/redis.conf" /etc/redis/redis.conf \
    --ro-bind "$demo/redis-server.default" /etc/default/redis-server \
    --ro-bind "$demo/nginx.conf" /etc/nginx/nginx.conf \
    -- /opt/demo/outage.sh
