#!/usr/bin/env bash
# windows.sh WAY SOURCES BUILD WINE: builds the consumer for Windows against the library in BUILD, and runs it with the
# DLLs of the package alone. WAY is `cmake`, with the packed archive, or `pkg-config`, with an install tree that was
# moved.
set -euo pipefail
way=$1 sources=$2 build=$3 wine=$4 consumer=$2/tests/package/consumer
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
if [ "$way" = cmake ]; then
    cpack -G ZIP --config "$build/CPackConfig.cmake" -B "$work" >/dev/null
    (cd "$work" && cmake -E tar xf zanbase-*.zip && mv zanbase-*-windows-x86_64 moved)
    cmake -G Ninja -S "$consumer" -B "$work" -DCMAKE_TOOLCHAIN_FILE="$sources/cmake/mingw-w64.cmake" \
        -DZANBASE_WINDOWS_ROOT="$work/moved" >/dev/null
    cmake --build "$work"
else
    cmake --install "$build" --prefix "$work/first" >/dev/null
    mv "$work/first" "$work/moved"
    export PKG_CONFIG_LIBDIR=$work/moved/lib/pkgconfig
    read -ra flags <<<"$(pkg-config --cflags zanbase) $consumer/main.cpp $(pkg-config --libs zanbase)"
    flags+=(-DPACKAGE_VERSION="\"$(pkg-config --modversion zanbase)\"")
    x86_64-w64-mingw32-g++-posix -std=c++17 -Wall -Wextra -Werror "${flags[@]}" -o "$work/consumer.exe"
fi
WINEPATH="Z:$work/moved/bin" "$wine" "$work/consumer.exe"
