#!/usr/bin/env bash
# exported_symbols.sh LIBRARY [--update]: compares what LIBRARY exports with docs/exported_symbols.txt, so that
# nothing joins or leaves the interface unnoticed.
set -euo pipefail
export LC_ALL=C
list=$(dirname "$0")/../../docs/exported_symbols.txt
symbols() { nm -D --defined-only "$1" | awk '{print $3}' | c++filt | sort -u; }
if [ "${2:-}" = --update ]; then
    symbols "$1" >"$list"
else
    diff "$list" <(symbols "$1")
fi
