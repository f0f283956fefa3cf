#!/usr/bin/env bash
# treescan_hostile_test.sh TREESCAN: a tree with names that are not text, loops of links, a pipe, 10^5 entries, a file
# and a folder that can't be read, and files that vanish meanwhile.
set -euo pipefail
tree=$(mktemp -d)
trap 'chmod 700 "$tree/closed"; rm -rf "$tree" "$tree.out" "$tree.err"' EXIT
printf 'one\n' >"$tree/"$'new\nline.txt'
printf 'two\n' >"$tree/"$'no\xff\xfetext.\x80'
ln -s . "$tree/loop"
ln -s self "$tree/self"
ln -s nowhere "$tree/dangling"
mkfifo "$tree/pipe"
mkdir "$tree/many" "$tree/closed"
touch "$tree/unreadable" && chmod 0 "$tree/unreadable" "$tree/closed"
(cd "$tree/many" && seq 100000 | xargs touch)
# Without these capabilities root may not read everything either.
as_user=()
[ "$(id -u)" != 0 ] || as_user=(setpriv --bounding-set=-dac_override,-dac_read_search)

"${as_user[@]}" "$1" --threads 3 "$tree" >"$tree.out" 2>"$tree.err"
for line in "files: 100003" "bytes: 8" "lines: 2"; do
    grep -aqx -- "$line" "$tree.out" || { echo "no line: $line" && exit 1; }
done
grep -aq ", 2 entries could not be read" "$tree.err"

"$1" --threads 3 "$tree" >"$tree.out" 2>"$tree.err" &
rm -rf "$tree/many"
wait $!
grep -aq '^files: ' "$tree.out"
