#!/usr/bin/env bash
# clang.sh SOURCES BUILD WINE: the public headers in clang's MSVC mode; programs of clang with the library of g++ in BUILD,
# and programs of g++ with a library of clang, which is also the one for the UCRT; and that no program gets the library
# of the other runtime.
set -euo pipefail
sources=$1 build=$2 wine=$3 work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$sources"
if ! (cmake --preset windows-ucrt && cmake --build --preset windows-ucrt) >"$work/log" 2>&1; then
    tail -n 40 "$work/log" && exit 1
fi
ucrt=$sources/build/windows-ucrt
gcc=$(dirname "$(x86_64-w64-mingw32-g++-posix -print-libgcc-file-name)")
clang=(clang++-14 -std=c++17 -isystem "$gcc/include/c++" -isystem "$gcc/include/c++/x86_64-w64-mingw32" -Iinclude)
root=$build/../windows-root
version=-DPACKAGE_VERSION="\"$(sed -n 's/^Version: //p' "$build/zanbase.pc")\""

# The libraries' headers need the names of their own compiler.
for header in include/zanbase/{,adapters/}*.h; do echo "#include \"$PWD/$header\""; done >"$work/headers.cpp"
"${clang[@]}" --target=x86_64-pc-windows-msvc -fgnuc-version=12 -D__MINGW32__ -D__MINGW64__ -D_UCRT -Wno-everything \
    -isystem /usr/x86_64-w64-mingw32/include -isystem "$root/include" -I"$ucrt/include" -fsyntax-only "$work/headers.cpp"

"${clang[@]}" --target=x86_64-w64-mingw32 -Wall -Wextra -Werror -I"$build/include" tests/package/consumer/main.cpp "$version" \
    -o "$work/clang.exe" -L"$gcc" -B"$gcc" -L"$build/src" -lzanbase
WINEPATH="Z:$build/src;$WINEPATH" "$wine" "$work/clang.exe"

x86_64-w64-mingw32-g++-posix -dumpspecs | sed 's/-lmsvcrt/-lucrt/g' >"$work/specs"
gcc_ucrt() { # HEADERS OPTION…
    x86_64-w64-mingw32-g++-posix -std=c++17 -Wall -Wextra -Werror -specs="$work/specs" -D_UCRT -Iinclude -I"$1" \
        "${@:2}" -static-libstdc++ -static-libgcc -L"$ucrt/src" -lzanbase
}
gcc_ucrt "$ucrt/include" tests/package/consumer/main.cpp "$version" -o "$work/consumer.exe"
gcc_ucrt "$ucrt/include" tests/package/ucrt.cpp -o "$work/ucrt.exe"
export WINEPATH="Z:$ucrt/src;$WINEPATH"
"$wine" "$work/consumer.exe"
"$wine" "$work/ucrt.exe" >"$work/raw"
tr -d '\r' <"$work/raw" >"$work/output"
for line in '|      512 |      1 |      1 | program.cpp ' 'threads 3' \
    'HThread::_Run_() Uncaught exception: thrown by the program' "console ${DISPLAY:+1 1}"; do
    grep -qF "$line" "$work/output" || { echo "the program for the UCRT does not print: $line" && cat "$work/output" && exit 1; }
done
if refusal=$(gcc_ucrt "$build/include" -fsyntax-only tests/package/ucrt.cpp 2>&1); then echo 'msvcrt in the UCRT' && exit 1; fi
grep -q 'built for another C runtime' <<<"$refusal"
