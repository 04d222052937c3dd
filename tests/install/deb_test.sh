#!/bin/sh
# Usage: deb_test.sh BUILD-TREE UNIFORM-RANDOM-LIBRARY
# Builds the Debian packages, then installs, runs and removes them with dpkg in a scratch root. Uses
# fakeroot when not run as root. Runs lintian if it is installed.
set -eu
here=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)
build=$1
uniform_random=$2
if [ "$(id -u)" -ne 0 ] && [ -z "${FAKEROOTKEY-}" ]; then
    exec fakeroot "$0" "$@"
fi
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
root=$scratch/root
PATH=$PATH:/usr/local/sbin:/usr/sbin:/sbin

fail() {
    echo "FAILED: $*" >&2
    exit 1
}

cpack --config "$build/CPackConfig.cmake" -B "$scratch/package" >"$scratch/cpack.log" 2>&1 ||
    fail "$(cat "$scratch/cpack.log")"
set -- "$scratch"/package/*.deb
[ "$(for deb; do dpkg-deb --field "$deb" Package; done | xargs)" = "libquelta-dev libquelta1 quelta" ] ||
    fail "other packages than the three: $*"

if command -v lintian >/dev/null; then
    lintian --allow-root --fail-on error "$@" >&2 ||
        fail "lintian finds errors"
fi

# The scratch root has this machine's package list, so that dpkg checks dependencies. It has no file
# lists, so dpkg prints harmless warnings. It has no shell, so the scripts that update the cache of
# shared libraries run outside, with another ldconfig.
mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
cp /var/lib/dpkg/status "$root/var/lib/dpkg/status"
mkdir "$scratch/tools"
printf '#!/bin/sh\necho called >>"%s"\n' "$scratch/ldconfig.log" >"$scratch/tools/ldconfig"
chmod +x "$scratch/tools/ldconfig"
in_root() {
    PATH=$scratch/tools:$PATH dpkg --root="$root" --force-not-root --force-script-chrootless "$@" >"$scratch/dpkg.log" 2>&1 ||
        fail "dpkg $*: $(grep -v 'files list file for package' "$scratch/dpkg.log")"
}
files_below() {
    (cd "$root" && find . -path ./var/lib/dpkg -prune -o ! -type d -print)
}

# expect_depends PACKAGE DEPENDENCY...
expect_depends() {
    depends=$(dpkg-deb --field "$scratch/package/$1"_*.deb Depends)
    package=$1
    shift
    for dependency; do
        case "$depends, " in
        *"$dependency"[,\ ]*) ;;
        *) fail "$package does not depend on $dependency but on $depends" ;;
        esac
    done
}
version=$(dpkg-deb --field "$1" Version)
expect_depends quelta "libquelta1 (= $version)" libstdc++6 libc6
expect_depends libquelta1 libpopt0 libxml2 libstdc++6 libc6
expect_depends libquelta-dev "libquelta1 (= $version)" libpopt-dev pkgconf

in_root --install "$@"
for package in quelta libquelta1 libquelta-dev; do
    dpkg-query --admindir="$root/var/lib/dpkg" -W -f '${Status}\n' $package 2>/dev/null |
        grep -qx 'install ok installed' || fail "$package is not installed"
done
[ -s "$scratch/ldconfig.log" ] || fail "the cache of shared libraries is not updated"
LD_LIBRARY_PATH=$(dirname "$(find "$root/usr/lib" -name libquelta_util.so.1)")
export LD_LIBRARY_PATH

home=$scratch/home
cp -r "$root/usr/share/quelta/sample" "$home"
status=0
out=$(env -u QUELTA_HOME "$root/usr/bin/Rete") || status=$?
[ "$status" -eq 255 ] || fail "Rete exited with $status"
[ "$out" = "QUELTA_HOME must be set.  Stopping." ] || fail "Rete printed: $out"
# With a random() that always returns 0, a run is short. The library gets a name without blanks,
# because blanks separate the names in LD_PRELOAD.
ln -s "$uniform_random" "$scratch/random.so"
out=$(LD_PRELOAD="$scratch/random.so" QUELTA_HOME="$home" "$root/usr/bin/Rete") ||
    fail "Rete exited with $?"
expected="Using logging configuration at $home/etc/log-cmdline.cfg.
1 conditions
\[\]
0 implications
TIME = [01]"
case $out in
$expected) ;;
*) fail "Rete printed: $out" ;;
esac

gunzip -r "$root/usr/share/man"
grep -q "^cp -r /usr/share/quelta/sample " "$root/usr/share/man/man1/Rete.1" ||
    fail "Rete(1) does not name the installed sample"
for page in "$root"/usr/share/man/man*/*; do
    "$here/../man/page_test.sh" "$page" || fail "$page"
done
gzip -r "$root/usr/share/man"

in_root --purge quelta libquelta-dev libquelta1
left=$(files_below)
[ -z "$left" ] || fail "files are left: $left"
[ ! -e "$root/usr/share/quelta" ] && [ ! -e "$root/usr/include/quelta" ] ||
    fail "directories are left"
