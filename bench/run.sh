#!/usr/bin/env bash
# Measures tolkwd against its peers and against the least that its work can cost, and writes the
# figures into doc/PERFORMANCE.md and the curves into doc/performance. Takes about a quarter of an
# hour; let the machine do nothing else meanwhile.
set -euo pipefail
# shellcheck source-path=SCRIPTDIR source=../scripts/setup.sh
. "$(dirname "$0")/../scripts/setup.sh"

setup build demo bench
build release all -DTOLKWD_BENCH=ON -DBUILD_TESTING=OFF

built=$root/build/release
results=$built/bench/results
mkdir -p "$results"
# The pieces' files lie on the disk that the sources are on.
cd "$built/bench"

"$root/bench/counts/compare.py" --program counts/bench_counts --out "$results/counts.json"
"$root/bench/pieces/measure.py" --program pieces/bench_pieces --service process/service \
    --out "$results/pieces.json"
lockwait/bench_lockwait --out "$results/lockwait.json"
"$root/bench/check/measure.py" --check "$built/tools/tolkwd-check/tolkwd-check" \
    --load check/bench_check_load --out "$results/check.json"
"$root/bench/logs/measure.py" --report "$built/tools/tolkwd-report/tolkwd-report" \
    --out "$results/logs.json"
"$root/bench/process/measure.py" --tolkwd "$built/src/tolkwd" --service process/service \
    --out "$results/process.json"

"$root/bench/report/report.py" "$results"/{pieces,check,logs,process,lockwait,counts}.json
