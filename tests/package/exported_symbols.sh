#!/usr/bin/env bash
# exported_symbols.sh LIBRARY [--update]: compares what LIBRARY exports with docs/exported_symbols.txt, so that
# nothing joins or leaves the interface unnoticed.
set -euo pipefail
list=$(dirname "$0")/../../docs/exported_symbols.txt
symbols=$(nm -D --defined-only "$1" | awk '{print $3}' | c++filt | LC_ALL=C sort -u)
if [ "${2:-}" = --update ]; then echo "$symbols" >"$list"; fi
diff "$list" - <<<"$symbols"
