// The text of numbers, formats and token lists, with its limits.
#include "zanbase/string_makers.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "zanbase/name_ring.h"

template <class Integer>
void ExpectExactText(Integer value) {
    EXPECT_EQ(MkString(value), std::to_string(value));
    EXPECT_EQ(MkName(value), std::to_string(value));
}

template <class... Integers>
void ExpectExactTexts(unsigned long long bits) {
    (ExpectExactText(static_cast<Integers>(bits)), ...);
}

TEST(MkString, WritesIntegersExactlyAroundEveryPowerOfTwoAndOfTen) {
    unsigned long long two = 1, ten = 1;
    for (int power = 0; power < 64; ++power, two *= 2, ten *= 10)
        for (const auto bits : {two - 1, two, 0 - two, ten - 1, ten, 0 - ten})
            ExpectExactTexts<short, unsigned short, int, unsigned, long, unsigned long, long long,
                             unsigned long long>(bits);
}

TEST(MkString, TrimsFixedPointAndCutsItAt63Characters) {
    EXPECT_EQ(MkString(2.0, 3), "2");
    EXPECT_EQ(MkString(100.0, 0), "100");
    EXPECT_EQ(MkString(-0.001, 2), "-0");
    EXPECT_EQ(MkString(0.0, -1), "0");
    EXPECT_EQ(MkString(0.001, -7), "0.001");
    EXPECT_EQ(MkString(123456789012345.6, -1), "123456789012346");
    EXPECT_EQ(MkString(1e70, 3), "100000000000000007253143638152923512615837440964652195551821015");
}

TEST(MkString, CutsAFormatAt4095Characters) {
    const std::string full(4095, 'x');
    EXPECT_EQ(MkString("%s: %d%%, %.2f", "disk", 97, 0.125), "disk: 97%, 0.12");
    EXPECT_EQ(MkString("%s", full.c_str()), full);
    EXPECT_EQ(MkString("%sy", full.c_str()), full);
}

// The C library's checks of a hardened build would end the process.
TEST(MkString, CountsInAFormatThatIsInWritableMemory) {
    std::string (*const make)(const char*, ...) = MkString;
    char format[] = "abc%n%d";
    int count = 0;
    EXPECT_EQ(make(format, &count, 7), "abc7");
    EXPECT_EQ(count, 3);
}

TEST(MkTokenString, SeparatesWhatFollowsTheFirstText) {
    const std::string full(4095, 'x');
    EXPECT_EQ(MkTokenString(static_cast<const char*>(nullptr), "a", nullptr), "");
    EXPECT_EQ(MkTokenString("a", "", "b", nullptr), "a||b");
    EXPECT_EQ(MkTokenString("", "a", "", nullptr), "a|");
    EXPECT_EQ(MkTokenString(full.c_str(), "b", nullptr), full);
    EXPECT_EQ(MkTokenString(&full[1], "b", nullptr), full.substr(1) + "|");
}
