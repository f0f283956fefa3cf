#!/usr/bin/env bash
# hardened.sh LIBRARY RECORDER...: fails unless the built files have the protections of cmake/ZanbaseHardening.cmake.
set -euo pipefail

# has NAME TEXT EXPRESSION
has() { grep -qE -- "$3" <<<"$2" || { echo "$file has no $1" && exit 1; }; }

for file in "$@"; do
    headers=$(readelf -dlW "$file")
    symbols=$(nm -D "$file")
    has 'read-only relocations' "$headers" GNU_RELRO
    has 'binding at load' "$headers" 'FLAGS.*(BIND_NOW|NOW)'
    has 'stack without code' "$headers" 'GNU_STACK.* RW '
    has 'load address of choice' "$headers" 'file type is DYN'
    if grep -q TEXTREL <<<"$headers"; then echo "$file has relocations in its code" && exit 1; fi
    has 'stack protector' "$symbols" '__stack_chk_fail'
done
file=$1
symbols=$(nm -D "$file")
has 'checked C library calls' "$symbols" '__(vsnprintf|memcpy|fprintf)_chk'
has 'assertions of the C++ library' "$symbols" '__glibcxx_assert_fail'
has 'control-flow protection' "$(objdump -d --disassemble=_ZNK6HMutex4LockEv "$file")" '(endbr64|bti|paciasp)'
