#!/usr/bin/env bash
# How well `trllocator locate` identifies the Debian packages installed on this machine, and how
# fast it is next to `debsums -s`, which checks the same packages' files by MD5.
#
# Imports every installed package into a scratch fingerprint database, runs `trllocator locate`
# over the whole file system (every filter rule), and compares each verdict with dpkg-query:
#   exact         the installed version reported at \ (where the package's paths start)
#   unidentified  reported at \ without a version (N/A, Unsupported Version, Multiple Matches)
#   wrong version reported at \ with another version
#   missed        not reported at \
#   misplaced     a report at a folder where no package is installed (any folder but \)
# and lists every package that is not identified exactly. Then it times `debsums -s` over the same
# packages. Wall time and peak memory of both come from /usr/bin/time -v.
#
# usage: bench/dpkg_accuracy.sh [BUILD_DIR] [WORK_DIR]
#   BUILD_DIR  configured build folder with trllocator (default: build)
#   WORK_DIR   where the database, results and timings go (default: /tmp/trl-dpkg-accuracy)
#   SEARCH     environment: the folder to search, in the component's form (default: \, the whole
#              file system; \usr\sbin\ gives a quick trial run)
# debsums is installed with apt-get when it is missing, which needs root; run as root anyway, or
# debsums and the search cannot read every file (the verdicts then say so).
set -euo pipefail

build_dir=$(realpath -m "${1:-build}")
work_dir=$(realpath -m "${2:-/tmp/trl-dpkg-accuracy}")
search=${SEARCH:-\\}
trllocator="$build_dir/trllocator"
[[ -x $trllocator ]] || { echo "missing $trllocator: build it first" >&2; exit 1; }
[[ -x /usr/bin/time ]] || { echo "/usr/bin/time is not installed (apt-get install time)" >&2; exit 1; }
if ! command -v debsums >/dev/null; then
  [[ $(id -u) -eq 0 ]] || { echo "debsums is missing; install it (as root: apt-get install debsums)" >&2; exit 1; }
  apt-get install -y -q debsums >/dev/null
fi
mkdir -p "$work_dir"
rm -f "$work_dir/fingerprint.xml"

# timed NAME CMD...: runs CMD under /usr/bin/time -v, keeping its report in NAME.time.
timed() {
  local name=$1
  shift
  /usr/bin/time -v -o "$work_dir/$name.time" "$@"
}
figures() {
  awk -F': ' '/Elapsed \(wall clock\)/ { wall = $2 } /Maximum resident set size/ { rss = $2 }
              END { printf "wall %s, peak memory %.0f MB\n", wall, rss / 1024 }' "$work_dir/$1.time"
}

timed import "$trllocator" fingerprint import-dpkg --all --database "$work_dir/fingerprint.xml" \
  >"$work_dir/import.out"
# The search: "\" itself without recursion (its links to folders, /bin -> usr/bin and the like,
# are noted), and each real folder at the top with recursion, but for the kernel's own file
# systems (/proc, /sys, /dev), which hold no package files. SEARCH replaces all of it.
entry() {
  echo "<d d_id=\"$3\" d_text=\"$1\" d_search=\"1\" d_search_recurse=\"$2\" d_search_d_attributes=\"35\"" \
    "d_search_f_attributes=\"35\" d_search_f_properties=\"0\" d_search_links=\"1\"><d_search_mask/></d>"
}
if [[ -n ${SEARCH:-} ]]; then
  entries=$(entry "$search" True 1)
