#!/usr/bin/env bash
# dll.sh DLL [--update]: compares the names that DLL exports with docs/exported_names_windows.txt, so that nothing joins
# or leaves the interface unnoticed; which names it takes from which DLL, since the linker takes any name from any of
# them; and that the system may place it anywhere, without code in its data.
set -euo pipefail
record=$(dirname "$0")/../../docs/exported_names_windows.txt
table=$(x86_64-w64-mingw32-objdump -p "$1")
# The compiler also exports the types of standard exceptions where they are caught; no option keeps them back.
names=$(sed -n '/Name Pointer\] Table/,/^$/s/^\t\[ *[0-9]*\] //p' <<<"$table" | grep -v '^_ZTISt' | c++filt | LC_ALL=C sort -u)
if [ "${2:-}" = --update ]; then echo "$names" >"$record"; fi
diff "$record" - <<<"$names"

# DLL NAME of each import that is none of these. The C++ library may supply C++ names alone, and so on.
strays=$(awk '/DLL Name:/ {dll = tolower($3)} dll && NF == 3 && $2 ~ /^[0-9]+$/ {print dll, $3}' <<<"$table" |
    grep -vE '^((kernel32|user32|ntdll|msvcrt|ucrtbase|api-ms-win-crt-[a-z0-9-]+)\.dll (_*[A-Za-z0-9_]+)|advapi32\.dll Crypt\w+|libgcc_s_seh-1\.dll (_Unwind|__emutls)_\w+|libstdc\+\+-6\.dll (_Z|__cxa_|__gxx_)\w+|libgomp-1\.dll omp_\w+|libintl-8\.dll libintl_\w+)$' || true)
[ -z "$strays" ] || { printf 'imported from an unexpected DLL:\n%s\n' "$strays" && exit 1; }
grep -q ' libintl_gettext$' < <(awk '{print " " $3}' <<<"$table") || { echo 'no import was read' && exit 1; }

for flag in HIGH_ENTROPY_VA DYNAMIC_BASE NX_COMPAT; do
    grep -q "^\s*$flag\$" <<<"$table" || { echo "the DLL has not the flag $flag" && exit 1; }
done
