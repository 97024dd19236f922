#!/usr/bin/env bash
# build.sh: makes the Debian package and the RPM, after installing what that needs, and leaves them
# in build/packages/.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/../scripts/setup.sh"

setup build package
build release all -DBUILD_TESTING=OFF
cd "$root"
for kind in DEB RPM; do
    cpack -G "$kind"
done
printf '\nin %s:\n' "$root/build/packages"
find build/packages -maxdepth 1 -type f -printf '%f\n' | sort
