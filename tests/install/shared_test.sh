#!/bin/sh
# Usage: shared_test.sh BUILD-TREE CXX UNIFORM-RANDOM-LIBRARY
# Builds the shared libraries in BUILD-TREE, then checks their symbols, programs that use them, and
# the Debian packages.
set -eu
here=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)
build=$1
cxx=$2

fail() {
    echo "FAILED: $*" >&2
    exit 1
}

mkdir -p "$build"
(cd "$here/../.." && cmake --preset package -B "$build" -DCMAKE_CXX_COMPILER="$cxx" &&
    cmake --build "$build") >"$build/build.log" 2>&1 || fail "$(cat "$build/build.log")"

# What the sources of the public headers define is exported, except what hidden.txt lists. What
# internal/ defines is not, except some members of LogFormat.
library=$build/src/util/libquelta_util.so
objdump -p "$library" | grep -q 'SONAME *libquelta_util\.so\.1$' || fail "wrong soname"
defined() {
    find "$build/src/util/CMakeFiles/quelta_util.dir" -name '*.o' "$@" -exec nm --defined-only {} + |
        sed -n 's/^[0-9a-f]* [TBDR] //p' | sort -u
}
nm -D --defined-only "$library" | sed 's/^[0-9a-f]* . //' | sort -u >"$build/exported"
defined -path '*/internal/*' >"$build/internal"
defined ! -path '*/internal/*' >"$build/public"
[ -s "$build/internal" ] && [ -s "$build/public" ] || fail "no symbols are found"
hidden=$(comm -13 "$build/exported" "$build/public" | c++filt |
    grep -vxF -f "$here/hidden.txt" || true)
[ -z "$hidden" ] || fail "not in util.map: $hidden"
leaked=$(comm -12 "$build/exported" "$build/internal" | c++filt | grep -v '^LogFormat::' || true)
[ -z "$leaked" ] || fail "internal, but exported: $leaked"

"$here/install_test.sh" "$build" "$cxx"
"$here/deb_test.sh" "$build" "$3"
