// String makers beside the standard library.
#include "zanbase/string_makers.h"

#include <charconv>
#include <cstdio>

#include "text_pairs.h"

namespace {

template <class... Values>
std::string InBuffer(const char* format, Values... values) {
    char text[128];
    std::snprintf(text, sizeof text, format, values...);
    return text;
}

template <class Integer>
std::string ByToChars(Integer value) {
    char text[24];
    return {text, std::to_chars(text, text + sizeof text, value).ptr};
}

std::string OfInt(int value) { return MkString(value); }
std::string StdOfInt(int value) { return std::to_string(value); }
std::string PrintedInt(int value) { return InBuffer("%d", value); }

std::string OfInt64(long long value) { return MkString(value); }
std::string StdOfInt64(long long value) { return std::to_string(value); }

std::string OfDouble(double value) { return MkString(value, 3); }
std::string PrintedDouble(double value) { return InBuffer("%.3f", value); }

std::string OfFormat(int value) { return MkString("%s: block %d of %d", "index", value, 100); }
std::string PrintedFormat(int value) { return InBuffer("%s: block %d of %d", "index", value, 100); }

std::string OfTokens(int) { return MkTokenString("index", "block", "of", "measured values", nullptr); }
std::string StdOfTokens(int) {
    return std::string("index") + '|' + "block" + '|' + "of" + '|' + "measured values";
}

const bool rows = [] {
    Ours("MkString(int)", Integers<int>(), OfInt)
        .Beside("std::to_string", StdOfInt, 1.1)
        .Beside("std::to_chars and string", ByToChars<int>, 0)
        .Beside("snprintf and string", PrintedInt, 0);
    Ours("MkString(long long)", Integers<long long>(), OfInt64).Beside("std::to_string", StdOfInt64, 1.1);
    Ours("MkString(double, 3)", Reals(2), OfDouble).Beside("snprintf and string", PrintedDouble, 1.1);
    Ours("MkString(format)", Integers<int>(), OfFormat).Beside("snprintf and string", PrintedFormat, 1.08);
    Ours("MkTokenString", Integers<int>(), OfTokens).Beside("std::string +", StdOfTokens, 0);
    return true;
}();

}  // namespace
