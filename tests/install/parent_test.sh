#!/bin/sh
# Usage: parent_test.sh CXX
# Builds and installs a project that has the sources in a subdirectory, without popt and libxml2.
# The parent's C++ standard is used. Then checks the pkg-config files for an absolute libdir.
set -eu
cxx=$1
here=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)
source=$(CDPATH= cd -- "$here/../.." && pwd)
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
    echo "FAILED: $*" >&2
    exit 1
}
run() {
    PKG_CONFIG_LIBDIR=/nowhere "$@" >"$scratch/log" 2>&1 || fail "$* $(cat "$scratch/log")"
}

run cmake -G Ninja -S "$here/parent" -B "$scratch/parent" -DQUELTA="$source" \
    -DCMAKE_CXX_COMPILER="$cxx" -DCMAKE_DISABLE_FIND_PACKAGE_LibXml2=ON
run cmake --build "$scratch/parent"
run cmake --install "$scratch/parent" --prefix "$scratch/prefix"
[ -s "$scratch/prefix/lib/cmake/mine/mineTargets.cmake" ] || fail "mine is not exported"
grep -q '++2[3b].*/Timeval\.cpp' "$scratch/parent/compile_commands.json" ||
    fail "the parent's C++ standard is not used"

run cmake -S "$source" -B "$scratch/absolute" -DCMAKE_CXX_COMPILER="$cxx" \
    -DQUELTA_BUILD_LOADER=OFF -DCMAKE_INSTALL_PREFIX=/opt/q -DCMAKE_INSTALL_LIBDIR=/opt/lib
flags=$(PKG_CONFIG_PATH=$scratch/absolute pkg-config --cflags --libs quelta-rete)
case $flags in
"-I/opt/q/include/quelta "*"-L/opt/lib -lquelta_util"*) ;;
*) fail "with an absolute libdir, pkg-config prints: $flags" ;;
esac
