// Names beside the C library's formatter on a buffer of the caller's.
#include "zanbase/name_ring.h"

#include <cstdio>

#include "text_pairs.h"

namespace {

template <class... Values>
char InBuffer(const char* format, Values... values) {
    char text[128];
    std::snprintf(text, sizeof text, format, values...);
    benchmark::DoNotOptimize(text);
    return text[0];
}

char* NameOfInt(int value) { return MkName(value); }
char PrintedInt(int value) { return InBuffer("%d", value); }

char* NameOfInt64(long long value) { return MkName(value); }
char PrintedInt64(long long value) { return InBuffer("%lld", value); }

char* NameOfDouble(double value) { return MkName(value, 3); }
char PrintedDouble(double value) { return InBuffer("%.3f", value); }

char* NameOfFormat(int value) { return MkName("%s: block %d of %d", "index", value, 100); }
char PrintedFormat(int value) { return InBuffer("%s: block %d of %d", "index", value, 100); }

char* NameOfTokens(int) { return MkTokenName("index", "block", "of", "measured values", nullptr); }
char PrintedTokens(int) { return InBuffer("%s|%s|%s|%s", "index", "block", "of", "measured values"); }

const bool rows = [] {
    Ours("MkName(int)", Integers<int>(), NameOfInt).Beside("snprintf", PrintedInt, 0.4);
    Ours("MkName(long long)", Integers<long long>(), NameOfInt64).Beside("snprintf", PrintedInt64, 0.4);
    Ours("MkName(double, 3)", Reals(2), NameOfDouble).Beside("snprintf", PrintedDouble, 1.1);
    Ours("MkName(format)", Integers<int>(), NameOfFormat).Beside("snprintf", PrintedFormat, 1.08);
    Ours("MkTokenName", Integers<int>(), NameOfTokens).Beside("snprintf", PrintedTokens, 0);
    return true;
}();

}  // namespace
