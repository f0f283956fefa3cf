#!/usr/bin/env bash
# headers.sh COMPILER SOURCES BUILD: every public header compiles alone with COMPILER as C++17, and all together as C++20
# and 23, without a warning; and wrong calls, each beside its right form, get the warning that the headers ask for.
set -euo pipefail
compile=("$1" -fsyntax-only -Werror -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Wold-style-cast
    -Wdeprecated-copy -I"$2/include" -I"$3/include" -x c++ -)

headers=("$2"/include/zanbase/{,adapters/}*.h)
for header in "${headers[@]}"; do
    "${compile[@]}" -std=c++17 <<<"#include \"$header\"" || { echo "in $header" && exit 1; }
done
for standard in 20 2b; do
    printf '#include "%s"\n' "${headers[@]}" | "${compile[@]}" -std=c++$standard || { echo "C++$standard" && exit 1; }
done

# compare COMMAND: each line of the input is WARNING|RIGHT|WRONG; COMMAND compiles a statement, in which RIGHT gets no
# warning, and WRONG gets WARNING.
compare() {
    local warning right wrong warnings
    while IFS='|' read -r warning right wrong; do
        "$1" "$right"
        warnings=$("$1" "$wrong") && echo "compiles: $wrong" && exit 1
        grep -q -- "$warning" <<<"$warnings" || { echo "$wrong: another warning: $warnings" && exit 1; }
    done
}

call() { # STATEMENT
    "${compile[@]}" -std=c++17 <<<"#include <zanbase/zanbase.h>
    void Call(const HMutex& mutex [[maybe_unused]]) { $1; }" 2>&1
}
compare call <<'END_OF_CALLS'
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

# The example in the manual of the lockables, which clang's analysis checks; g++ has none.
header=$2/include/zanbase/adapters/lockable.h
locked() { # STATEMENT
    "${compile[@]}" -std=c++17 -Wthread-safety -Wthread-safety-beta <<<"#include <condition_variable>
    #include <deque>
    #include <zanbase/adapters/lockable.h>
    $(sed -n 's|^///     ||p' "$header")
    HSharedLockable table ZANBASE_ACQUIRED_AFTER(mutex);
    int rows ZANBASE_GUARDED_BY(table) = 0;
    HSharedLockable& Table() ZANBASE_RETURN_CAPABILITY(table) { return table; }
    void AddRow() ZANBASE_REQUIRES(table) { ++rows; }
    void Call() { $1; }" 2>&1
}
[[ $1 != clang* ]] && exit
compare locked <<'END_OF_CALLS'
requires holding mutex 'mutex'|HLockGuard guard(mutex); jobs.clear()|jobs.clear()
requires holding shared_mutex 'table'|const HLockGuard guard(Table()); AddRow()|AddRow()
requires holding shared_mutex 'table'|table.AssertHeld(); AddRow()|table.AssertSharedHeld(); AddRow()
writing variable 'rows'|const HSharedLockGuard guard(table); (void)(rows + 1)|const HSharedLockGuard guard(table); ++rows
requires holding shared_mutex 'table'|HLockGuard guard(table); guard.unlock(); guard.lock(); ++rows|HLockGuard guard(table); guard.unlock(); ++rows
was not held|HLockGuard guard(mutex); guard.unlock()|HLockGuard guard(mutex); guard.unlock(); guard.unlock()
must be acquired before|const HLockGuard one(mutex); const HLockGuard two(table)|const HLockGuard two(table); const HLockGuard one(mutex)
not held on every path|if (mutex.try_lock()) const HLockGuard guard(mutex, std::adopt_lock)|if (mutex.try_lock()) jobs.clear()
constructor declared with 'nodiscard'|const HLockGuard guard(mutex)|HLockGuard{mutex}
END_OF_CALLS
