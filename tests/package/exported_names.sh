#!/usr/bin/env bash
# exported_names.sh DLL [--update]: compares the names that DLL exports with docs/exported_names_windows.txt, so that
# nothing joins or leaves the interface unnoticed; and the DLLs that it needs with those of the compiler and libintl.
set -euo pipefail
record=$(dirname "$0")/../../docs/exported_names_windows.txt
table=$(x86_64-w64-mingw32-objdump -p "$1")
# The compiler also exports the types of standard exceptions where they are caught; no option keeps them back.
names=$(sed -n '/Name Pointer\] Table/,/^$/s/^\t\[ *[0-9]*\] //p' <<<"$table" | grep -v '^_ZTISt' | c++filt | LC_ALL=C sort -u)
if [ "${2:-}" = --update ]; then echo "$names" >"$record"; fi
diff "$record" - <<<"$names"
sed -n 's/.*DLL Name: //p' <<<"$table" |
    (! grep -viE '^(kernel32|user32|msvcrt|libgcc_s_seh-1|libstdc\+\+-6|libgomp-1|libintl-8)\.dll$')
