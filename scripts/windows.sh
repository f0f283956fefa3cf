# What the scripts share about programs for 64-bit Windows: packages, and a Wine of our own to run the programs.
# To be sourced after common.sh.

windows_packages=("${build_packages[@]}" g++-mingw-w64-x86-64-posix wine64 googletest gettext dpkg-dev make xz-utils)

unset DISPLAY
export WINEPREFIX=$top/build/wine WINEARCH=win64 WINEDEBUG=-all WINESERVER=/usr/lib/wine/wineserver64
export WINEDLLOVERRIDES='mscoree,mshtml=;winemenubuilder.exe=d'

# prepare_windows PRESET [benchmark]: what a build with PRESET needs, and Wine's folder and search path.
prepare_windows() {
    need "${windows_packages[@]}"
    mkdir -p "$top/build"
    if ! "$top/scripts/windows-root" ${2:+"$2"} >"$top/build/windows-root.log" 2>&1 </dev/null; then
        tail -n 30 "$top/build/windows-root.log" >&2
        fail 'cannot build the libraries for Windows; the whole output is in build/windows-root.log'
    fi
    export WINEPATH="Z:$top/build/windows-root/bin;Z:$top/build/$1/src"
}

# with_wine COMMAND…: runs COMMAND between the start and the end of a Wine server. The server and its service programs
# get no descriptor of ours: they would keep locks and pipes of the caller in use.
with_wine() {
    local status=0
    (
        for descriptor in /proc/self/fd/*; do
            descriptor=${descriptor##*/}
            [ "$descriptor" -le 2 ] || eval "exec $descriptor>&-"
        done
        exec </dev/null >/dev/null 2>&1
        "$WINESERVER" -p
        /usr/lib/wine/wine64 wineboot -i
    )
    "$@" || status=$?
    "$WINESERVER" -k -w || true
    return $status
}

run_windows_lane() {
    echo '== windows'
    prepare_windows windows
    configure_and_build windows
    (cd "$top" && with_wine ctest --preset windows)
}
