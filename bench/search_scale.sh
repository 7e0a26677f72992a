#!/usr/bin/env bash
# Times `trllocator search` against bfs and find on generated trees of growing size.
#
# usage: bench/search_scale.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder holding trllocator and bench/make_tree (default: build)
#   WORK_DIR   where trees, options and outputs go (default: /tmp/trl-search-bench)
#   SIZES      environment: file counts to try (default: "100000 1000000")
#
# Trees are kept between runs (a marker beside each tree says it is complete), so only the first
# run pays for creating them. Each tool runs 3 times on a warm cache; the best wall time counts.
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-search-bench}")
sizes=${SIZES:-"100000 1000000"}
runs=3

make_tree="$build_dir/bench/make_tree"
trllocator="$build_dir/trllocator"
[[ -x $make_tree ]] || { echo "missing $make_tree: ./setup.sh bench (or configure with -DTRL_BUILD_BENCH=ON)" >&2; exit 1; }
command -v bfs >/dev/null || { echo "bfs is not installed (apt-get install bfs)" >&2; exit 1; }
[[ -x /usr/bin/time ]] || { echo "/usr/bin/time is not installed (apt-get install time)" >&2; exit 1; }
mkdir -p "$work_dir"

have_search=1
if ! "$trllocator" search --help >/dev/null 2>&1; then
  have_search=0
  echo "note: $trllocator has no working 'search' subcommand; its rows will fail" >&2
fi

calc() { awk "BEGIN { printf \"%.6f\", $1 }"; }

xml_escape() {
  local s=$1
  s=${s//&/&amp;}; s=${s//</&lt;}; s=${s//>/&gt;}; s=${s//\"/&quot;}; s=${s//\'/&apos;}
  printf '%s' "$s"
}

# best_of CMD...: runs CMD $runs times; sets best_wall (seconds, lowest) and peak_kib (highest).
# Wall time comes from the shell clock since %e only has 10 ms steps; RSS comes from time(1).
best_of() {
  local stats="$work_dir/time.out" i start end wall rss
  best_wall="" peak_kib=0
  for ((i = 0; i < runs; i++)); do
    start=$EPOCHREALTIME
    /usr/bin/time -f '%e %M' -o "$stats" "$@" >/dev/null || return 1
    end=$EPOCHREALTIME
    wall=$(awk -v a="$start" -v b="$end" 'BEGIN { printf "%.3f", b - a }')
    rss=$(awk '{ print $2 }' "$stats")
    if [[ -z $best_wall ]] || awk -v w="$wall" -v b="$best_wall" 'BEGIN { exit !(w < b) }'; then
      best_wall=$wall
    fi
    if ((rss > peak_kib)); then peak_kib=$rss; fi
  done
}

declare -A bfs_wall trl_wall
failed=0
printf '%-8s %-11s %9s %9s %11s %7s\n' size tool best_s rss_MiB rss_B/file x_bfs

for size in $sizes; do
  tree="$work_dir/tree-$size"
  marker="$work_dir/tree-$size.done"
  if [[ ! -f $marker ]]; then
    rm -rf "$tree"
    "$make_tree" "$tree" "$size" >&2
    touch "$marker"
  fi

  options="$work_dir/options-$size.xml"
  output="$work_dir/local-files-$size.xml"
  cat >"$options" <<EOF
<trl_searchoptions>
  <c c_id="1" c_text="localhost" c_name="localhost" c_local="1">
    <m m_id="1" m_text="" m_name="" m_type="3">
      <d d_id="1" d_text="$(xml_escape "${tree//\//\\}")" d_search="1"><d_search_mask></d_search_mask></d>
    </m>
  </c>
</trl_searchoptions>
EOF

  find "$tree" >/dev/null  # warm the cache so every tool sees the same state

  best_of bfs "$tree" -type f
  bfs_wall[$size]=$best_wall
  printf '%-8s %-11s %9s %9.1f\n' "$size" bfs "$best_wall" "$(calc "$peak_kib / 1024")"

  best_of find "$tree" -type f -printf '%s %p\n'
  printf '%-8s %-11s %9s %9.1f\n' "$size" find "$best_wall" "$(calc "$peak_kib / 1024")"

  if ((!have_search)); then
    echo "$size trllocator: FAILED, '$trllocator search' is not available" >&2
    failed=1
    continue
  fi
  if ! best_of "$trllocator" search --search-options "$options" --output "$output"; then
    echo "$size trllocator: FAILED, search exited with an error" >&2
    failed=1
    continue
  fi
  trl_wall[$size]=$best_wall
  printf '%-8s %-11s %9s %9.1f %11.0f %7.1f\n' "$size" trllocator "$best_wall" \
    "$(calc "$peak_kib / 1024")" "$(calc "$peak_kib * 1024 / $size")" \
    "$(calc "$best_wall / ${bfs_wall[$size]}")"

  recorded=$(grep -o '<f ' "$output" | wc -l)
  if ((recorded == size)); then
    echo "$size recorded: $recorded <f> elements, as expected"
  else
    echo "$size recorded: $recorded <f> elements, expected $size" >&2
    failed=1
  fi
done

read -r -a size_list <<<"$sizes"
small=${size_list[0]} large=${size_list[-1]}
if [[ $small != "$large" && -n ${trl_wall[$small]:-} && -n ${trl_wall[$large]:-} ]]; then
  printf 'trllocator time ratio %s/%s: %.2f (sizes ratio %.0f)\n' "$large" "$small" \
    "$(calc "${trl_wall[$large]} / ${trl_wall[$small]}")" "$(calc "$large / $small")"
fi
exit "$failed"
