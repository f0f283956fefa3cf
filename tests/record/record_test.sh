#!/usr/bin/env bash
# record_test.sh RECORD CASE [COMPILER OPTIONS...]: runs the recorder on programs whose rows are known.
set -euo pipefail
record=$1 case=$2
shift 2
here=$(cd "$(dirname "$0")" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$work"

fail() { echo "record_test: $*" >&2 && exit 1; }

# expect STATUS COMMAND...: its output goes to out, its errors to err.
expect() {
    local wanted=$1 status=0
    shift
    "$@" >out 2>err || status=$?
    [ "$status" = "$wanted" ] || { cat err && fail "status $status instead of $wanted: $*"; }
}

says() { grep -q -- "$1" "${2:-err}" || { cat "${2:-err}" && fail "not said: $1"; }; }

# The rows that the comments of a source foretell, and those of a report in CSV: line, calls, bytes, live blocks and bytes.
expected() { awk 'match($0, /\/\/ row .*/) {print FNR, substr($0, RSTART + 7)}' "$here/$1"; }
reported() { awk -F, -v file="/$1\"" 'index($1, file) {print $2, $7, $5, $3, $4}' report | sort -n; }
same() { diff "$1" "$2" >&2 || fail "rows of $3: the left ones are expected"; }

# Lines without a comment allocate what depends on the C library's version, such as a thread's block.
check_rows() {
    expected "$1" >expected
    reported "$1" | awk 'NR == FNR {known[$1]; next} $1 in known' expected - >reported
    same expected reported "$1"
}

case $case in
c) # rows by line, and the disk account of a program that closes every descriptor
    "$@" "$here/seeded.c" -o seeded_c
    expect 0 "$record" --csv --output report --skip xmalloc ./seeded_c "$work/data"
    check_rows seeded.c
    # opens, closes, seeks, reads and their bytes, writes and theirs; without the times
    same <(echo "2 3 2 3 142 2 115") <(awk -F, '$1 ~ /\/data"/ {print $2, $4, $6, $8, $10, $11, $13}' report) data
    ;;
cpp) # rows by line, also of libraries that are loaded at the same address one after the other
    "$@" -std=c++17 "$here/seeded.cpp" -pthread -o seeded_cpp
    "$@" -fPIC -shared -DPLUG_IN_NAME='"one.c"' -DPLUG_IN_COUNT=6 "$here/plug_in.cpp" -o one.so
    "$@" -fPIC -shared -DPLUG_IN_NAME='"two.c"' -DPLUG_IN_COUNT=4 "$here/plug_in.cpp" -o two.so
    expect 0 "$record" --csv --output report ./seeded_cpp ./one.so ./two.so
    check_rows seeded.cpp
    same <(echo 1 12 72 12 72) <(reported one.c) one.c
    same <(echo 1 4 16 4 16) <(reported two.c) two.c
    ;;
