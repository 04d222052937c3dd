#!/bin/sh
# Usage: install_test.sh BUILD-TREE CXX [compiler flags]
# Installs the build tree, of static or of shared libraries, under a scratch prefix. Builds and runs
# programs against it, with CMake and with pkg-config, and asks for components that are missing.
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

for file in bin/Rete bin/log_watch include/quelta/util/LoaderInfo.h \
    include/quelta/util/Logger.h include/quelta/util/Version.h \
    include/quelta/services/pipeline/indexprocessor/Rete.h share/man/man1/Rete.1 \
    share/man/man1/log_watch.1 share/man/man5/log-cmdline.cfg.5 \
    share/quelta/sample/etc/log-cmdline.cfg; do
    [ -s "$prefix/$file" ] || fail "missing: $file"
done
[ ! -e "$prefix/include/quelta/util/internal" ] || fail "internal headers are installed"
documents=$(dirname "$(find "$prefix/share/doc" -name README.md)")
for link in $(grep -o ']([^)]*)' "$documents/README.md" | tr -d ']()'); do
    [ -e "$documents/$link" ] || fail "the README links to $link"
done
[ ! -d "$here/../../build/docs/html" ] || [ -s "$documents/api/index.html" ] ||
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

pc=$(dirname "$(find "$prefix" -name quelta-util.pc)")
# For the shared libraries; they are beside the directory of the pkg-config files.
export LD_LIBRARY_PATH="$pc/.."

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

# configure NAME [ARGUMENT...]: configures a project that uses the installed libraries.
configure() {
    name=$1
    shift
    cmake -S "$scratch/$name" -B "$scratch/$name/build" -DCMAKE_PREFIX_PATH="$prefix" \
        -DCMAKE_CXX_COMPILER="$cxx" -DCMAKE_CXX_FLAGS="$flags" "$@" >"$scratch/cmake.log" 2>&1
}

cp -r "$here/consumer" "$here/collision" "$scratch"
configure consumer &&
    cmake --build "$scratch/consumer/build" --target consumer >>"$scratch/cmake.log" 2>&1 ||
    fail "$(cat "$scratch/cmake.log")"
expect_consumer cmake "$scratch/consumer/build/consumer"

export PKG_CONFIG_PATH="$pc"
# shellcheck disable=SC2046,SC2086  # lists of words on purpose
"$cxx" -std=c++20 $flags "$here/consumer/consumer.cpp" -o "$scratch/by-pkg-config" \
    $(pkg-config --cflags --libs quelta-rete quelta-loader) || fail "building by pkg-config"
expect_consumer pkg-config "$scratch/by-pkg-config"

# With shared libraries, a program may have classes of the library's names.
if [ -n "$(find "$prefix" -name 'libquelta_util.so.1')" ]; then
    cmake --build "$scratch/consumer/build" --target collision >"$scratch/cmake.log" 2>&1 ||
        fail "$(cat "$scratch/cmake.log")"
    out=$("$scratch/consumer/build/collision") || fail "the program with a class Mutex exited with $?"
    [ "$out" = "lock of the program
unlock of the program
worker" ] || fail "the library used the program's class Mutex: $out"
fi

# Components
find_project() {
    mkdir -p "$scratch/$1"
    printf '%s\n' 'cmake_minimum_required(VERSION 3.25)' 'project(finder LANGUAGES CXX)' \
        "find_package(quelta 1.0 REQUIRED $2)" 'message(STATUS "loader: ${quelta_loader_FOUND}")' \
        >"$scratch/$1/CMakeLists.txt"
}
expect_message() {
    tr -s '\n ' ' ' <"$scratch/cmake.log" | grep -qF "$1" ||
        fail "expected '$1', but CMake printed: $(cat "$scratch/cmake.log")"
}
find_project some "COMPONENTS util rete"
find_project all ""
find_project loader "COMPONENTS loader"
find_project nonsense "COMPONENTS nonsense"
configure all || fail "$(cat "$scratch/cmake.log")"
expect_message "loader: TRUE"
rm -r "$scratch/all/build"
export PKG_CONFIG_LIBDIR=/nowhere
unset PKG_CONFIG_PATH
configure some -DCMAKE_DISABLE_FIND_PACKAGE_LibXml2=ON || fail "$(cat "$scratch/cmake.log")"
configure all || fail "$(cat "$scratch/cmake.log")"
expect_message "loader: FALSE"
! configure loader || fail "the loader was found without popt"
expect_message "the component loader needs what is missing here: popt (found by pkg-config)"
! configure nonsense || fail "the component nonsense was found"
expect_message '"nonsense" is not one of the components util, rete and loader'

cmake --build "$build" --target uninstall >"$scratch/cmake.log" 2>&1 ||
    fail "$(cat "$scratch/cmake.log")"
left=$(find "$prefix" -type f -o -type l)
[ -z "$left" ] || fail "uninstall leaves: $left"
