#!/usr/bin/env bash
# Builds, for 64-bit Windows, the libraries the component needs that Debian ships no mingw build
# of, from Debian's own source packages, as static libraries installed under PREFIX.
# Usage: windows/deps.sh PREFIX
set -euo pipefail

here="$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)"
prefix="$(mkdir -p "$1" && cd "$1" && pwd)"
sources="$prefix/sources"
mkdir -p "$sources"

# The newest version of the source package that the archive still serves (a security update's
# source can lag behind its index).
fetch() {
  local package="$1" version
  for version in $(apt-cache showsrc "$package" | sed -n 's/^Version: //p' | sort -rV); do
    if (cd "$sources" && apt-get source -qq "$package=$version" >/dev/null 2>&1); then
      return 0
    fi
  done
  echo "windows/deps: no source of $package could be fetched" >&2
  return 1
}

# cmake-built static library: PACKAGE SOURCE-FOLDER-GLOB [cmake options]
build() {
  local package="$1" pattern="$2" folder
  shift 2
  [ -f "$prefix/.built-$package" ] && return 0
  fetch "$package"
  folder="$(find "$sources" -maxdepth 1 -type d -name "$pattern" | head -n 1)"
  cmake -S "$folder" -B "$sources/build-$package" -G Ninja -DCMAKE_BUILD_TYPE=Release \
    -DCMAKE_TOOLCHAIN_FILE="$here/toolchain.cmake" -DCMAKE_INSTALL_PREFIX="$prefix" \
    -DBUILD_SHARED_LIBS=OFF --no-warn-unused-cli "$@" >/dev/null
  cmake --build "$sources/build-$package" --target install -- --quiet >/dev/null
  touch "$prefix/.built-$package"
}

build pugixml 'pugixml-*'
build fmtlib 'fmtlib-*' -DFMT_DOC=OFF -DFMT_TEST=OFF
build utf8proc 'utf8proc-*'
build pcre2 'pcre2-*' -DPCRE2_BUILD_PCRE2GREP=OFF -DPCRE2_BUILD_TESTS=OFF -DPCRE2_SUPPORT_JIT=ON \
  -DPCRE2_STATIC_PIC=ON
rm -rf "$sources"
