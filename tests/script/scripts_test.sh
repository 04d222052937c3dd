#!/bin/sh
# Usage: scripts_test.sh
# Runs the scripts in a copy, in a directory whose name has a blank. The package tools, cmake and
# the program are replaced by ones that print how they were called.
set -eu
source=$(CDPATH= cd -- "$(dirname -- "$0")/../.." && pwd)
scratch=$(cd "$(mktemp -d)" && pwd -P)
trap 'rm -rf "$scratch"' EXIT
clone="$scratch/a clone"
tools=$scratch/tools
mkdir -p "$clone/bench" "$clone/fuzz/corpus/Strings" "$tools"
cp -r "$source/script" "$source/sample" "$clone"
touch "$clone/bench/LoggerBench.cpp"
cat >"$clone/script/packages.txt" <<'END'
run shell sh
run libpopt-dev is_there popt
test libgtest-dev is_there gtest
platforms shell sh
END

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
tool "$tools/is_there" <<'END'
[ "$1" != "$absent" ]
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

# Runs a script; leaves its status, standard output and standard error in $status, $out and $err.
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
expect "the program's status" "$status" 3
expect "only the program's output" "$out" "home=$home in=$scratch args=one two words"
expect "the messages of the build and the program" "$err" "cmake --preset release
cmake --build --preset release --target Rete
from the program"
cmp "$source/sample/etc/log-cmdline.cfg" "$home/etc/log-cmdline.cfg"
[ -d "$home/etc/myinstall" ] && [ -d "$home/var/log" ]

echo "# edited" >"$home/etc/log-cmdline.cfg"
run "$clone/script/run"
expect "an edited configuration is kept" "$(cat "$home/etc/log-cmdline.cfg")" "# edited"

rm -r "$home"
QUELTA_HOME=relative/home run "$clone/script/run"
expect "the caller's installation" "$out" "home=relative/home in=$scratch args="
QUELTA_HOME= run "$clone/script/run"
expect "an empty QUELTA_HOME" "$out" "home= in=$scratch args="
expect "no sample is created then" "$(ls -d "$home" 2>/dev/null || true)" ""

absent=popt
user=1000
for script in "run" "bootstrap run" "test"; do
    # shellcheck disable=SC2086  # a list of words on purpose
    run "$clone/script/"$script
    expect "$script without rights: status" "$status" 77
    expect "$script without rights: output" "$out" ""
    expect "$script without rights: the line to run" "$err" \
        "Some packages are missing. Run this once, then try again:
    sudo apt-get update && sudo apt-get install -y libpopt-dev"
done

absent=
run "$clone/script/platforms" debian13
expect "a platform without rights" "$status $out" "0 $(
    printf '%-9s %-51s %s' debian13 '' 'skipped: needs the rights of root')"

absent=popt
user=0
run "$clone/script/bootstrap" run test
expect "with rights: status and output" "$status $out" "0 "
expect "with rights: installs" "$err" "Installing: libpopt-dev
apt-get update -qq
apt-get install -y -qq --no-install-recommends libpopt-dev"

absent=
run "$clone/script/bootstrap" run test
expect "nothing is missing" "$status $out$err" "0 "

for script in bench bootstrap check fuzz platforms run test; do
    run "$clone/script/$script" --help
    expect "$script --help: status and error" "$status $err" "0 "
    case $out in
    "Usage: script/$script"*) ;;
    *) expect "$script --help" "$out" "Usage: script/$script ..." ;;
    esac
done
run "$clone/script/check" --list
expect "check --list: first line" "$(printf '%s\n' "$out" | sed -n '1s/  .*//p')" format

# refused SCRIPT REASON [ARGUMENT...]: nothing is installed or built.
absent=popt
refused() {
    script=$1
    reason=$2
    shift 2
    run "$clone/script/$script" "$@"
    expect "$script $*: status and output" "$status $out" "2 "
    expect "$script $*: reason" "$(printf '%s\n' "$err" | head -n 2)" "script/$script: $reason
$(sed -n '2s/^# //p' "$clone/script/$script")"
}
refused bootstrap "no group is named"
refused bootstrap "unknown group 'nonsense'" run nonsense
refused bench "unknown program '--fast', not one of LoggerBench" --fast
refused check "unknown check 'nonsense'" format nonsense
refused platforms "unknown platform 'nonsense', not one of g++12 clang14 c++23 clang16 libc++ arm64 \
armhf s390x debian13" nonsense
refused fuzz "'ten' is not a number of seconds" ten
refused fuzz "unknown topic 'nonsense', not one of Strings" 10 nonsense
