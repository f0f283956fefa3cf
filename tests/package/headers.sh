#!/usr/bin/env bash
# headers.sh COMPILER SOURCES BUILD: every public header compiles alone with COMPILER as C++17, 20 and 23, without a
# warning; and wrong calls, each beside its right form, get the warning that the headers ask for.
set -euo pipefail
compile=("$1" -fsyntax-only -Werror -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Wold-style-cast
    -Wdeprecated-copy -I"$2/include" -I"$3/include" -x c++ -)

for standard in 17 20 2b; do
    for header in "$2"/include/zanbase/{,adapters/}*.h; do
        "${compile[@]}" -std=c++$standard <<<"#include \"$header\"" || { echo "in $header, C++$standard" && exit 1; }
    done
done

call() { # STATEMENT
    "${compile[@]}" -std=c++17 <<<"#include <zanbase/zanbase.h>
    void Call(const HMutex& mutex [[maybe_unused]]) { $1; }" 2>&1
}
while IFS='|' read -r warning right wrong; do
    call "$right"
    warnings=$(call "$wrong") && echo "compiles: $wrong" && exit 1
    grep -q -- "$warning" <<<"$warnings" || { echo "$wrong: another warning: $warnings" && exit 1; }
done <<'END_OF_CALLS'
-W.*format|MkName("%d", 1)|MkName("%d", "1")
-W.*format|MkNameC("%s", "1")|MkNameC("%s", 1)
-W.*format|MkName("%zu", sizeof 1)|MkName("%zu", "1")
-W.*format|MkString("%d", 1).c_str()|MkString("%d", 1.0).c_str()
-W.*format|MkName(_("%d"), 1)|MkName(_("%d"), "1")
missing sentinel|MkTokenName("a", "b", nullptr)|MkTokenName("a", "b")
missing sentinel|MkTokenString("a", nullptr).c_str()|MkTokenString("a", "b").c_str()
-W.*unused-result|static_cast<void>(HMalloc(1))|HMalloc(1)
-W.*unused-result|static_cast<void>(mutex.TryLock())|mutex.TryLock()
END_OF_CALLS

# clang sees which fields a lock guards; g++ has no such analysis.
[[ $1 != clang* ]] && exit
for body in 'const HLockGuard guard(mutex); ++count' '++count'; do
    warnings=$("${compile[@]}" -std=c++17 -Wthread-safety <<<"#include <zanbase/adapters/lockable.h>
    HLockable mutex;
    int count ZANBASE_GUARDED_BY(mutex) = 0;
    void Add() { $body; }" 2>&1 || true)
    [ "$body" = '++count' ] || [ -z "$warnings" ] || { echo "guarded: $warnings" && exit 1; }
done
grep -q "requires holding mutex 'mutex'" <<<"$warnings"
