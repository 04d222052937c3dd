#!/bin/sh
# Usage: scripts_test.sh
# Runs the scripts in a scratch copy, with the package tools, cmake and the program replaced by ones
# that note how they were called.
set -eu
source=$(CDPATH= cd -- "$(dirname -- "$0")/../.." && pwd)
scratch=$(cd "$(mktemp -d)" && pwd -P)
trap 'rm -rf "$scratch"' EXIT
clone=$scratch/clone
tools=$scratch/tools
mkdir -p "$clone" "$tools"
cp -r "$source/script" "$source/sample" "$clone"
mkdir -p "$clone/bench" "$clone/fuzz/corpus/Strings"
touch "$clone/bench/LoggerBench.cpp"

tool() {
    mkdir -p "$(dirname "$1")"
    { echo '#!/bin/sh'; cat; } >"$1"
    chmod +x "$1"
}
tool "$tools/cmake" <<'END'
echo "cmake $*"
END
tool "$tools/apt-get" <<'END'
echo "apt-get $*"
END
tool "$tools/id" <<'END'
echo "$user"
END
tool "$tools/sudo" <<'END'
exit 1
END
tool "$tools/dpkg-query" <<'END'
for package do :; done
[ "$package" = "$absent" ] || echo 'install ok installed'
END
tool "$clone/build/release/src/services/pipeline/indexprocessor/Rete" <<'END'
echo "home=$QUELTA_HOME in=$(pwd -P) args=$*"
echo "from the program" >&2
exit 3
END

PATH=$tools:$PATH
user=0
absent=
export user absent
unset QUELTA_HOME

# Runs a script; its status, standard output and standard error are left in $status, $out, $err.
run() {
    status=0
    out=$("$@" 2>"$scratch/err") || status=$?
    err=$(cat "$scratch/err")
}
expect() {
    [ "$2" = "$3" ] && return
    printf 'FAILED: %s\nexpected: %s\n     got: %s\n' "$1" "$3" "$2" >&2
    exit 1
}

home=$clone/build/release/sample
cd "$scratch"
run "$clone/script/run" one "two words"
expect "status passes through" "$status" 3
expect "only the program's own output" "$out" "home=$home in=$scratch args=one two words"
expect "the build's words and the program's" "$err" "cmake --preset release
cmake --build --preset release --target Rete
from the program"
cmp "$source/sample/etc/log-cmdline.cfg" "$home/etc/log-cmdline.cfg"
[ -d "$home/etc/myinstall" ] && [ -d "$home/var/log" ]

echo "# edited" >"$home/etc/log-cmdline.cfg"
run "$clone/script/run"
expect "an edited configuration stays" "$(cat "$home/etc/log-cmdline.cfg")" "# edited"

rm -r "$home"
QUELTA_HOME=relative/home run "$clone/script/run"
expect "the caller's installation" "$out" "home=relative/home in=$scratch args="
QUELTA_HOME= run "$clone/script/run"
expect "an installation set to nothing" "$out" "home= in=$scratch args="
expect "no sample is laid down then" "$(ls -d "$home" 2>/dev/null || true)" ""

absent=libpopt-dev
user=1000
for script in "run" "bootstrap run" "test"; do
    # shellcheck disable=SC2086  # a list of words on purpose
    run "$clone/script/"$script
    expect "$script without rights: status" "$status" 77
    expect "$script without rights: output" "$out" ""
    expect "$script without rights: what to do" "$err" \
        "Some packages are missing. Run this once, then try again:
    sudo apt-get install -y libpopt-dev"
done

user=0
run "$clone/script/bootstrap" run
expect "with rights: status" "$status" 0
expect "with rights: output" "$out" ""
expect "with rights: installs" "$err" "Installing: libpopt-dev
apt-get update -qq
apt-get install -y -qq --no-install-recommends libpopt-dev"

absent=
run "$clone/script/bootstrap" run test
expect "nothing missing" "$status $out$err" "0 "

for script in bench bootstrap check coverage docs fuzz lint run sanitize test; do
    run "$clone/script/$script" --help
    expect "$script --help: status and error" "$status $err" "0 "
    case $out in
    "Usage: script/$script"*) ;;
    *) expect "$script --help" "$out" "Usage: script/$script ..." ;;
    esac
done

# refused "SCRIPT ARGUMENTS" REASON: nothing is installed or built.
absent=clang
refused() {
    # shellcheck disable=SC2086  # a list of words on purpose
    run clone/script/$1
    expect "$1: status and output" "$status $out" "2 "
    expect "$1: reason" "$(printf '%s\n' "$err" | head -n 2)" "script/${1%% *}: $2
$(sed -n '2s/^# //p' "$clone/script/${1%% *}")"
}
refused bootstrap "no group is named"
refused "bootstrap run nonsense" "unknown group 'nonsense'"
refused "bench --fast" "unknown program '--fast', not one of LoggerBench"
refused "check nonsense" "unknown check 'nonsense'"
refused "docs nonsense" "it takes no arguments"
refused "fuzz ten" "'ten' is no number of seconds"
refused "fuzz 10 nonsense" "unknown topic 'nonsense', not one of Strings"
refused "lint format nonsense" "unknown check 'nonsense'"
refused "sanitize asan" "a sanitizer and a compiler are needed"
refused "sanitize ubsan g++" "unknown sanitizer 'ubsan'"
