// Each overload at its extremes, the limits where text is cut, and where separators go.
#include "zanbase/string_makers.h"

#include <climits>
#include <cmath>

#include "support/text_pairs.h"

namespace {

template <class... Integers>
void ExpectExact(unsigned long long bits) {
    (ExpectPairs(MkString(static_cast<Integers>(bits)), std::to_string(static_cast<Integers>(bits))), ...);
}

// Around every power of ten and of two, the limits of every type among them.
TEST(MkString, WritesTheExactDecimalText) {
    for (unsigned long long two = 1, ten = 1, round = 0; round < 64; ++round, two *= 2, ten *= 10) {
        for (const unsigned long long bits : {two - 1, two, 0 - two, ten - 1, ten, 0 - ten}) {
            ExpectExact<short, unsigned short, int, unsigned>(bits);
            ExpectExact<long, unsigned long, long long, unsigned long long>(bits);
        }
    }
}

TEST(MkString, WritesFixedPointWithoutTrailingZeros) {
    ExpectPairs(MkString(2.0, 3), "2", MkString(1.5, 3), "1.5", MkString(100.0, 0), "100", MkString(2.75, 0),
                "3", MkString(-0.5, 2), "-0.5", MkString(-0.001, 2), "-0", MkString(0.0, -1), "0",
                MkString(0.001, -7), "0.001", MkString(-1.0 / 3, INT_MIN), "-0.33333333333333",
                MkString(123456789012345.6, -1), "123456789012346", MkString(1e-70, -1), "0",
                MkString(HUGE_VAL, 2), "inf", MkString(-HUGE_VAL, -1), "-inf", MkString(std::nan(""), -1),
                "nan");
    ExpectPairs(MkString(0.1, INT_MAX), "0.1000000000000000055511151231257827021181583404541015625",
                MkString(std::ldexp(1, 205), 3),
                "51422017416287688817342786954917203280710495801049370729644032", MkString(1e70, 3),
                "100000000000000007253143638152923512615837440964652195551821015");
}

std::string ByArgumentList(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);
std::string ByArgumentList(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    std::string text = MkStringV(format, arguments);
    va_end(arguments);
    return text;
}

TEST(MkString, PrintsAFormatUpToItsLimit) {
    const std::string full(4095, ' ');
    ExpectPairs(MkString("%s: %d%%, %.2f", "disk", 97, 0.125), "disk: 97%, 0.12", MkString("ab%cde", 0), "ab",
                MkString("%s", ""), "", MkString("%4095s", ""), full, MkString("%5000s", ""), full,
                ByArgumentList("%s %lld", "least", LLONG_MIN), "least -9223372036854775808",
                ByArgumentList("%4096s", ""), full);
}

TEST(MkTokenString, SeparatesOnceSomethingIsWrittenAndCutsTheWhole) {
    const std::string full(4095, 'x');
    ExpectPairs(MkTokenString(static_cast<const char*>(nullptr), "a", nullptr), "",
                MkTokenString("a", "bc", nullptr), "a|bc", MkTokenString("a", "", "b", nullptr), "a||b",
                MkTokenString("", "a", nullptr), "a", MkTokenString("a", "", nullptr), "a|",
                MkTokenString("", "", nullptr), "", MkTokenString(full.c_str(), "b", nullptr), full,
                MkTokenString((full + "y").c_str(), nullptr), full, MkTokenString(&full[1], "b", nullptr),
                full.substr(1) + "|", MkTokenString(&full[2], "b", "c", nullptr), full.substr(2) + "|b");
}

}  // namespace
