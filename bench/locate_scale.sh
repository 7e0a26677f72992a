#!/usr/bin/env bash
# Times the whole `trllocator locate` against the four stage commands run one after another on
# the same inputs: the 1,000,000-file tree of the search benchmark plus the installed applications
# of the compare benchmark, matched against its fingerprint of 10,000 applications (1,000,000
# fingerprint files), merged into empty user data.
#
# usage: bench/locate_scale.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder with trllocator, bench/make_tree, bench/make_compare_data
#              (default: build)
#   WORK_DIR   where outputs go (default: /tmp/trl-locate-bench); the generated inputs are shared
#              with the stage benchmarks (/tmp/trl-search-bench, /tmp/trl-compare-bench) and kept
#   RUNS       environment: runs of each command, the best counts (default: 2)
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-locate-bench}")
runs=${RUNS:-2}
source "$(dirname "$0")/scale_inputs.sh"
scale_inputs "$build_dir" 10000
[[ -x /usr/bin/time ]] || { echo "/usr/bin/time is not installed (apt-get install time)" >&2; exit 1; }
mkdir -p "$work_dir"

entry() {
  printf '<d d_id="%s" d_text="%s" d_search="1" d_search_recurse="1"><d_search_mask/></d>' "$1" "${2//\//\\}"
}
options="$work_dir/search-options.xml"
cat >"$options" <<EOF
<trl_searchoptions><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name="" m_type="3">$(entry 1 "$tree")$(entry 2 "$data/disk")</m></c></trl_searchoptions>
EOF
echo "<trl_applicationoptions/>" >"$work_dir/application-options.xml"
echo "<trl_applicationdata/>" >"$work_dir/user-data.xml"
find "$tree" "$data/disk" >/dev/null  # a warm cache for every command

# best_of NAME CMD...: runs CMD $runs times; records the best wall time and the highest RSS.
declare -A wall rss
best_of() {
  local name=$1 stats="$work_dir/time.out" i start end w r
  shift
  wall[$name]="" rss[$name]=0
  for ((i = 0; i < runs; i++)); do
    start=$EPOCHREALTIME
    /usr/bin/time -f '%M' -o "$stats" "$@" >/dev/null
    end=$EPOCHREALTIME
    w=$(awk -v a="$start" -v b="$end" 'BEGIN { printf "%.3f", b - a }')
    r=$(cat "$stats")
    if [[ -z ${wall[$name]} ]] || awk -v w="$w" -v b="${wall[$name]}" 'BEGIN { exit !(w < b) }'; then
      wall[$name]=$w
    fi
    ((r > rss[$name])) && rss[$name]=$r
  done
  printf '%-14s %8s s %8.0f MiB\n' "$name" "${wall[$name]}" "$(awk -v k="${rss[$name]}" 'BEGIN { print k / 1024 }')"
}

w=$work_dir
# Every file is read in every run: the property cache would make the later runs of a best-of
# something else (bench/rescan.sh times them).
best_of search "$trllocator" search --no-cache --search-options "$options" --fingerprint "$data/fingerprint.xml" \
  --output "$w/local-files.xml"
best_of compare "$trllocator" compare --no-cache --local-files "$w/local-files.xml" \
  --fingerprint "$data/fingerprint.xml" --output "$w/matches.xml"
best_of filter "$trllocator" filter --filter all --matches "$w/matches.xml" --output "$w/filtered.xml"
best_of merge "$trllocator" merge --search-options "$options" \
  --application-options "$w/application-options.xml" --user-data "$w/user-data.xml" \
  --new-results "$w/filtered.xml" --output "$w/merged.xml"
sum=$(awk -v a="${wall[search]}" -v b="${wall[compare]}" -v c="${wall[filter]}" -v d="${wall[merge]}" \
  'BEGIN { printf "%.3f", a + b + c + d }')
printf '%-14s %8s s\n' "sum of stages" "$sum"

locate=("$trllocator" locate --no-cache --search-options "$options" --application-options "$w/application-options.xml"
  --fingerprint "$data/fingerprint.xml" --user-data "$w/user-data.xml" --filter all)
best_of "locate --sync" "${locate[@]}" --sync --output "$w/located-sync.xml"
best_of locate "${locate[@]}" --output "$w/located.xml"

awk -v s="$sum" -v a="${wall[locate --sync]}" -v b="${wall[locate]}" 'BEGIN {
  printf "locate --sync: %.2fx the sum of the stages\n", a / s
  printf "locate:        %.2fx the sum of the stages, %.2fx --sync\n", b / s, b / a
}'
apps=$(grep -o '<a ' "$w/merged.xml" | wc -l)
located=$(grep -o '<a ' "$w/located.xml" | wc -l)
echo "applications merged: $apps by the stages, $located by locate"
[[ $apps == "$located" ]]
