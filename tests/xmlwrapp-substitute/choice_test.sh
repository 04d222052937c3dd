#!/bin/sh
# Usage: choice_test.sh CXX
# Configures the project with and without an installed xmlwrapp, and checks what CMake reports and
# which header LoaderInfo is compiled with. The installed one is a copy of the substitute's header.
set -eu
cxx=$1
# A compiler cache that makes paths relative would hide which header is used.
unset CMAKE_CXX_COMPILER_LAUNCHER CCACHE_BASEDIR
source=$(CDPATH= cd -- "$(dirname -- "$0")/../.." && pwd)
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
prefix=$scratch/prefix
mkdir -p "$prefix/include" "$prefix/cmake" "$prefix/pkgconfig"
cp -r "$source/src/xmlwrapp-substitute/xmlwrapp" "$prefix/include"
cat >"$prefix/cmake/XmlwrappConfig.cmake" <<END
add_library(xmlwrapp::xmlwrapp INTERFACE IMPORTED)
target_include_directories(xmlwrapp::xmlwrapp INTERFACE "$prefix/include")
END
cat >"$prefix/pkgconfig/xmlwrapp.pc" <<END
Name: xmlwrapp
Description: made up
Version: 0.5.0
Cflags: -I$prefix/include
END

# expect TITLE STATUS WORDS [cmake arguments]: configures, and checks the status and the output.
expect() {
    title=$1
    wanted=$2
    words=$3
    shift 3
    rm -rf "$scratch/build"
    status=0
    cmake -S "$source" -B "$scratch/build" -G Ninja -DCMAKE_CXX_COMPILER="$cxx" \
        -DQUELTA_BUILD_TESTS=OFF -DQUELTA_BUILD_EXAMPLES=OFF "$@" >"$scratch/log" 2>&1 || status=1
    if [ "$status" -ne "$wanted" ] || ! grep -qF -- "$words" "$scratch/log"; then
        echo "FAILED: $title: status $status, and this:" >&2
        cat "$scratch/log" >&2
        exit 1
    fi
}
expect_header() {
    object=src/util/CMakeFiles/quelta_loader.dir/LoaderInfo.cpp.o
    ninja -C "$scratch/build" "$object" >"$scratch/log" 2>&1 || { cat "$scratch/log" >&2; exit 1; }
    if ! ninja -C "$scratch/build" -t deps "$object" | grep -qF "$1/xmlwrapp/node.h"; then
        echo "FAILED: LoaderInfo was not compiled with the header in $1" >&2
        exit 1
    fi
}

package_file=-DXmlwrapp_DIR=$prefix/cmake
expect "its package file" 0 "xmlwrapp: system ($prefix/cmake/XmlwrappConfig.cmake)" "$package_file"
expect_header "$prefix/include"
expect "forced to its own" 0 "xmlwrapp: substitute" "$package_file" -DQUELTA_XMLWRAPP=substitute
expect_header "$source/src/xmlwrapp-substitute"
expect "no such choice" 1 "must be auto, system or substitute" -DQUELTA_XMLWRAPP=other

PKG_CONFIG_PATH=$prefix/pkgconfig
export PKG_CONFIG_PATH
expect "pkg-config" 0 "xmlwrapp: system (pkg-config, version 0.5.0)" -DQUELTA_XMLWRAPP=system
expect_header "$prefix/include"

unset PKG_CONFIG_PATH
if ! pkg-config --exists xmlwrapp; then
    expect "none installed" 0 "xmlwrapp: substitute"
    expect "none installed, one wanted" 1 "neither its package file nor pkg-config finds" \
        -DQUELTA_XMLWRAPP=system
fi
