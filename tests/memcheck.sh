#!/usr/bin/env bash
# memcheck.sh: everything under valgrind's memcheck, once: each unit test, then the daemon in the
# scenarios. Takes about a quarter of an hour. Ends with 1 at any error or leak.
#
# Left out are the soak and answer-without-end, whose figures would be valgrind's, and what valgrind
# itself cannot live with: no-descriptors and output-closed take away the descriptors that it needs.
set -euo pipefail
# shellcheck source=scripts/setup.sh
. "$(dirname "$0")/../scripts/setup.sh"

setup build demo test memcheck
build debug all -DTOLKWD_WERROR=ON -DBUILD_TESTING=ON
build=$root/build/debug
output=$(mktemp)
trap 'rm -f "$output"' EXIT

check=(valgrind --quiet --error-exitcode=9 --leak-check=full --errors-for-leak-kinds=definite
    --suppressions="$root/tests/memcheck.supp")
for test in "$build"/tests/unit/*_test; do
    printf '== %s\n' "${test##*/}"
    # A death test is a process of its own that ends in the middle: nothing there is a leak.
    "${check[@]}" --child-silent-after-fork=yes "$test" --gtest_brief=1 >"$output" 2>&1 ||
        { cat "$output"; exit 1; }
done

printf '== the daemon\n'
# It never ends but killed or with its log gone: leaks are the soak's business.
pytest-3 -q -p no:cacheprovider "$root/tests/system" --tolkwd "$build/src/tolkwd" -n 4 --short \
    -k 'not soak and not answer-without-end and not no-descriptors and not output-closed' \
    --wrapper 'valgrind --quiet --log-file=/opt/results/report.memcheck --suppressions=/opt/project/tests/memcheck.supp'
