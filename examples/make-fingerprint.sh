#!/bin/sh
# Rebuilds examples/fingerprint.xml: a sample fingerprint database of a few packages that npm
# bundles, several published releases of each, among them the ones the npm of Node.js 20 bundles
# and the ones Debian 12 packages on their own (node-semver, node-graceful-fs, node-which,
# node-nopt). Each release's tarball comes from the npm registry (npm pack), is unpacked into a
# temporary folder and described with `trllocator fingerprint add`.
#
# Ids are fixed so that a rebuild gives the same database: an application's a_id is its number in
# the list below; a version's v_id and v_seq are both its release number as one whole number,
# major * 10000 + minor * 100 + patch (7.8.5 gives 70805), which orders releases as published and
# stays the same when releases are added to the list.
#
# Usage: examples/make-fingerprint.sh [OUTPUT]   (default: examples/fingerprint.xml)
# TRLLOCATOR names the command to use (default: build/trllocator of this repository).
set -eu

here=$(cd "$(dirname "$0")" && pwd)
trllocator=${TRLLOCATOR:-$here/../build/trllocator}
output=${1:-$here/fingerprint.xml}

# a_id, package, releases
packages='
1 semver 7.3.5 7.6.3 7.7.2 7.8.5 7.8.6
2 graceful-fs 4.2.9 4.2.10 4.2.11 4.2.12
3 which 2.0.2 4.0.0 5.0.0 6.0.0 6.0.1
4 nopt 5.0.0 7.2.1 8.1.0 9.0.0 10.0.1
5 cacache 18.0.4 19.0.1 20.0.4 21.0.2
'

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT INT TERM
database=$work/fingerprint.xml

release_number() {
  echo "$1" | awk -F. '
    NF != 3 || $1 !~ /^[0-9]+$/ || $2 !~ /^[0-9]+$/ || $3 !~ /^[0-9]+$/ || $2 > 99 || $3 > 99 {
      exit 1
    }
    { print $1 * 10000 + $2 * 100 + $3 }'
}

echo "$packages" | while read -r id name releases; do
  [ -n "$id" ] || continue
  for release in $releases; do
    number=$(release_number "$release") || {
      echo "make-fingerprint: $name $release is not a release number this script can order" >&2
      exit 1
    }
    unpacked=$work/$name-$release
    mkdir "$unpacked"
    tarball=$(cd "$work" && npm pack --silent --loglevel=error "$name@$release")
    tar -xzf "$work/$tarball" -C "$unpacked"
    rm "$work/$tarball"
    # A tarball holds one folder, "package" in all but the oldest.
    set -- "$unpacked"/*
    "$trllocator" fingerprint add --folder "$1" --app-id "$id" --app-name "$name" \
      --version-id "$number" --version-name "$release" --seq "$number" --database "$database"
  done
done

mv "$database" "$output"
