#!/usr/bin/env bash
# Sets up, builds with warnings as errors, and runs all tests: under the address and undefined-
# behaviour sanitizers, under the thread sanitizer, and as released; then lets each fuzzer run.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/scripts/setup.sh"

setup build demo test
for preset in asan tsan release fuzz; do
    printf '\n== %s\n' "$preset"
    build "$preset" -DTOLKWD_WERROR=ON -DBUILD_TESTING=ON
    (cd "$root" && ctest --preset "$preset")
done
