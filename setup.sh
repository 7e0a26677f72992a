#!/usr/bin/env bash
# Installs the Debian packages trlLocator needs (only those missing), then configures and builds.
# Usage: ./setup.sh [example] [tests] [bench] [fuzz] [package] [windows] [build-dir]   (default: build)
#   example  also installs the Node.js packages Debian ships on their own that the bundled example
#            looks for (semver, graceful-fs, which, nopt), so that the example finds real software
#   tests    also installs what the tests need, and builds them (BUILD_TESTING=ON)
#   bench    also installs Google Benchmark, and builds the benchmarks (TRL_BUILD_BENCH=ON)
#   fuzz     also installs clang and its libFuzzer runtime, and builds nothing: bench/fuzz.sh
#            builds the fuzz targets in a folder of their own
#   package  also installs what making a Debian package needs, and builds nothing: .ci/package
#            builds the package in a folder of its own
#   windows  also installs the mingw-w64 cross compiler, widl, Wine (64-bit) and its IDL files, and
#            Debian's source package index (windows/deps.sh builds libraries from it), and builds
#            nothing: .ci/windows builds trllocator.dll in a folder of its own
set -euo pipefail

here="$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)"
example=0
tests=0
bench=0
fuzz=0
package=0
windows=0
while [ $# -gt 0 ]; do
  case "$1" in
    example) example=1 ;;
    tests) tests=1 ;;
    bench) bench=1 ;;
    fuzz) fuzz=1 ;;
    package) package=1 ;;
    windows) windows=1 ;;
    *) break ;;
  esac
  shift
done
build_dir="${1:-$here/build}"

packages=(
  g++ cmake ninja-build pkg-config
  libpugixml-dev libpcre2-dev libutf8proc-dev libssl-dev libfmt-dev libcli11-dev nlohmann-json3-dev
  libsqlite3-dev zlib1g-dev libmimalloc-dev
)
if ((tests)); then
  packages+=(libgtest-dev libgmock-dev)
  # The CycloneDX schema the tests validate against comes from npm; the fleet test runs Ansible.
  packages+=(python3-jsonschema ansible)
  command -v npm >/dev/null || packages+=(npm)
fi
if ((bench)); then
  packages+=(libbenchmark-dev)
fi
if ((example)); then
  packages+=(node-semver node-graceful-fs node-which node-nopt)
fi
if ((fuzz)); then
  packages+=(clang libclang-rt-14-dev)
fi
if ((package)); then
  # dpkg-shlibdeps works out the package's dependencies, and needs file to find the binaries.
  packages+=(dpkg-dev file)
fi

if ((windows)); then
  packages+=(g++-mingw-w64-x86-64-posix mingw-w64-tools wine64 wine libwine-dev dpkg-dev)
fi

missing=()
for p in "${packages[@]}"; do
  if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q 'install ok installed'; then
    missing+=("$p")
  fi
done

# The Windows build's libraries come from Debian's source packages: their index is added beside
# the binary one, from the same archives, where the machine has none.
sources=()
if ((windows)) && ! grep -Eqs '^(Types:.*deb-src|deb-src )' /etc/apt/sources.list \
    /etc/apt/sources.list.d/*; then
  sources=(/etc/apt/sources.list.d/trllocator-deb-src.sources)
fi

if ((${#missing[@]} || ${#sources[@]})); then
  sudo=()
  if [ "$(id -u)" -ne 0 ]; then
    command -v sudo >/dev/null || { echo "setup: need root or sudo to install: ${missing[*]}" >&2; exit 1; }
    sudo=(sudo)
  fi
  if ((${#sources[@]})); then
    echo "setup: adding Debian's source package index"
    if [ -f /etc/apt/sources.list.d/debian.sources ]; then
      sed 's/^Types: deb$/Types: deb-src/' /etc/apt/sources.list.d/debian.sources
    else
      sed -n 's/^deb /deb-src /p' /etc/apt/sources.list
    fi | "${sudo[@]}" tee "${sources[0]}" >/dev/null
  fi
  export DEBIAN_FRONTEND=noninteractive
  "${sudo[@]}" apt-get update -qq
  if ((${#missing[@]})); then
    echo "setup: installing ${missing[*]}"
    "${sudo[@]}" apt-get install -y -qq --no-install-recommends "${missing[@]}" >/dev/null
  fi
fi

if ((fuzz || package || windows)); then
  exit 0
fi
# A build folder configured before keeps its settings; the words turn on what they ask for.
options=()
if ((tests)); then options+=(-DBUILD_TESTING=ON); fi
if ((bench)); then options+=(-DTRL_BUILD_BENCH=ON); fi
cache="$build_dir/CMakeCache.txt"
configured() {
  local option
  [ -f "$build_dir/build.ninja" ] || return 1
  for option in "${options[@]}"; do
    grep -qx -- "${option#-D}" <(sed 's/:[A-Z]*=/=/' "$cache") || return 1
  done
}
if ! configured; then
  cmake -S "$here" -B "$build_dir" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo "${options[@]}" \
    >/dev/null
fi
if ! log=$(cmake --build "$build_dir" -- --quiet 2>&1); then
  printf '%s\n' "$log" >&2
  exit 1
fi

if ((!tests)); then
  exit 0
fi
# The published CycloneDX 1.6 JSON schema, for the test that validates the bill of materials.
schema_dir="$build_dir/cyclonedx-schema"
if [ ! -f "$schema_dir/bom-1.6.SNAPSHOT.schema.json" ]; then
  fetch="$(mktemp -d)"
  (cd "$fetch" && npm pack --silent @cyclonedx/cyclonedx-library@10.3.0 >/dev/null &&
    tar xzf cyclonedx-cyclonedx-library-10.3.0.tgz package/res/schema)
  mkdir -p "$schema_dir"
  cp "$fetch"/package/res/schema/*.schema.json "$schema_dir"/
  rm -rf "$fetch"
fi
