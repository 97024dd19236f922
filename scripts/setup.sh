# Sourced by run.sh, test.sh and the like: installs what is missing on a Debian machine, and builds.
# shellcheck shell=bash

root=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)

fail() {
    printf '%s\n' "$*" >&2
    exit 1
}

# Runs a command as root.
as_root() {
    if [ "$(id -u)" -eq 0 ]; then
        "$@"
    elif command -v sudo >/dev/null; then
        sudo "$@"
    else
        fail "this needs root, and there is no sudo: $*"
    fi
}

# The packages of these groups of packages.txt that are not installed, but for those whose command
# is there all the same.
missing_packages() {
    local group package command status
    while read -r group package _; do
        case " $* " in *" $group "*) ;; *) continue ;; esac
        case $package in
        */*)
            command=${package#*/}
            package=${package%/*}
            ! command -v "$command" >/dev/null || continue
            ;;
        esac
        status=$(dpkg-query -W -f='${db:Status-Status}' "$package" 2>/dev/null || true)
        [ "$status" = installed ] || printf '%s\n' "$package"
    done <"$root/scripts/packages.txt"
}

# Services that the demonstration, the tests and the benchmarks alone need. Where their packages
# bring them, they are neither started nor enabled at boot; where the machine had them before, they
# are left as they are.
readonly borrowed_services=(cron monit nginx php8.2-fpm redis-server supervisor)
readonly guard=/usr/sbin/policy-rc.d
readonly guard_mark='# made by the setup of tolkwd, for the time of an installation'
new_services=()

# Keeps packages from starting services while they are installed.
raise_guard() {
    [ ! -e "$guard" ] || return 0
    printf '#!/bin/sh\n%s\nexit 101\n' "$guard_mark" | as_root tee "$guard" >/dev/null
    as_root chmod 755 "$guard"
}

# Also at the end of an interrupted installation, and by the next setup after one that was cut off.
after_installing() {
    local service
    if grep -qsxF "$guard_mark" "$guard"; then
        as_root rm -f "$guard"
    fi
    for service in "${new_services[@]}"; do
        [ ! -e "/etc/init.d/$service" ] || as_root update-rc.d "$service" disable
    done
    new_services=()
}

install_quietly() {
    local service
    for service in "${borrowed_services[@]}"; do
        [ -e "/etc/init.d/$service" ] || new_services+=("$service")
    done
    trap after_installing EXIT
    raise_guard
    as_root env DEBIAN_FRONTEND=noninteractive \
        apt-get install --yes --no-install-recommends "$@"
    after_installing
    trap - EXIT
}

# Makes sure that everything of these groups of packages.txt is there.
setup() {
    local missing
    command -v dpkg-query >/dev/null || fail "this sets up Debian machines only"
    after_installing
    missing=$(missing_packages "$@")
    [ -n "$missing" ] || return 0
    mapfile -t missing <<<"$missing"
    printf 'installing: %s\n' "${missing[*]}"
    as_root apt-get update --quiet || printf 'apt-get update failed, going on without\n' >&2
    install_quietly "${missing[@]}"
}

# build PRESET TARGET [OPTION...]: configures a preset with these options and builds this target.
build() {
    local preset=$1 target=$2
    shift 2
    (cd "$root" && cmake --preset "$preset" "$@" >/dev/null &&
        cmake --build --preset "$preset" --target "$target")
}
