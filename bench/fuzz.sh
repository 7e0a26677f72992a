#!/usr/bin/env bash
# Builds the libFuzzer targets of fuzz/ (clang, address and undefined-behaviour sanitizers) in
# their own build folder and runs each for SECONDS, from the starting inputs that
# fuzz/make_starters.sh writes and the corpus earlier runs grew.
#
# usage: bench/fuzz.sh [SECONDS] [BUILD_DIR]
#   SECONDS    run time of each target (default: 60)
#   BUILD_DIR  the fuzz build folder, configured when new (default: build-fuzz)
#   TARGETS    environment: the targets to run, by name without "_fuzzer" (default: all)
#
# Prints per target the inputs it ran and whether it found anything. A crash, a failed check, a
# leak or a hang stops that target and makes the script exit 1; the input that did it is kept in
# BUILD_DIR/fuzz-findings (replay: BUILD_DIR/fuzz/<target>_fuzzer <input>). The corpora stay in
# BUILD_DIR/fuzz-corpus, the fuzzers' output in BUILD_DIR/fuzz-logs.
set -euo pipefail

here=$(cd "$(dirname "$0")/.." && pwd)
seconds=${1:-60}
build_dir=$(realpath -m "${2:-$here/build-fuzz}")
targets=${TARGETS:-"xml_load search compare filter merge pe_version name_encoding filter_names"}
if [[ ! $seconds =~ ^[1-9][0-9]*$ ]]; then
  echo "fuzz: SECONDS must be a whole number above 0" >&2
  exit 2
fi
command -v clang++ >/dev/null || { echo "fuzz: clang++ is missing: ./setup.sh fuzz" >&2; exit 2; }
for target in $targets; do
  [[ -f $here/fuzz/${target}_fuzzer.cpp ]] || { echo "fuzz: no target $target" >&2; exit 2; }
done

if [[ ! -f $build_dir/build.ninja ]]; then
  launcher=()
  if command -v ccache >/dev/null; then launcher=(-DCMAKE_CXX_COMPILER_LAUNCHER=ccache); fi
  cmake -S "$here" -B "$build_dir" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo \
    -DCMAKE_CXX_COMPILER=clang++ -DTRL_FUZZ=ON \
    "${launcher[@]}" >/dev/null
fi
if ! log=$(nice cmake --build "$build_dir" --target trl_fuzzers -- --quiet 2>&1); then
  printf '%s\n' "$log" >&2
  exit 1
fi

starters=$build_dir/fuzz-starters
findings=$build_dir/fuzz-findings
logs=$build_dir/fuzz-logs
"$here/fuzz/make_starters.sh" "$starters"
mkdir -p "$findings" "$logs"
# The file-system targets make their tree under TMPDIR, which a crashed run leaves behind.
export TMPDIR=$build_dir/fuzz-tmp
rm -rf "$TMPDIR"
mkdir -p "$TMPDIR"

status=0
total=0
printf '%-14s %12s  %s\n' target executions result
for target in $targets; do
  corpus=$build_dir/fuzz-corpus/$target
  log=$logs/$target.log
  mkdir -p "$corpus"
  options=(-max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 -print_final_stats=1
           -artifact_prefix="$findings/$target-")
  case $target in
    xml_load | search | compare | filter | merge) options+=(-dict="$starters/documents.dict") ;;
  esac
  before=$(date +%s)
  # New inputs go to the first folder: the corpus, not the starting inputs.
  if nice "$build_dir/fuzz/${target}_fuzzer" "${options[@]}" "$corpus" "$starters/$target" \
    >"$log" 2>&1; then
    result="nothing found"
  else
    status=1
    found=$(find "$findings" -name "$target-*" -not -name "$target-slow-unit-*" \
      -newermt "@$before" | head -n 1)
    result="FOUND ${found:-(see $log)}"
  fi
  # Runs that end on a finding print no final statistics; their last status line counts.
  runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log" | tail -n 1)
  if [[ -z $runs ]]; then runs=$(grep -o '^#[0-9]*' "$log" | tail -n 1 | tr -d '#' || true); fi
  runs=${runs:-0}
  total=$((total + runs))
  printf '%-14s %12s  %s\n' "$target" "$runs" "$result"
done
printf '%-14s %12s\n' all "$total"
exit "$status"
