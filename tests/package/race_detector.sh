#!/usr/bin/env bash
# race_detector.sh COMPILER SOURCES BUILD: under COMPILER's thread sanitizer, programs that use the optimised library get
# no false report, and the two faults of race_detector.cpp a report each, with their lines.
set -euo pipefail
compiler=$1 sources=$2 build=$3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
export LD_LIBRARY_PATH=$build/src

for program in examples/{adapters/lockable,hibernating_worker} tests/{stress/all_stress,package/race_detector}; do
    run=$work/${program##*/}
    "$compiler" -std=c++17 -g -O1 -fsanitize=thread -pthread -I"$sources/include" -I"$sources/tests" -I"$build/include" \
        "$sources/$program.cpp" -L"$build/src" -lzanbase -o "$run"
    case $program in *stress) "$run" 0.1 ;; *) "$run" ;; esac # a report changes the status
done

# says COUNT TEXT: that many lines of the reports.
says() { [ "$(grep -c "$2" "$work/reports")" = "$1" ] || { cat "$work/reports" && echo "not $1: $2" && exit 1; }; }
if TSAN_OPTIONS=symbolize=0 "$run" faults 2>"$work/reports"; then exit 1; fi
says 2 'WARNING'
says 1 'WARNING: ThreadSanitizer: data race '
says 1 'WARNING: ThreadSanitizer: lock-order-inversion (potential deadlock)'
# The line that called the library, in the two acquisitions and the start of the thread.
[ "$(grep -A1 '#1 .*(libzanbase' "$work/reports" | grep -c '#2 .*(race_detector+')" = 3 ]
