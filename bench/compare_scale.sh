#!/usr/bin/env bash
# Times the compare stage at 10% and 100% of a fingerprint of 10,000 applications x 5 versions x
# 20 files against a local-files document of 1,000,000 files, 5% of the applications installed.
#
# Beside each, md5sum over the same installed files on one core: Compare hashes them too, on a
# thread per core, so it should take well under md5sum's time.
#
# usage: bench/compare_scale.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder holding bench/make_compare_data and bench/compare_bench
#              (default: build)
#   WORK_DIR   where the data sets go (default: /tmp/trl-compare-bench); kept between runs
#   RUNS       environment: runs per scale, the best counts (default: 5)
#   INSTRUCTIONS=1  environment: also count the instructions Compare executes at each scale, under
#              valgrind (many minutes at full scale, the installed files being hashed there
#              too); unlike time on a shared machine, the count does not move from run to run
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-compare-bench}")
runs=${RUNS:-5}
for tool in make_compare_data compare_bench; do
  [[ -x $build_dir/bench/$tool ]] || {
    echo "missing $build_dir/bench/$tool: ./setup.sh bench (or configure with -DTRL_BUILD_BENCH=ON)" >&2
    exit 1
  }
done

declare -A seconds instructions
for apps in 1000 10000; do
  data="$work_dir/apps-$apps"
  if [[ ! -f $data.done ]]; then
    rm -rf "$data"
    "$build_dir/bench/make_compare_data" "$data" "$apps" >/dev/null
    touch "$data.done"
  fi
  echo "== $apps applications, $((apps * 100)) local files"
  report=$("$build_dir/bench/compare_bench" "$data" "$runs")
  echo "$report"
  seconds[$apps]=$(sed -n 's/^compare best of [0-9]*: \([0-9.]*\) s.*/\1/p' <<<"$report")
  md5=""
  for ((run = 0; run < runs; run++)); do
    start=$EPOCHREALTIME
    find "$data/disk" -type f -print0 | xargs -0 md5sum >/dev/null
    took=$(awk -v a="$start" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.3f", b - a }')
    if [[ -z $md5 ]] || awk -v t="$took" -v b="$md5" 'BEGIN { exit !(t < b) }'; then md5=$took; fi
  done
  awk -v c="${seconds[$apps]}" -v m="$md5" \
    'BEGIN { printf "md5sum of the installed files, best: %.3f s; compare: %.2fx md5sum\n", m, c / m }'
  if [[ ${INSTRUCTIONS:-0} == 1 ]]; then
    command -v valgrind >/dev/null || { echo "valgrind is not installed" >&2; exit 1; }
    instructions[$apps]=$(valgrind --tool=callgrind --callgrind-out-file=/dev/null \
      --toggle-collect='trl::Compare::Start*' "$build_dir/bench/compare_bench" "$data" 1 2>&1 |
      sed -n 's/.*Collected : \([0-9]*\).*/\1/p')
    echo "instructions in Compare: ${instructions[$apps]}"
  fi
done
awk -v a="${seconds[1000]}" -v b="${seconds[10000]}" \
  'BEGIN { printf "10x the input took %.1fx the time\n", b / a }'
if [[ ${INSTRUCTIONS:-0} == 1 ]]; then
  awk -v a="${instructions[1000]}" -v b="${instructions[10000]}" \
    'BEGIN { printf "and %.1fx the instructions\n", b / a }'
fi
