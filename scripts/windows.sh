# What the scripts share about programs for 64-bit Windows: packages, and a Wine of our own to run the programs.
# To be sourced after common.sh.

windows_packages=("${build_packages[@]}" g++-mingw-w64-x86-64-posix clang-14 wine64 pkg-config googletest
    nlohmann-json3-dev libvalijson-dev gettext dpkg-dev make xz-utils xvfb)

# prepare_windows PRESET [benchmark]: what a build with PRESET needs, and the environment of its programs under Wine.
prepare_windows() {
    need "${windows_packages[@]}"
    mkdir -p "$top/build/wine"
    if ! "$top/scripts/windows-root" ${2:+"$2"} >"$top/build/windows-root.log" 2>&1 </dev/null; then
        tail -n 30 "$top/build/windows-root.log" >&2
        fail 'cannot build the libraries for Windows; the whole output is in build/windows-root.log'
    fi
    unset DISPLAY
    export WINEPREFIX=$top/build/wine WINEARCH=win64 WINEDEBUG=-all WINESERVER=/usr/lib/wine/wineserver64
    # Without its debugger, which would show a crash in a dialog and wait, a crash ends the process.
    export WINEDLLOVERRIDES='mscoree,mshtml=;winemenubuilder.exe,winedbg.exe=d'
    export WINEPATH="Z:$top/build/windows-root/bin;Z:$top/build/$1/src"
}

# with_wine COMMAND…: runs COMMAND between the start and the end of a Wine server, on a virtual display. The server and
# its service programs get no descriptor of ours: they would keep locks and pipes of the caller in use.
with_wine() (
    exec {display}< <(exec Xvfb -displayfd 1 2>/dev/null)
    screen=$!
    trap '"$WINESERVER" -k || true; kill "$screen" 2>/dev/null || true' EXIT
    if read -r number <&"$display"; then export DISPLAY=:$number; fi
    (
        for descriptor in /proc/self/fd/*; do
            descriptor=${descriptor##*/}
            [ "$descriptor" -le 2 ] || eval "exec $descriptor>&-"
        done
        exec </dev/null >/dev/null 2>&1
        "$WINESERVER" -p
        /usr/lib/wine/wine64 wineboot -i || true # which complains of what needs 32 bits
    )
    "$@"
)

# ctest runs the programs to list their tests too, and each would start a server of its own where none is.
run_windows_lane() {
    echo '== windows'
    prepare_windows windows
    configure_and_build windows
    cd "$top"
    with_wine ctest --preset windows
}

# bench_windows FLAG…: runs the benchmarks that only compute on both systems, and prints the best time of each under
# Wine over that on Linux.
bench_windows() {
    local flags=("$@" --benchmark_out_format=csv) linux=$top/build/bench windows=$top/build/windows-bench names
    prepare_windows windows-bench benchmark
    configure_and_build bench
    configure_and_build windows-bench
    with_wine /usr/lib/wine/wine64 "$windows/benchmarks/zanbase_bench.exe" "${flags[@]}" \
        --benchmark_out="$windows/times.csv" </dev/null
    names=$(sed -n 's/^"\([^"]*\)".*/\1/p' "$windows/times.csv" | sort -u | sed 's/[][().+*?^$|]/\\&/g' | paste -sd '|')
    "$linux/benchmarks/zanbase_bench" "${flags[@]}" --benchmark_out="$linux/times.csv" \
        --benchmark_filter="^($names)\$"
    printf '\n%-60s %s\n' 'time under Wine over' Linux
    awk -F '"' '
        FNR == 1 { system_number += 1 }
        /^"/ && $2 !~ /_(mean|median|stddev|cv)$/ {
            split($3, fields, ",")  # the count of iterations is field 2, the time is field 3
            if (!((system_number, $2) in best) || fields[3] < best[system_number, $2]) best[system_number, $2] = fields[3]
            names[$2]
        }
        END {
            for (name in names)
                if ((2, name) in best) printf "%-60s %5.2f\n", name, best[1, name] / best[2, name]
        }
    ' "$windows/times.csv" "$linux/times.csv" | sort
}
