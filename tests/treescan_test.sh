#!/usr/bin/env bash
# treescan_test.sh TREESCAN…: the totals of treescan on a made tree beside those of find and wc, with one thread and
# several, and its answers to bad calls.
set -euo pipefail
treescan=("$@")
tree=$(mktemp -d)
trap 'rm -rf "$tree" "$tree.out"' EXIT
mkdir -p "$tree/a b/c" "$tree/empty"
seq 100000 >"$tree/a b/numbers.txt"
printf 'no newline at the end' >"$tree/a b/c/short.txt"
head -c 524288 /dev/zero >"$tree/two-blocks.bin"
for i in {1..300}; do echo "$i" >"$tree/a b/c/$i.h"; done
touch "$tree"/empty/{a.one,b.two}
if [[ $1 != *wine* ]]; then # which shows a program what a link leads to
    ln -s "$tree/a b" "$tree/link-to-directory"
    ln -s "$tree/two-blocks.bin" "$tree/link-to-file"
fi
fail() { cat "$tree.out" && echo "treescan_test: $*" >&2 && exit 1; }
files=$(find "$tree" -type f | wc -l)
read -r lines bytes < <(find "$tree" -type f -print0 | xargs -0 cat | wc -lc)
for threads in 1 2 5; do
    "${treescan[@]}" --leak --threads $threads --top 3 "$tree" 2>/dev/null | tr -d '\r' >"$tree.out"
    for line in "files: $files" "bytes: $bytes" "lines: $lines" "(2 others)  *2  *0  *0" "read: .*" "Memory Leak Report.*" \
        "| File  |$(printf %8d "$files") .*" "| Open  |$(printf %8d "$files") .*"; do
        grep -qx -- "$line" "$tree.out" || fail "no line: $line"
    done
done
for call in "$tree/missing" "--threads 0 $tree" --bogus ""; do
    # shellcheck disable=SC2086 # several words
    "${treescan[@]}" $call >"$tree.out" 2>&1 && fail "accepted: $call"
    [ "$(wc -l <"$tree.out")" = 1 ] || fail "not one line for: $call"
done
