#!/usr/bin/env bash
# treescan_hostile_test.sh TREESCAN: a tree with names that are no text, loops of links, a pipe, 10^5 entries, a file
# that can't be read (as another user than root) and files that vanish meanwhile.
set -euo pipefail
tree=$(mktemp -d)
trap 'rm -rf "$tree" "$tree.out" "$tree.err"' EXIT
printf 'one\n' >"$tree/"$'new\nline.txt'
printf 'two\n' >"$tree/"$'no\xff\xfetext.\x80'
ln -s . "$tree/loop"
ln -s self "$tree/self"
ln -s nowhere "$tree/dangling"
mkfifo "$tree/pipe"
unreadable=0
if [ "$(id -u)" != 0 ]; then
    touch "$tree/unreadable" && chmod 0 "$tree/unreadable"
    unreadable=1
fi
mkdir "$tree/many"
(cd "$tree/many" && seq 100000 | xargs touch)

"$1" --threads 3 "$tree" >"$tree.out" 2>"$tree.err"
for line in "files: $((100002 + unreadable))" "bytes: 8" "lines: 2"; do
    grep -aqx -- "$line" "$tree.out" || { echo "no line: $line" && exit 1; }
done
grep -aq ", $unreadable entries could not be read" "$tree.err"

"$1" --threads 3 "$tree" >"$tree.out" 2>"$tree.err" &
rm -rf "$tree/many"
wait $!
grep -aq '^files: ' "$tree.out"
