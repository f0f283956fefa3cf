#!/usr/bin/env bash
# run.sh BUILD: the recorder beside heaptrack -r, medians of five runs in alternation: nanoseconds a pair of calls, then
# the time of real programs as a multiple of that without a recorder, then the start.
set -euo pipefail
build=$1 here=$(cd "$(dirname "$0")" && pwd)
pairs=$build/benchmarks/record_pairs record=$build/tools/record/zanbase-record
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$work"
runs=5

median() { sort -n | sed -n "$((runs / 2 + 1))p"; }

run() { # KIND COMMAND...
    local kind=$1
    shift
    case $kind in
    plain) "$@" ;;
    ours) "$record" --output "$work/report" "$@" ;;
    heaptrack) heaptrack -r -o "$work/raw" "$@" ;;
    esac
}

seconds() { # KIND COMMAND...
    local start end
    start=$(date +%s%N)
    run "$@" >/dev/null 2>&1 || true
    end=$(date +%s%N)
    echo $((end - start)) | awk '{printf "%.4f\n", $1 / 1e9}'
}

row() { # TITLE UNIT COMMAND...: runs MEASURE for each kind in alternation
    local title=$1 measure=$2 i kind
    shift 2
    rm -f plain ours heaptrack
    for ((i = 0; i < runs; i++)); do
        for kind in plain ours heaptrack; do $measure $kind "$@" >>$kind; done
    done
    printf '%-26s %10s %10s %10s\n' "$title" "$(median <plain)" "$(median <ours)" "$(median <heaptrack)"
}

figure() { run "$@" 2>/dev/null | grep -E '^[0-9.]+$'; }

printf '%-26s %10s %10s %10s\n' '' plain recorder heaptrack
for live in 0 1000 1000000; do
    for threads in 1 2; do row "live $live, threads $threads (ns)" figure "$pairs" memory $live $threads; done
done
row 'read 4 KiB (ns)' figure "$pairs" read
row 'open and close (ns)' figure "$pairs" open

seq 300000 | awk '{print ($1 * 7919) % 300007}' >numbers
cat >stl.cpp <<'PROGRAM'
#include <map>
#include <string>
int main() {
    std::map<std::string, std::string> names;
    for (int i = 0; i < 1000000; ++i) names[std::to_string(i % 50000) + " is a key"] = std::to_string(i) + " is a longer text";
    return names.size() != 50000;
}
PROGRAM
g++ -O2 -g stl.cpp -o stl
echo '#include <regex>' >unit.cpp
g++ -E unit.cpp -o unit.ii
echo "import sys; d = {i: str(i) for i in range(600000)}" >dict.py
row 'start (s)' seconds true
row 'cc1plus (s)' seconds "$(g++ -print-prog-name=cc1plus)" -quiet -O1 unit.ii -o unit.s
row 'STL at -O2 (s)' seconds ./stl
row 'sort (s)' seconds sort numbers
row 'git log (s)' seconds git -C "$here" log --stat -n 300
row 'python dict (s)' seconds "$(python3 -c 'import sys; print(sys.executable)')" dict.py
