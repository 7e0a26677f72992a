#!/bin/sh
# Regenerates the PE fixtures of the version reader tests. Needs the Debian packages
# gcc-mingw-w64-x86-64, binutils-mingw-w64-x86-64, gcc-mingw-w64-i686 and binutils-mingw-w64-i686;
# they are not build dependencies: the fixtures are kept next to this script.
set -eu
cd "$(dirname "$0")"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Without start files or libraries the programs stay a few KB.
flags="-Os -s -nostdlib -nostartfiles -Wl,--entry=Start -Wl,--subsystem,console"

x86_64-w64-mingw32-windres versioned.rc -O coff -o "$work/versioned64.res"
x86_64-w64-mingw32-gcc $flags versioned.c "$work/versioned64.res" -o versioned64.exe
x86_64-w64-mingw32-gcc $flags versioned.c -o unversioned64.exe

# The 32-bit one carries words that catch swapped or truncated halves.
i686-w64-mingw32-windres -DFILE_VERSION=65535,0,258,40000 versioned.rc -O coff -o "$work/versioned32.res"
i686-w64-mingw32-gcc $flags -Wl,--entry=_Start versioned.c "$work/versioned32.res" -o versioned32.exe
