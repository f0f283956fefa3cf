#!/usr/bin/env bash
# windows.sh WAY SOURCES BUILD WINE: builds the consumer for Windows against the library in BUILD, installed in a tree
# that was moved, and runs it. WAY is `cmake` or `pkg-config`.
set -euo pipefail
way=$1 sources=$2 build=$3 wine=$4 consumer=$2/tests/package/consumer
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cmake --install "$build" --prefix "$work/first" >/dev/null
mv "$work/first" "$work/moved"
if [ "$way" = cmake ]; then
    cmake -G Ninja -S "$consumer" -B "$work" -DCMAKE_TOOLCHAIN_FILE="$sources/cmake/mingw-w64.cmake" \
        -DZANBASE_WINDOWS_ROOT="$work/moved" >/dev/null
    cmake --build "$work"
else
    export PKG_CONFIG_LIBDIR=$work/moved/lib/pkgconfig
    read -ra flags <<<"$(pkg-config --cflags zanbase) $consumer/main.cpp $(pkg-config --libs zanbase)"
    flags+=(-DPACKAGE_VERSION="\"$(pkg-config --modversion zanbase)\"")
    x86_64-w64-mingw32-g++-posix -std=c++17 -Wall -Wextra -Werror "${flags[@]}" -o "$work/consumer.exe"
fi
WINEPATH="Z:$work/moved/bin;$WINEPATH" "$wine" "$work/consumer.exe"
