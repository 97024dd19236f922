#!/usr/bin/env bash
# sandbox.sh [BWRAP-OPTION...] -- COMMAND...
#
# Runs COMMAND as root on this machine's programs, but with a /opt, /etc/opt, /run, /tmp, /var/log
# and service data of its own, all empty, its own process ids and a network of its own with nothing
# but loopback. Everything else is read-only. What COMMAND leaves running ends with it. There are
# no traces of systemd inside, so the service command uses the init scripts.
set -euo pipefail

options=()
while [ $# -gt 0 ] && [ "$1" != -- ]; do
    options+=("$1")
    shift
done
if [ $# -lt 2 ]; then
    printf 'usage: sandbox.sh [BWRAP-OPTION...] -- COMMAND...\n' >&2
    exit 2
fi
shift

as_root=()
[ "$(id -u)" -eq 0 ] || as_root=(sudo)
private=()
for folder in /opt /etc/opt /run /tmp /var/tmp /var/log /var/lib/redis /var/lib/nginx; do
    [ ! -d "$folder" ] || private+=(--tmpfs "$folder")
done

exec "${as_root[@]}" bwrap --ro-bind / / --dev /dev --proc /proc "${private[@]}" \
    --unshare-pid --unshare-net --unshare-ipc --unshare-uts --die-with-parent --cap-add ALL \
    --clearenv --setenv PATH /usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin \
    --setenv LANG C.UTF-8 --chdir / "${options[@]}" "$@"
