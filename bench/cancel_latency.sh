#!/usr/bin/env bash
# Measures how soon `trllocator locate` ends after Ctrl-C (SIGINT), sent at random moments of a
# full-scale run: the 1,000,000-file tree of the search benchmark and the installed files of the
# compare benchmark, matched against its fingerprint of 10,000 applications (1,000,000 fingerprint
# files). The latency is the time from the signal to the end of the process.
#
# usage: bench/cancel_latency.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder with trllocator, bench/make_tree, bench/make_compare_data
#              (default: build)
#   WORK_DIR   where outputs go (default: /tmp/trl-cancel-bench); the inputs are shared with the
#              locate benchmark and kept
#   TRIALS     environment: how many signals (default: 20)
#   FORMAT     environment: --format of the run (default: table, which writes nothing when
#              cancelled; xml writes what the stage had, and the time that takes counts too)
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-cancel-bench}")
trials=${TRIALS:-20}
format=${FORMAT:-table}
source "$(dirname "$0")/scale_inputs.sh"
scale_inputs "$build_dir" 10000
mkdir -p "$work_dir"
find "$tree" "$data/disk" >/dev/null

run=("$trllocator" locate "$tree" "$data/disk" --fingerprint "$data/fingerprint.xml"
  --format "$format")

start=$EPOCHREALTIME
"${run[@]}" >/dev/null 2>"$work_dir/whole.err"
whole=$(awk -v a="$start" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.3f", b - a }')
echo "a whole run takes $whole s; $trials signals at random moments of it"

worst=0 counted=0
for ((i = 1; i <= trials; i++)); do
  at=$(awk -v w="$whole" -v r="$RANDOM" 'BEGIN { printf "%.3f", 0.9 * w * r / 32768 }')
  # A background job of a script ignores SIGINT unless told otherwise.
  env --default-signal=INT "${run[@]}" >/dev/null 2>"$work_dir/trial.err" &
  pid=$!
  sleep "$at"
  sent=$EPOCHREALTIME
  if ! kill -INT "$pid" 2>/dev/null; then
    wait "$pid" || true
    printf 'signal at %6.3f s: the run had ended; not counted\n' "$at"
    continue
  fi
  set +e
  wait "$pid"
  status=$?
  set -e
  ms=$(awk -v a="$sent" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.0f", (b - a) * 1000 }')
  printf 'signal at %6.3f s: ended after %4d ms, exit %d: %s\n' "$at" "$ms" "$status" \
    "$(tail -n 1 "$work_dir/trial.err" | cut -c1-90)"
  ((ms > worst)) && worst=$ms
  counted=$((counted + 1))
done
echo "worst of $counted: $worst ms"
