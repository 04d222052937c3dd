# Sourced by every script with $root set; prints the script's help, which is the comment at its top.

self=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)/${0##*/}
started=$(date +%s)

usage() {
    sed -n '2,/^[^#]/s/^# \{0,1\}//p' "$self"
}

# refuse REASON...: for arguments that the script does not accept.
refuse() {
    echo "${self#"$root"/}: $*" >&2
    usage >&2
    exit 2
}

# step NAME: a progress line with the seconds since the start.
step() {
    printf '\n== %s (%ds)\n' "$*" "$(($(date +%s) - started))" >&2
}

if [ $# -eq 1 ]; then
    case $1 in
    -h | --help)
        usage
        exit 0
        ;;
    esac
fi
