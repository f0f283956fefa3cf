#!/usr/bin/env bash
# record_test.sh RECORD CASE [COMPILER OPTIONS...]: runs the recorder on programs whose rows are known.
set -euo pipefail
record=$1 case=$2
shift 2
here=$(cd "$(dirname "$0")" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$work"

fail() { echo "record_test: $*" >&2 && exit 1; }

# expect STATUS COMMAND...: its output goes to out, its errors to err.
expect() {
    local wanted=$1 status=0
    shift
    "$@" >out 2>err || status=$?
    [ "$status" = "$wanted" ] || { cat err && fail "status $status instead of $wanted: $*"; }
}

says() { grep -q -- "$1" "${2:-err}" || { cat "${2:-err}" && fail "not said: $1"; }; }

# The rows that the comments of a source foretell, and those of a report in CSV: line, calls, bytes, live blocks and bytes.
foretold() { awk 'match($0, /\/\/ row .*/) {print FNR, substr($0, RSTART + 7)}' "$here/$1"; }
reported() { awk -F, -v file="/$1\"" 'index($1, file) {print $2, $7, $5, $3, $4}' report | sort -n; }
same() { diff "$1" "$2" >&2 || fail "rows of $3: the left ones are expected"; }

# Lines without a comment allocate what depends on the C library's version, such as a thread's block.
check_rows() {
    foretold "$1" >foretold
    reported "$1" | awk 'NR == FNR {known[$1]; next} $1 in known' foretold - >reported
    same foretold reported "$1"
}

case $case in
c) # rows by line, and the disk account of a program that closes every descriptor
    "$@" "$here/seeded.c" -o seeded_c
    expect 0 "$record" --csv --output report --skip xmalloc ./seeded_c "$work/data"
    check_rows seeded.c
    # opens, closes, seeks, reads and their bytes, writes and theirs; without the times
    same <(echo "2 3 2 3 142 2 115") <(awk -F, '$1 ~ /\/data"/ {print $2, $4, $6, $8, $10, $11, $13}' report) data
    ;;
cpp) # rows by line, also of libraries that are loaded at the same address one after the other
    "$@" -std=c++17 "$here/seeded.cpp" -pthread -o seeded_cpp
    "$@" -fPIC -shared -DPLUG_IN_NAME='"one.c"' -DPLUG_IN_COUNT=6 "$here/plug_in.cpp" -o one.so
    "$@" -fPIC -shared -DPLUG_IN_NAME='"two.c"' -DPLUG_IN_COUNT=4 "$here/plug_in.cpp" -o two.so
    expect 0 "$record" --csv --output report ./seeded_cpp ./one.so ./two.so
    check_rows seeded.cpp
    same <(echo 1 6 36 6 36) <(reported one.c) one.c
    same <(echo 1 4 16 4 16) <(reported two.c) two.c
    ;;
*) fail "no such case: $case" ;;
esac