else
  entries=$(entry '\' False 1)
  id=1
  for folder in /*/; do
    folder=${folder%/}
    [[ -L $folder ]] && continue
    case $(stat -f -c %T "$folder") in proc | sysfs | tmpfs | devtmpfs | devpts | cgroup*) continue ;; esac
    id=$((id + 1))
    entries+=$(entry "\\${folder#/}\\" True $id)
  done
fi
cat >"$work_dir/search-options.xml" <<EOF2
<trl_searchoptions><c c_id="1" c_text="localhost" c_name="localhost" c_local="1">
<m m_id="1" m_text="" m_name="" m_type="3">$entries</m></c></trl_searchoptions>
EOF2
echo "<trl_applicationoptions/>" >"$work_dir/application-options.xml"
echo "<trl_applicationdata/>" >"$work_dir/user-data.xml"
locate_status=0
timed locate "$trllocator" locate --search-options "$work_dir/search-options.xml" \
  --application-options "$work_dir/application-options.xml" \
  --fingerprint "$work_dir/fingerprint.xml" --user-data "$work_dir/user-data.xml" \
  --filter all --format xml --output "$work_dir/results.xml" 2>"$work_dir/locate.err" ||
  locate_status=$?

dpkg-query -W -f '${Package}:${Architecture} ${Version} ${db:Status-Abbrev}\n' \
  >"$work_dir/installed.txt"
awk '$3 == "ii" { split($1, p, ":"); print p[1] }' "$work_dir/installed.txt" | sort -u \
  >"$work_dir/packages.txt"
debsums_status=0
timed debsums xargs -a "$work_dir/packages.txt" debsums -s >"$work_dir/debsums.out" 2>&1 ||
  debsums_status=$?

python3 - "$work_dir" <<'EOF2'
import sys
import xml.etree.ElementTree as ET

work = sys.argv[1]
installed = {}  # "tar:amd64" -> version
for line in open(f"{work}/installed.txt"):
    words = line.split()
    if len(words) >= 3 and words[2] == "ii":
        installed[words[0]] = words[1]
described = {a.get("a_name") for a in ET.parse(f"{work}/fingerprint.xml").getroot().iter("a")}

# Reports by application name: (folder, v_name, v_id).
reports = {}
for d in ET.parse(f"{work}/results.xml").getroot().iter("d"):
    for a in d.findall("a"):
        reports.setdefault(a.get("a_name"), []).append((d.get("d_text"), a.get("v_name"), a.get("v_id")))

counts = {"exact": 0, "unidentified": 0, "wrong version": 0, "missed": 0}
not_exact, misplaced = [], []
for instance, version in sorted(installed.items()):
    package = instance.split(":")[0]
    name = instance if instance in described else package  # Multi-Arch: same keeps its arch
    found = reports.get(name, [])
    at_root = [r for r in found if r[0] == "\\"]
    if any(r[1] == version and r[2] != "-1" for r in at_root):
        counts["exact"] += 1
        continue
    if not at_root:
        kind = "missed"
        why = "not in the database (no files)" if name not in described else (
            "reported only at " + ", ".join(r[0] for r in found) if found else "not reported")
    elif all(r[2] in ("-1", "0") for r in at_root):
        kind, why = "unidentified", "; ".join(f"{r[1]}" for r in at_root)
    else:
        kind, why = "wrong version", "; ".join(f"{r[1]} (installed {version})" for r in at_root)
    counts[kind] += 1
    not_exact.append(f"{instance} {version}: {kind}: {why}")
for name, found in sorted(reports.items()):
    misplaced += [f"{name} {r[1]} at {r[0]}" for r in found if r[0] != "\\"]

total = len(installed)
print(f"installed packages: {total}")
for kind, n in counts.items():
    print(f"{kind}: {n} ({100.0 * n / max(total, 1):.1f}%)")
print(f"reports at a place where no package is: {len(misplaced)}")
for line in misplaced:
    print(f"  misplaced: {line}")
print("not identified exactly:")
for line in not_exact:
    print(f"  {line}")
EOF2
echo "import:  $(figures import) ($(cat "$work_dir/import.out"))"
echo "locate:  $(figures locate), exit $locate_status (messages in $work_dir/locate.err)"
echo "debsums: $(figures debsums), exit $debsums_status ($(wc -l <"$work_dir/debsums.out") lines in $work_dir/debsums.out)"
