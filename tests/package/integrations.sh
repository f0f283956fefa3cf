#!/usr/bin/env bash
# integrations.sh SOURCES BUILD: the headers for other libraries, each in a program that uses it, and what the accounts are
# written for in programs that read it: a parser of OpenMetrics and pprof.
set -euo pipefail
sources=$1/tests/package/integrations build=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
export LD_LIBRARY_PATH=$build/src HOME=$work
flags=(-std=c++17 -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Werror -O0
    "-I$1/include" "-I$build/include" "-L$build/src")

for tool in go /usr/bin/python3; do
    command -v $tool >/dev/null || { echo "needs $tool" && exit 1; }
done
for header in protozero/pbf_builder.hpp zlib.h nlohmann/json.hpp catch2/catch.hpp benchmark/benchmark.h; do
    g++ -E -x c++ - <<<"#include <$header>" >/dev/null 2>&1 || { echo "needs $header" && exit 1; }
done

program() { # NAME LIBRARY…
    g++ "${flags[@]}" "$sources/$1.cpp" -lzanbase "${@:2}" -o "$work/$1"
}
# expect TEXT COMMAND…: the command's output has to have the lines of TEXT, in this order.
expect() {
    local output line rest
    output=$("${@:2}" 2>&1) || true
    rest=$output
    while read -r line; do
        [[ $rest == *"$line"* ]] || { echo "${*:2}: no '$line' in: $output" && exit 1; }
        rest=${rest#*"$line"}
    done <<<"$1"
}

program readers -lz
"$work/readers" "$work"
expect 'zanbase_memory_site_live_bytes [(('"'"'/src/"a\\ b".cpp'"'"', '"'"'7'"'"'), 70)
zanbase_disk_io_operations
zanbase_timer_seconds [(('"'"'load'"'"', '"'"'0'"'"'), 1.5), (('"'"'load'"'"', '"'"'1'"'"'), 2)]' /usr/bin/python3 - "$work/metrics" <<'END_OF_PYTHON'
import sys
from prometheus_client.openmetrics.parser import text_string_to_metric_families
for family in text_string_to_metric_families(open(sys.argv[1], newline="", encoding="utf-8").read()):
    print(family.name, [(tuple(sample.labels.values()), sample.value) for sample in family.samples])
END_OF_PYTHON
expect 'Time: 2025-06-15 15:06:40.25 +0000 UTC
inuse_space/bytes[dflt]
3        102          2         70
3 2199023255552          2 1099511627776' go tool pprof -raw "$work/memory.pb.gz"
expect 'lone
a\ b".cpp:7' go tool pprof -top -nodefraction=0 "$work/memory.pb.gz"

program googletest -lgtest -lpthread
expect '       OK ] Budgets.Kept
bytes not freed: 8, limit 0
  a.cpp:1: 8
bytes written: 100, limit 99
  FAILED  ] Budgets.Exceeded
       OK ] Budgets.KeptAgain' "$work/googletest"
program catch2
expect 'sections
bytes not freed: 8, limit 0
assertions: 2 | 1 passed | 1 failed' "$work/catch2"
program benchmark -lbenchmark -lpthread
expect '"allocs_per_iter": 3.0
"max_bytes_used": 30' "$work/benchmark" --benchmark_format=json
