#!/usr/bin/env bash
# Times a second `trllocator locate` over files nobody changed, with the property cache, against
# `trllocator search` alone over the same folders, then changes one installed file in a thousand
# and counts the files the next run reads again. The folders are the 1,000,000-file tree of the
# search benchmark and the installed applications of the compare benchmark (APPS applications of
# 20 files per version), matched against its fingerprint.
#
# usage: bench/rescan.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder with trllocator, bench/make_tree, bench/make_compare_data
#              (default: build)
#   WORK_DIR   where the cache and outputs go (default: /tmp/trl-rescan-bench)
#   APPS       environment: 1000 (the 10% compare data, default) or 10000 (the full one)
#   RUNS       environment: runs of each timed command, the best counts (default: 3)
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-rescan-bench}")
apps=${APPS:-1000}
runs=${RUNS:-3}
source "$(dirname "$0")/scale_inputs.sh"
scale_inputs "$build_dir" "$apps"
mkdir -p "$work_dir"
cache="$work_dir/properties.sqlite"
rm -f "$cache" "$cache"-*
find "$tree" "$data/disk" >/dev/null  # a warm disk for every command

# best_of CMD...: the best wall time of $runs runs, in $best.
best_of() {
  local i start w
  best=""
  for ((i = 0; i < runs; i++)); do
    start=$EPOCHREALTIME
    "$@" >/dev/null 2>>"$work_dir/stderr"
    w=$(awk -v a="$start" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.3f", b - a }')
    if [[ -z $best ]] || awk -v w="$w" -v b="$best" 'BEGIN { exit !(w < b) }'; then best=$w; fi
  done
}
# files_read CMD...: runs CMD once with -v; the files it read, from the cache's count.
files_read() {
  "$@" -v 2>&1 >/dev/null | sed -n 's/.*property cache: .*, \([0-9]*\) files read.*/\1/p'
}

locate=("$trllocator" locate "$tree" "$data/disk" --fingerprint "$data/fingerprint.xml"
  --format table --cache "$cache")
first=$(files_read "${locate[@]}")
echo "first locate: $first files read (the cache was empty)"

best_of "$trllocator" search "$tree" "$data/disk" --output /dev/null
search=$best
best_of "${locate[@]}"
again=$best
reread=$(files_read "${locate[@]}")
printf 'search alone: %s s   second locate: %s s (%.2fx search), %s files read\n' "$search" \
  "$again" "$(awk -v a="$again" -v s="$search" 'BEGIN { print a / s }')" "$reread"

# One installed file in a thousand gets a new first byte, same size; its old content comes back
# afterwards, so the compare benchmark's data stays as it was made.
mapfile -t installed < <(find "$data/disk" -type f | sort)
changed=()
for ((i = 0; i < ${#installed[@]}; i += 1000)); do changed+=("${installed[i]}"); done
for file in "${changed[@]}"; do
  cp -p "$file" "$work_dir/kept"
  printf 'X' | dd of="$file" bs=1 count=1 conv=notrunc status=none
  mv "$work_dir/kept" "$work_dir/kept.$(basename "$file")"
done
after=$(files_read "${locate[@]}")
for file in "${changed[@]}"; do cat "$work_dir/kept.$(basename "$file")" >"$file"; done
rm -f "$work_dir"/kept.*
echo "changed ${#changed[@]} of ${#installed[@]} installed files: the next locate read $after files"
[[ $reread == 0 && $after == "${#changed[@]}" ]]
