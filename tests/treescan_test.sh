#!/usr/bin/env bash
# treescan_test.sh TREESCAN: the totals of treescan on a made tree beside those of find and wc, with one thread and
# several, and its answers to bad calls.
set -euo pipefail
treescan=$1
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
mkdir -p "$tree/a b/c" "$tree/empty"
seq 100000 >"$tree/a b/numbers.txt"
printf 'no newline at the end' >"$tree/a b/c/short.txt"
head -c 524288 /dev/zero >"$tree/two-blocks.bin"
: >"$tree/nothing"
for i in {1..300}; do echo "$i" >"$tree/a b/c/$i.h"; done
ln -s "$tree/a b" "$tree/link-to-directory"
ln -s "$tree/nothing" "$tree/link-to-file"

fail() { echo "treescan_test: $*" >&2 && exit 1; }
expect() { grep -qxF -- "$1" "$tree.out" || { cat "$tree.out" && fail "no line: $1"; }; }
trap 'rm -rf "$tree" "$tree.out"' EXIT

files=$(find "$tree" -type f | wc -l)
read -r lines bytes < <(find "$tree" -type f -print0 | xargs -0 cat | wc -lc)
for threads in 1 2 5; do
    "$treescan" --threads $threads --top 3 "$tree" >"$tree.out" 2>/dev/null
    expect "files: $files"
    expect "bytes: $bytes"
    expect "lines: $lines"
    expect "| File  |$(printf '%8d' $((files))) |             |          |"
    expect "| Open  |$(printf '%8d' $((files))) $(grep -F '| Open  |' "$tree.out" | cut -c19-)"
    grep -q '^Memory Leak Report' "$tree.out" && fail "leaks without --leak"
    grep -q '^read: ' "$tree.out" || fail "no timers"
done
"$treescan" --leak --top 3 "$tree" 2>/dev/null | grep -q '^Memory Leak Report' || fail "no leak report"
for call in "$tree/missing" "--threads 0 $tree" "--bogus" ""; do
    # shellcheck disable=SC2086 # several words
    "$treescan" $call >"$tree.out" 2>&1 && fail "accepted: $call"
    [ "$(wc -l <"$tree.out")" = 1 ] || fail "not one line for: $call"
done
echo "treescan_test: passed"
