#!/usr/bin/env bash
# Builds the benchmarks (-O2, host), runs them once and prints each library
# operation's rate beside its baseline's, with the ratio.
#   bench/run.sh [google-benchmark options...]   e.g. --benchmark_filter=crc
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh build
cmake --preset bench >/dev/null
cmake --build --preset bench >/dev/null
out=build/bench/results.json
# Three repetitions, the median of each counts: the build machine is shared.
build/bench/bench/stbplat_bench --benchmark_format=json --benchmark_repetitions=3 \
  --benchmark_report_aggregates_only=true "$@" >"$out"
python3 bench/ratios.py "$out"
