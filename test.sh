#!/usr/bin/env bash
# Sets up, builds with warnings as errors, and runs the tests, within ten minutes on two cores.
# --full runs everything, in less than an hour; CONTRIBUTING.md lists what that adds, and why it is
# not run each time. The steps are those of tests/schedule/CMakeLists.txt.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/scripts/setup.sh"

case "$*" in
    '') full=OFF fuzz_seconds=10 ;;
    --full) full=ON fuzz_seconds=600 ;;
    *) fail 'usage: test.sh [--full]' ;;
esac

groups=(build demo deb rpm test)
[ "$full" = OFF ] || groups+=(bench)
setup "${groups[@]}"

cd "$root"
# From a fresh cache: cmake drops the options of one that was made with another compiler.
configure() {
    cmake --fresh --preset "$1" -DBUILD_TESTING=ON -DTOLKWD_WERROR=ON \
        -DTOLKWD_FULL_TESTS="$full" "${@:2}" >/dev/null
}
configure asan -DTOLKWD_FUZZ_SECONDS="$fuzz_seconds"
configure tsan
# The unit tests run under asan already.
configure release -DTOLKWD_UNIT_TESTS="$full" -DTOLKWD_BENCH="$full"
cmake --fresh -G Ninja -S tests/schedule -B build/schedule -DTOLKWD_FULL_TESTS="$full" >/dev/null
rm -f build/{asan,tsan,release}/tests/*/Testing/Temporary/LastTest.log
ctest --test-dir build/schedule --parallel 4 --output-on-failure

logs=(build/{asan,tsan,release}/tests/*/Testing/Temporary/LastTest.log)

printf '\n== seeds\n'
# From the names of tests, the output of the mutation test and that of the fuzzers.
grep -hoE 'Seeds/[^ "]*/[0-9]+' "${logs[@]}" | sed -E 's|.*/(.*)\..*/|\1 |' | sort -u -k1,1 -k2n |
    awk '{ seeds[$1] = seeds[$1] " " $2 } END { for (name in seeds) print name ":" seeds[name] }'
grep -hE '^seed .*mutations$' "${logs[@]}" || fail 'no seed in the logs'
awk '/ Test: fuzz/ { name = $3 } /^INFO: Seed: / { print name ": " $3 }' "${logs[@]}"

printf '\n== what the soak measured\n'
grep -h ' refreshes, ' "${logs[@]}" || fail 'no figures in the logs'

printf '\n== skipped\n'
# As pytest reports it, and as GoogleTest does: the reason is on the next line.
skipped=$(sed -nE -e 's/^SKIPPED \[[0-9]+\] [^ ]*: //p' -e '/\.cpp:[0-9]+: Skipped$/{n;p}' \
    "${logs[@]}" | sort -u)
printf '%s\n' "${skipped:-nothing}"
[ "$full" = OFF ] || [ -z "$skipped" ] || fail 'not everything was tested'
