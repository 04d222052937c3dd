#!/bin/sh
# Usage: deb_test.sh BUILD-TREE UNIFORM-RANDOM-LIBRARY
# Builds the Debian package, then installs, runs and removes it with dpkg in a scratch root. Uses
# fakeroot when not run as root.
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
set -- "$scratch"/package/quelta_*.deb
[ $# -eq 1 ] && [ -f "$1" ] || fail "not one package: $*"
deb=$1

# The scratch root has this machine's package list, so that dpkg checks dependencies. It has no file
# lists, so dpkg prints harmless warnings.
mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
cp /var/lib/dpkg/status "$root/var/lib/dpkg/status"
in_root() {
    dpkg --root="$root" --force-not-root "$@" >"$scratch/dpkg.log" 2>&1 ||
        fail "dpkg $*: $(grep -v 'files list file for package' "$scratch/dpkg.log")"
}
files_below() {
    (cd "$root" && find . -path ./var/lib/dpkg -prune -o ! -type d -print)
}

for library in libpopt0 libxml2 libstdc++6 libc6; do
    dpkg-deb --field "$deb" Depends | grep -qF "$library (>=" || fail "does not depend on $library"
done

in_root --install "$deb"
dpkg-query --admindir="$root/var/lib/dpkg" -W -f '${Status}\n' quelta 2>/dev/null |
    grep -qx 'install ok installed' || fail "not installed"

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

grep -q "^cp -r /usr/share/quelta/sample " "$root/usr/share/man/man1/Rete.1" ||
    fail "Rete(1) does not name the installed sample"
for page in man1/Rete.1 man5/log-cmdline.cfg.5; do
    "$here/../man/page_test.sh" "$root/usr/share/man/$page" || fail "$page"
done

in_root --purge quelta
left=$(files_below)
[ -z "$left" ] || fail "files are left: $left"
[ ! -e "$root/usr/share/quelta" ] && [ ! -e "$root/usr/include/quelta" ] ||
    fail "directories are left"
