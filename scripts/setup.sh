# Sourced by run.sh and test.sh: installs what is missing on a Debian machine, and builds.
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

# The packages of these groups of packages.txt that are not installed.
missing_packages() {
    local group package status
    while read -r group package _; do
        case " $* " in *" $group "*) ;; *) continue ;; esac
        status=$(dpkg-query -W -f='${db:Status-Status}' "$package" 2>/dev/null || true)
        [ "$status" = installed ] || printf '%s\n' "$package"
    done <"$root/scripts/packages.txt"
}

# Installs packages without starting their services, now or at the next boot: the demonstration
# runs them in its sandbox only.
install_quietly() {
    local guard=/usr/sbin/policy-rc.d guarded=no service
    if [ ! -e "$guard" ]; then
        guarded=yes
        printf '#!/bin/sh\nexit 101\n' | as_root tee "$guard" >/dev/null
        as_root chmod 755 "$guard"
        trap 'as_root rm -f /usr/sbin/policy-rc.d' EXIT
    fi
    as_root env DEBIAN_FRONTEND=noninteractive \
        apt-get install --yes --no-install-recommends "$@"
    for service in redis-server nginx; do
        case " $* " in
            *" $service "* | *" $service-light "*) as_root update-rc.d "$service" disable ;;
        esac
    done
    if [ "$guarded" = yes ]; then
        as_root rm -f "$guard"
        trap - EXIT
    fi
}

# Makes sure that everything of these groups of packages.txt is there.
setup() {
    local missing
    command -v dpkg-query >/dev/null || fail "this sets up Debian machines only"
    mapfile -t missing < <(missing_packages "$@")
    [ ${#missing[@]} -gt 0 ] || return 0
    printf 'installing: %s\n' "${missing[*]}"
    as_root apt-get update --quiet || printf 'apt-get update failed, going on without\n' >&2
    install_quietly "${missing[@]}"
}

# Configures and builds one preset; further arguments go to cmake's configuration.
build() {
    local preset=$1
    shift
    (cd "$root" && cmake --preset "$preset" "$@" >/dev/null && cmake --build --preset "$preset")
}
