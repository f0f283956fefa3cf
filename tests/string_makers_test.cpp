// Each overload at its extremes, the limits where text is cut, and the rule for separators.
#include "zanbase/string_makers.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstdarg>
#include <limits>
#include <sstream>
#include <string>

namespace {

template <class Integer>
void ExpectExactText(Integer value) {
    std::ostringstream expected;
    expected << value;
    EXPECT_EQ(MkString(value), expected.str());
}

// Around every power of two and of ten, where the number of digits or the width of the arithmetic changes.
template <class... Integers>
void ExpectExactTexts() {
    for (const unsigned long long base : {2ull, 10ull}) {
        unsigned long long power = 1;
        for (int exponent = 0; exponent < 64; ++exponent, power *= base) {
            for (const unsigned long long value : {power - 1, power, power + 1, 0 - power}) {
                (ExpectExactText(static_cast<Integers>(value)), ...);
            }
        }
    }
    (ExpectExactText(std::numeric_limits<Integers>::min()), ...);
    (ExpectExactText(std::numeric_limits<Integers>::max()), ...);
}

TEST(MkString, WritesTheExactDecimalText) {
    ExpectExactTexts<short, unsigned short, int, unsigned int, long, unsigned long, long long,
                     unsigned long long>();
}

struct FixedPoint {
    double value;
    int decimals;
    std::string text;
};

TEST(MkString, WritesFixedPointWithoutTrailingZeros) {
    const double infinity = std::numeric_limits<double>::infinity();
    const FixedPoint cases[] = {
        {2.0, 3, "2"},
        {1.5, 3, "1.5"},
        {100.0, 0, "100"},
        {2.5, 0, "2"},
        {-0.5, 2, "-0.5"},
        {-0.001, 2, "-0"},
        {0.0, -1, "0"},
        {-0.0, -1, "-0"},
        {0.0, 5, "0"},
        {1234.5678, -1, "1234.5678"},
        {0.001, -7, "0.001"},
        {1.0 / 3, -1, "0.33333333333333"},
        {-1.0 / 3, INT_MIN, "-0.33333333333333"},
        {99999999999999.96, -1, "100000000000000"},
        {123456789012345.6, -1, "123456789012346"},
        {1e20, -1, "100000000000000000000"},
        {0.1, INT_MAX, "0.1000000000000000055511151231257827021181583404541015625"},
        {1e70, 3,
         "1" + std::string("0000000000000000725314363815292351261583744096465219555182101554790400", 62)},
        {std::ldexp(1, 205), 3,
         "51422017416287688817342786954917203280710495801049370729644032"},  // cut at the point
        {1e-70, -1, "0"},
        {-1e-70, -1, "-0"},
        {std::numeric_limits<double>::denorm_min(), -1, "0"},
        {infinity, 2, "inf"},
        {-infinity, -1, "-inf"},
        {std::nan(""), -1, "nan"},
    };
    for (const FixedPoint& test : cases) {
        EXPECT_EQ(MkString(test.value, test.decimals), test.text) << test.value << ", " << test.decimals;
    }
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
    EXPECT_EQ(MkString("%s: %d%%, %.2f %c", "disk", 97, 0.125, 'x'), "disk: 97%, 0.12 x");
    EXPECT_EQ(ByArgumentList("%s %lld", "least", LLONG_MIN), "least -9223372036854775808");
    EXPECT_EQ(MkString("%s", ""), "");
    EXPECT_EQ(MkString("ab%cde", 0), "ab");
    for (const int length : {4094, 4095, 4096, 5000}) {
        const std::string text = MkString("%*s", length, "end");
        const std::string whole = std::string(static_cast<std::size_t>(length) - 3, ' ') + "end";
        EXPECT_EQ(text, whole.substr(0, 4095)) << length;
        EXPECT_EQ(ByArgumentList("%*s", length, "end"), text);
    }
}

TEST(MkTokenString, SeparatesOnceSomethingIsWritten) {
    EXPECT_EQ(MkTokenString(static_cast<const char*>(nullptr), "unread", nullptr), "");
    EXPECT_EQ(MkTokenString("a", nullptr), "a");
    EXPECT_EQ(MkTokenString("a", "bc", nullptr), "a|bc");
    EXPECT_EQ(MkTokenString("a", "", "b", nullptr), "a||b");
    EXPECT_EQ(MkTokenString("", "a", nullptr), "a");
    EXPECT_EQ(MkTokenString("a", "", nullptr), "a|");
    EXPECT_EQ(MkTokenString("", "", nullptr), "");
    EXPECT_EQ(MkTokenString("", "", "a", "", "", nullptr), "a||");
}

TEST(MkTokenString, CutsTheJoinedText) {
    for (std::size_t length = 4092; length <= 4097; ++length) {
        const std::string text(length, 'x');
        const std::string whole = text + "|bc||d";
        EXPECT_EQ(MkTokenString(text.c_str(), "bc", "", "d", nullptr), whole.substr(0, 4095)) << length;
    }
}

}  // namespace
