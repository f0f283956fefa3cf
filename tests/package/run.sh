#!/usr/bin/env bash
# run.sh WAY COMPILER SOURCES BUILD: builds and runs the consumer with COMPILER against the library: WAY is
# `cmake` or `pkg-config`, against an installed tree that was moved, or `subproject`.
set -euo pipefail
way=$1 compiler=$2 sources=$3 build=$4 consumer=$3/tests/package/consumer
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cmake --install "$build" --prefix "$work/first" >/dev/null
mv "$work/first" "$work/moved"

if [ "$way" != pkg-config ]; then
    [ "$way" = subproject ] || sources=
    cmake -G Ninja -S "$consumer" -B "$work/build" -DCMAKE_CXX_COMPILER="$compiler" -DSOURCES="$sources" \
        -DCMAKE_PREFIX_PATH="$work/moved" >/dev/null
    cmake --build "$work/build" >"$work/log" || { cat "$work/log" && exit 1; }
    "$work/build/consumer"
    # A subproject is installed with its parent.
    if [ "$way" = subproject ]; then
        cmake --install "$work/build" --prefix "$work/installed" >/dev/null
        "$work/installed/bin/consumer"
    fi
    exit
fi

PKG_CONFIG_PATH=$(dirname "$(find "$work/moved" -name zanbase.pc)")
LD_LIBRARY_PATH=$(dirname "$(find "$work/moved" -name libzanbase.so)")
export PKG_CONFIG_PATH LD_LIBRARY_PATH
[ -n "$(pkg-config --variable=boost_version zanbase)" ]
read -ra flags <<<"-std=c++17 -Wall -Wextra -Werror $(pkg-config --cflags zanbase)"
flags+=(-DPACKAGE_VERSION="\"$(pkg-config --modversion zanbase)\"")
read -ra libraries <<<"$(pkg-config --libs zanbase)"
# No header of Boost may be needed: the preprocessor names every file that a translation unit reads.
if "$compiler" "${flags[@]}" -M "$consumer/main.cpp" | grep -F /boost/; then exit 1; fi
"$compiler" "${flags[@]}" "$consumer/main.cpp" "${libraries[@]}" -o "$work/program"
"$work/program"
# The README's first program prints the block after it and an empty line.
readme_block() { awk -v number="$1" '/^```/ {block += 1; next} block == number' "$sources/README.md"; }
readme_block 1 >"$work/program.cpp"
(cd "$work" && "$compiler" "${flags[@]}" program.cpp "${libraries[@]}" -o program)
diff <(readme_block 3) <("$work/program" | sed '$d')
