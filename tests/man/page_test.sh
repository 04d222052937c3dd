#!/bin/sh
# Usage: page_test.sh PAGE
# Formats a manual page and fails on any warning.
set -eu
warnings=$(groff -man -Tutf8 -wall -z "$1" 2>&1)
[ -z "$warnings" ] || { echo "$warnings" >&2; exit 1; }
text=$(groff -man -Tutf8 -P-cbou "$1")
case $text in
*@*) echo "a placeholder was left in $1" >&2; exit 1 ;;
*'SEE ALSO'*) ;;
*) echo "$1 is cut short" >&2; exit 1 ;;
esac
