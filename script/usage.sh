# Read by every script, with the project's folder in $root: what the script says of itself, which is
# the comment at its top.

self=$(CDPATH= cd -- "$(dirname -- "$0")" && pwd)/${0##*/}

usage() {
    sed -n '2,/^[^#]/s/^# \{0,1\}//p' "$self"
}

# refuse REASON...: for arguments that the script does not know.
refuse() {
    echo "${self#"$root"/}: $*" >&2
    usage >&2
    exit 2
}

if [ $# -eq 1 ]; then
    case $1 in
    -h | --help)
        usage
        exit 0
        ;;
    esac
fi
