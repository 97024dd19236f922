#!/usr/bin/env bash
# build.sh [rpm]: makes the Debian package, or with "rpm" the RPM, after installing what that needs,
# and leaves it in build/packages/.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/../scripts/setup.sh"

case "$*" in
    '') kind=deb ;;
    rpm) kind=rpm ;;
    *) fail 'usage: packaging/build.sh [rpm]' ;;
esac

setup build "$kind"
build release all -DBUILD_TESTING=OFF
cd "$root"
cpack -G "${kind^^}"
printf '\nin %s:\n' "$root/build/packages"
find build/packages -maxdepth 1 -name "*.$kind" -printf '%f\n' | sort
