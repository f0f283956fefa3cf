#!/usr/bin/env bash
# footprint.sh BUILD: what the library costs a program that only includes and loads it: compile time beside the
# standard headers that the public ones need, resident memory, and start-up time beside a program without it.
set -euo pipefail
build=$1
root=$(cd "$(dirname "$0")/.." && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

cat >"$work/std.cpp" <<'END'
#include <atomic>
#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <functional>
#include <list>
#include <map>
#include <memory>
#include <string>
#include <utility>
END
echo '#include <zanbase/zanbase.h>' >"$work/zanbase.cpp"
# A usual C++ program: standard streams are set up in it already.
cat >"$work/main.cpp" <<'END'
#include <cstdio>
#include <cstring>
#include <iostream>
int main(int argc, char**) {
    if (argc == 1) return 0;
    char line[256];
    std::FILE* status = std::fopen("/proc/self/status", "r");
    while (std::fgets(line, sizeof line, status)) {
        if (std::strncmp(line, "VmRSS:", 6) == 0) std::fputs(line + 6, stdout);
    }
    std::fclose(status);
}
END

# best COMMAND…: the shortest of fifteen runs, in microseconds.
best() {
    local shortest=999999999 start took i
    for i in {1..15}; do
        start=$(date +%s%N)
        "$@"
        took=$((($(date +%s%N) - start) / 1000))
        [ $took -ge $shortest ] || shortest=$took
    done
    echo $shortest
}
row() { awk -v a="$2" -v b="$3" -v name="$1" -v goal="$4" 'BEGIN {
    printf "%-52s %10d us / %10d us %8.2f %8s%s\n", name, a, b, a / b, goal, (goal != "-" && a / b > goal) ? "  above" : ""
}'; }

compile() { g++ -std=c++17 -I"$root/include" -I"$build/include" -fsyntax-only "$1"; }
row "#include <zanbase/zanbase.h> / its standard headers" "$(best compile "$work/zanbase.cpp")" \
    "$(best compile "$work/std.cpp")" 2.00

# Both load the same other libraries, so that the difference is ours alone.
link() { g++ "$work/main.cpp" -o "$work/$1" -Wl,--no-as-needed "${@:2}" -lgomp -Wl,-rpath,"$build/src"; }
link with -L"$build/src" -lzanbase
link without
row "start-up with the library / without" "$(best "$work/with")" "$(best "$work/without")" -
kib() { for i in {1..9}; do "$work/$1" rss | tr -dc '0-9\n'; done | sort -n | sed -n 5p; }
echo "resident memory that the library adds: $(($(kib with) - $(kib without))) KiB (goal: below 300)"
