# Read by every script: what it says of itself, which is the comment at its top.

usage() {
    sed -n '2,/^[^#]/s/^# \{0,1\}//p' "$0"
}

# refuse REASON...: for arguments that the script does not know.
refuse() {
    echo "script/${0##*/}: $*" >&2
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
