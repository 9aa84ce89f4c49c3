#!/usr/bin/env bash
# Builds the fuzz targets and runs each for a bounded time, seeded with the
# golden records the unit tests read (tests/data, laid out by hand). Any crash, overread, leak, timeout or broken round
# trip fails the run.
#   run-fuzz.sh [SECONDS_PER_TARGET]   (default 20)
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-20}
cmake --preset fuzz >/dev/null
cmake --build --preset fuzz
build=build/fuzz
seeds=$build/seeds
data=tests/data
declare -A golden=(
  [bseck_reload_fuzz]="bseck.bin" [build_config_fuzz]="build_config.bin" [code_object_info_fuzz]="coi.bin"
  [data_entry_fuzz]="data.bin" [front_panel_fuzz]="afpd.bin" [fsbl_info_fuzz]="fsbl_info.bin"
  [memory_config_fuzz]="mcfg_minor6.bin mcfg_minor5.bin"
  [version_entry_fuzz]="vers_minor2.bin vers_no_tail.bin vers_to_pad.bin")
rm -rf "$seeds"
for target in "${!golden[@]}"; do
  mkdir -p "$seeds/$target"
  for file in ${golden[$target]}; do cp "$data/$file" "$seeds/$target/"; done
done

# An input takes milliseconds (a record is read through the NOR slot only
# when its counts fit the slot); one that takes seconds is a hang.
timeout=10
passed=0 failed=0
for target in "$build"/fuzz/*_fuzz; do
  name=$(basename "$target")
  corpus=$build/corpus/$name
  mkdir -p "$corpus" "$build/findings/$name"
  log=$build/$name.log
  start=$(date +%s%N)
  if "$target" -max_total_time="$seconds" -timeout=$timeout -rss_limit_mb=2048 -print_final_stats=1 \
       -artifact_prefix="$build/findings/$name/" "$corpus" "$seeds/$name" >"$log" 2>&1; then
    elapsed_ms=$(( ($(date +%s%N) - start) / 1000000 ))
    units=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log" | tail -n 1)
    units=${units:-0}
    echo "fuzz $name: ok ($units inputs in $((elapsed_ms / 1000)) s, $((units * 1000 / (elapsed_ms > 0 ? elapsed_ms : 1))) inputs/s)"
    passed=$((passed + 1))
  else
    echo "fuzz $name: FAILED, see $log and $build/findings/$name/" >&2
    grep -E 'ERROR|SUMMARY|==[0-9]+==' "$log" | head -n 20 >&2 || true
    failed=$((failed + 1))
  fi
done
echo "fuzz: $passed passed, $failed failed"
[ "$failed" -eq 0 ]