options) # comparison, budgets, a report on a signal, children, an allocator behind the recorder
    "$@" "$here/small.c" -o small
    expect 0 "$record" --json --output a.json ./small leak 10
    expect 0 "$record" --json --output b.json ./small leak 30
    expect 0 "$record" compare a.json a.json
    expect 1 "$record" compare a.json b.json
    says '^grew  *+320  *+320  *+20  .*/small\.c:[0-9]*$' out
    expect 0 "$record" compare --tolerance 1000 a.json b.json
    # A line above changes nothing.
    (echo && cat "$here/small.c") >moved.c
    "$@" -x c - -o moved < <(echo "#line 1 \"$here/small.c\"" && cat moved.c)
    expect 0 "$record" --json --output moved.json ./moved leak 10
    expect 0 "$record" compare a.json moved.json
    grep -q '^new' out && fail "a comment makes a row new"
    expect 2 "$record" compare a.json missing.json
    says missing.json

    expect 0 "$record" --output report --max-leaked 160 --max-peak 1M --max-calls 100 --max-read 1K --max-opens 5 \
        ./small leak 10
    expect 3 "$record" --output report --max-leaked 159 ./small leak 10
    says 'bytes leaked: 160 exceed the budget of 159; most: .*/small\.c:[0-9]* (160)'
    # What the C library keeps for a stream is not a leak, nor is what the user has named.
    expect 0 "$record" --output report --max-leaked 0 ./small print
    echo 'leak:mai*' >suppressed
    expect 0 "$record" --output report --suppress suppressed --max-leaked 0 ./small leak 10
    expect 7 "$record" --output report --max-calls 0 ./small status 7

    # The program waits until the report that it asks for is there, while it makes no call that is recorded.
    expect 0 "$record" --signal USR2 --json --output signalled.json ./small signal
    cmp -s kept.json signalled.json && fail "no second report"
    says '"live_bytes": 512' kept.json

    expect 0 "$record" --follow --csv --output child.%p ./small children
    [ "$(grep -l 'small.c",[0-9]*,1,1000,1000,0,1,0' child.[0-9]* | wc -l)" = 2 ] || fail "not both children were recorded"
    [ "$(grep -c 'small.c",[0-9]*,1,1000,1000,0,1,0' child.sum)" = 2 ] || fail "the sum has not both children"
    expect 0 "$record" --csv --output alone.%p ./small children
    [ "$(find . -name 'alone.*' | wc -l)" = 1 ] || fail "children were recorded unasked"

    expect 0 "$record" --folded --output report ./small leak 10
    says ';main (small\.c:[0-9]*) 160$' report
    # An allocator behind the recorder serves the program, and is recorded all the same.
    "$@" -shared -fPIC -DALLOCATOR "$here/small.c" -o allocator.so
    expect 0 env LD_PRELOAD=./allocator.so "$record" --csv --output report ./small leak 10
    says 'small\.c",[0-9]*,10,160,160,0,10,0' report
    says 'blocks from the allocator: yes' out
    says "small\.c\",1,[^,]*,1,[^,]*,0,[^,]*,1,[^,]*,4096," report
    ;;
hostile) # what can't be recorded is said; programs that make it hard end as they do alone
    "$@" "$here/small.c" -pthread -o small
    "$@" -static "$here/small.c" -pthread -o static
    "$@" -fsanitize=address "$here/small.c" -pthread -o sanitized
    "$@" -rdynamic -DALLOCATOR "$here/small.c" -pthread -o allocating
    expect 125 "$record" ./static leak 1
    says 'linked statically'
    expect 125 "$record" ./sanitized leak 1
    says 'sanitizer build'
    expect 0 "$record" --csv --output report ./allocating leak 1
    says 'allocator of its own'
    expect 127 "$record" ./missing
    expect 125 "$record" --output
    expect 126 "$record" /
    says 'is a directory'
    # The report is there however the program ends.
    for end in fault:139 kill:137 raw:0 replaced:0; do
        expect "${end#*:}" "$record" --csv --output report ./small end "${end%:*}"
        says 'small\.c",[0-9]*,1,512,512,0,1,0' report
    done
    says 'replaced by another program'
    # A budget that could not be checked is not kept.
    expect 4 "$record" --output report --max-peak 1M ./small end replaced
    expect 4 "$record" --output /dev/full ./small leak 1
    says 'cannot write /dev/full: No space left on device'
    expect 0 "$record" --output report bash -c 'ulimit -f 1'
    says 'Memory Usage Report' report
    # standard error is a pipe without a reader
    expect 4 bash -c 'mkfifo pipe; exec 3<>pipe 4>pipe 3<&-; "$0" ./small leak 1 2>&4' "$record"
    expect 0 "$record" --csv --output report ./small exhaust 1000
    says "small\.c\",[0-9]*,$(cat out),$(cat out)000," report
    expect 0 "$record" bash -c 'for number in {900..1023}; do eval "exec $number>occupied"; done'
    says 'Memory Leak Report'
    for threads in 0 1; do
        expect 0 timeout 60 "$record" --csv --output report ./small tick "$threads"
        says "/log\",1,.*,$(wc -c <log),[^,]*,$(wc -c <log)\$" report
    done
    expect 14 timeout 60 "$record" --output report ./small alarm
    expect 0 "$record" --follow --output report bash -c 'exec 900>mine; exec /bin/true'
    same /dev/null mine
    expect 0 "$record" --output report ./small leak 1 $(seq 100000)
    says 'Memory Leak Report' report
    expect 0 "$record" --output report bash -c "exec 0<&- 1>&- 2>&-; exec 3<&-; ulimit -n 16; :"
    says 'Memory Usage Report' report
    expect 0 "$record" --csv --output report ./small threads 100000
    says 'small\.c",[0-9]*,0,0,1600000,1600000,100000,100000' report
    ;;
*) fail "no such case: $case" ;;
esac
