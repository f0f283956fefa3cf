#!/usr/bin/env bash
# run.sh WAY COMPILER SOURCES BUILD: builds and runs the consumer with COMPILER against the library: WAY is
# `cmake` or `pkg-config`, against an installed tree that was moved, or `subproject`.
set -euo pipefail
way=$1 compiler=$2 sources=$3 build=$4
here=$sources/tests/package
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

if [ "$way" != subproject ]; then
    cmake --install "$build" --prefix "$work/first" >/dev/null
    mv "$work/first" "$work/moved"
fi

# No header of Boost may be needed: the preprocessor tells every file that a translation unit reads.
without_boost() { # FLAG…
    if "$compiler" -std=c++17 "$@" -M "$here/consumer/main.cpp" | grep -F /boost/; then
        echo "the public headers reach for Boost" >&2
        exit 1
    fi
}

configure() {
    cmake -G Ninja -S "$here/consumer" -B "$work/consumer" -DCMAKE_CXX_COMPILER="$compiler" "$@" >/dev/null
    cmake --build "$work/consumer" >"$work/log" || { cat "$work/log" && exit 1; }
    "$work/consumer/consumer"
}

case $way in
cmake)
    configure -DCMAKE_PREFIX_PATH="$work/moved" -DCMAKE_DISABLE_FIND_PACKAGE_Boost=ON \
        -DCMAKE_DISABLE_FIND_PACKAGE_OpenMP=ON
    ;;
subproject)
    configure -DSOURCES="$sources"
    ;;
pkg-config)
    export PKG_CONFIG_PATH
    PKG_CONFIG_PATH=$(dirname "$(find "$work/moved" -name zanbase.pc)")
    library=$(pkg-config --variable=libdir zanbase)
    [ -n "$(pkg-config --variable=boost_version zanbase)" ]
    # shellcheck disable=SC2046 # flags are to be split
    without_boost $(pkg-config --cflags zanbase)
    # shellcheck disable=SC2046
    "$compiler" -std=c++17 -Wall -Wextra -Werror $(pkg-config --cflags zanbase) "$here"/consumer/*.cpp \
        $(pkg-config --libs zanbase) -o "$work/program"
    export LD_LIBRARY_PATH=$library
    "$work/program"
    # The program on the first screen of the README prints what stands below it.
    awk '/^```/ {block += 1; next} block == 1' "$sources/README.md" >"$work/first.cpp"
    awk '/^```/ {block += 1; next} block == 3' "$sources/README.md" >"$work/first.txt"
    # shellcheck disable=SC2046
    "$compiler" -std=c++17 $(pkg-config --cflags zanbase) "$work/first.cpp" $(pkg-config --libs zanbase) \
        -o "$work/first"
    diff "$work/first.txt" <("$work/first" | sed '$d')  # but for the blank line at the end
    ;;
esac
