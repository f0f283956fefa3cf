#!/usr/bin/env bash
# modes.sh SOURCES BUILD: one binary of the library serves programs in every mode of the standard library. Builds and runs
# a consumer with a plug-in in each; what can't work in a mode must not link.
set -euo pipefail
sources=$1 build=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
export LD_LIBRARY_PATH=$build/src:$work
common=(-Wall -Wextra -Werror -Wno-unused-command-line-argument -O0 "-I$sources/include" "-I$build/include" "-L$build/src" "-L$work")

# libc++ needs the clang of its own version.
libcxx_clang=
for folder in /usr/lib/llvm-*/include/c++/v1; do
    number=${folder#/usr/lib/llvm-} libcxx_clang=clang++-${number%%/*}
done
command -v "${libcxx_clang:-none}" >/dev/null || { echo "needs libc++ and a clang of its version" && exit 1; }

consumer() { # COMPILER FLAG…
    local compile=("$@" "${common[@]}")
    "${compile[@]}" -fPIC -shared "$sources/tests/package/modes/plug_in.cpp" -lzanbase -o "$work/libplug_in.so"
    "${compile[@]}" "$sources/tests/package/modes/consumer.cpp" -lplug_in -lzanbase -o "$work/consumer"
    "$work/consumer" || { echo "fails: $*" && exit 1; }
    echo "works: $*"
}
consumer g++ -std=c++17 -fvisibility=hidden -fvisibility-inlines-hidden -fno-rtti -fno-exceptions
consumer g++ -std=c++20 -D_GLIBCXX_DEBUG -fsanitize=address,undefined -fno-sanitize-recover=all
consumer clang++ -std=c++2b -D_GLIBCXX_USE_CXX11_ABI=0
consumer "$libcxx_clang" -std=c++20 -stdlib=libc++
consumer "$libcxx_clang" -std=c++2b -stdlib=libc++ -fvisibility=hidden -fsanitize=thread

# Names as std::string are another type in these modes.
for mode in "g++ -D_GLIBCXX_USE_CXX11_ABI=0" "$libcxx_clang -stdlib=libc++"; do
    read -ra compile <<<"$mode"
    output=$("${compile[@]}" "${common[@]}" -x c++ - -lzanbase -o "$work/none" 2>&1 <<<'#include <zanbase/zanbase.h>
        int main() { HDiskIOOpen("a name", nullptr, 0); }') && echo "links: $mode" && exit 1
    grep -q 'undefined reference to .HDiskIOOpen' <<<"$output" || { echo "$mode: $output" && exit 1; }
done
output=$("$libcxx_clang" -stdlib=libc++ "${common[@]}" -fsyntax-only -x c++ - 2>&1 <<<'#include <zanbase/memory_tables.h>') &&
    echo "memory_tables.h compiles with libc++" && exit 1
grep -q 'error: "zanbase/memory_tables.h shows' <<<"$output" || { echo "$output" && exit 1; }
