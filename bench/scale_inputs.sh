# Sourced by the whole-run benchmarks: the 1,000,000-file tree of the search benchmark and the
# installed applications of the compare benchmark, generated on first use and kept for later runs
# (a marker beside each says it is complete).
#
# scale_inputs BUILD_DIR APPS: sets `trllocator`, `tree` and `data` (the compare data of APPS
# applications), making what is missing.
scale_inputs() {
  local build_dir=$1 apps=$2 tool
  trllocator="$build_dir/trllocator"
  tree=/tmp/trl-search-bench/tree-1000000
  data=/tmp/trl-compare-bench/apps-$apps
  for tool in "$trllocator" "$build_dir/bench/make_tree" "$build_dir/bench/make_compare_data"; do
    [[ -x $tool ]] || { echo "missing $tool: ./setup.sh bench (or configure with -DTRL_BUILD_BENCH=ON)" >&2; exit 1; }
  done
  mkdir -p "$(dirname "$tree")" "$(dirname "$data")"
  if [[ ! -f $tree.done ]]; then
    rm -rf "$tree"
    "$build_dir/bench/make_tree" "$tree" 1000000 >&2
    touch "$tree.done"
  fi
  if [[ ! -f $data.done ]]; then
    rm -rf "$data"
    "$build_dir/bench/make_compare_data" "$data" "$apps" >/dev/null
    touch "$data.done"
  fi
}
