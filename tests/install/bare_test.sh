#!/bin/sh
# Usage: bare_test.sh DIRECTORY
# Installs the Debian packages in the directory, which mmdebstrap can read, in a new system of this
# release; builds the consumer there with CMake and runs it.
set -eu
here=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)
packages=$(CDPATH= cd -- "$1" && pwd)
. /etc/os-release

mmdebstrap --quiet --variant=apt --format=null \
    --customize-hook="copy-in $here/consumer $here/collision $packages /root" \
    --customize-hook='chroot "$1" env -i PATH="$PATH" HOME=/root sh -euc "
        export DEBIAN_FRONTEND=noninteractive
        cd /root
        apt-get install -y -qq --no-install-recommends ./*/libquelta*.deb g++ cmake make
        cmake -S consumer -B build
        cmake --build build --target consumer
        apt-get install -y -qq --no-install-recommends ./*/quelta_*.deb
        cp -r /usr/share/quelta/sample home
        QUELTA_HOME=home build/consumer -n bare | tail -n 1 >fired
        grep -qx \"it fired\" fired
        man=/usr/share/man/man1/Rete.1.gz
        [ -s /usr/bin/Rete ] && [ -s \$man ]"' \
    "$VERSION_CODENAME" /dev/null >&2
