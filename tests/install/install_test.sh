#!/bin/sh
# Usage: install_test.sh BUILD-TREE CXX [compiler flags]
# Installs the build tree under a scratch prefix, builds and runs a program against it with CMake
# and with pkg-config, and configures a project that includes the sources as a subdirectory.
set -eu
build=$1
cxx=$2
flags=${3-}
here=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
prefix=$scratch/prefix

fail() {
    echo "FAILED: $*" >&2
    exit 1
}

cmake --install "$build" --prefix "$prefix" >"$scratch/install.log" ||
    fail "$(cat "$scratch/install.log")"

for file in bin/Rete include/quelta/util/LoaderInfo.h include/quelta/util/Logger.h \
    include/quelta/services/pipeline/indexprocessor/Rete.h share/man/man1/Rete.1 \
    share/man/man5/log-cmdline.cfg.5 share/quelta/sample/etc/log-cmdline.cfg; do
    [ -s "$prefix/$file" ] || fail "missing: $file"
done
[ ! -e "$prefix/include/quelta/util/internal" ] || fail "internal headers are installed"
for link in $(grep -o ']([^)]*)' "$prefix/share/doc/quelta/README.md" | tr -d ']()'); do
    [ -e "$prefix/share/doc/quelta/$link" ] || fail "the README links to $link"
done
[ ! -d "$here/../../build/docs/html" ] || [ -s "$prefix/share/doc/quelta/api/index.html" ] ||
    fail "the API reference is built but not installed"
for directory in share/quelta/sample/etc/myinstall share/quelta/sample/var/log; do
    [ -d "$prefix/$directory" ] || fail "missing: $directory"
done

grep -q "^cp -r $prefix/share/quelta/sample " "$prefix/share/man/man1/Rete.1" ||
    fail "Rete(1) does not name the installed sample"

# The installed files must not refer to the source or the build tree.
source=$(CDPATH= cd -- "$here/../.." && pwd)
if grep -rIl -e "$source" -e "$build" "$prefix"; then
    fail "these files refer to the source or the build tree"
fi

status=0
out=$(env -u QUELTA_HOME "$prefix/bin/Rete") || status=$?
[ "$status" -eq 255 ] || fail "Rete exited with $status"
[ "$out" = "QUELTA_HOME must be set.  Stopping." ] || fail "Rete printed: $out"

expect_consumer() {
    home=$scratch/home-$1
    cp -r "$prefix/share/quelta/sample" "$home"
    echo "category.Consumer=INFO" >>"$home/etc/log-cmdline.cfg"
    out=$(QUELTA_HOME=$home "$2" -n consumer) || fail "the program built with $1 exited with $?"
    expected="Using logging configuration at $home/etc/log-cmdline.cfg.
consumer settings
it fired"
    [ "$out" = "$expected" ] || fail "the program built with $1 printed: $out"
    grep -q 'INFO  Consumer - logged by consumer$' "$home/var/log/cmdline.log" ||
        fail "the program built with $1 did not log"
}

cmake -S "$here/consumer" -B "$scratch/consumer" -DCMAKE_PREFIX_PATH="$prefix" \
    -DCMAKE_CXX_COMPILER="$cxx" -DCMAKE_CXX_FLAGS="$flags" >"$scratch/cmake.log" 2>&1 &&
    cmake --build "$scratch/consumer" >>"$scratch/cmake.log" 2>&1 ||
    fail "$(cat "$scratch/cmake.log")"
expect_consumer cmake "$scratch/consumer/consumer"

PKG_CONFIG_PATH=$(dirname "$(find "$prefix" -name quelta.pc)")
export PKG_CONFIG_PATH
# shellcheck disable=SC2046,SC2086  # lists of words on purpose
"$cxx" -std=c++20 $flags "$here/consumer/consumer.cpp" -o "$scratch/by-pkg-config" \
    $(pkg-config --cflags --libs quelta) || fail "building by pkg-config"
expect_consumer pkg-config "$scratch/by-pkg-config"

mkdir "$scratch/parent"
cat >"$scratch/parent/CMakeLists.txt" <<END
cmake_minimum_required(VERSION 3.25)
project(parent LANGUAGES CXX)
add_subdirectory("$source" quelta)
add_executable(consumer "$here/consumer/consumer.cpp")
target_link_libraries(consumer PRIVATE quelta::rete quelta::loader quelta::util)
if(TARGET rule_console OR TARGET ReteTest)
  message(FATAL_ERROR "examples or tests are built for a parent project")
endif()
END
cmake -S "$scratch/parent" -B "$scratch/parent/build" -DCMAKE_CXX_COMPILER="$cxx" \
    >"$scratch/cmake.log" 2>&1 || fail "$(cat "$scratch/cmake.log")"
