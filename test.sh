#!/usr/bin/env bash
# Sets up, builds with warnings as errors, and runs all tests: under the address and undefined-
# behaviour sanitizers, under the thread sanitizer, and as released, the packages and, once and
# briefly, the benchmarks among them; lets each fuzzer run; and compares instruction counts with
# those kept. Takes about a quarter of an hour. Longer fuzzing: tests/fuzz/CMakeLists.txt; the whole
# soak: tests/system/CMakeLists.txt; valgrind: tests/memcheck.sh; mutants: tests/mutation/run.py;
# figures: bench/run.sh.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/scripts/setup.sh"

setup build demo package test bench
for preset in asan tsan release fuzz; do
    printf '\n== %s\n' "$preset"
    bench=OFF
    [ "$preset" != release ] || bench=ON
    build "$preset" -DTOLKWD_WERROR=ON -DBUILD_TESTING=ON -DTOLKWD_BENCH="$bench"
    (cd "$root" && ctest --preset "$preset")
done

# Where there is no mirror, or no right to make a system.
results=$root/build/release/Testing/Temporary/LastTest.log
if grep -hom1 'no machine could be booted: .*' "$results"; then
    printf 'so the packages were not installed anywhere\n'
fi

printf '\n== what the soak measured\n'
grep -h ' refreshes, ' "$results"

printf '\n== instructions of each piece of work\n'
"$root/bench/counts/compare.py" --program "$root/build/release/bench/counts/bench_counts"
