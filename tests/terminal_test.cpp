// Terminal codes, the revision text and the screen measures.
#include "zanbase/terminal.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace {

TEST(Terminal, IsKnownByTheBeginningOfItsName) {
    for (const auto& [name, code] : {
             std::pair("", 0),         std::pair("HARD", 0),      std::pair("hardcopy", 0),
             std::pair("VT52", 1),     std::pair("vt", 0),        std::pair("VT", 0),
             std::pair("VT100", 2),    std::pair("vt100-w", 2),   std::pair("V100", 2),
             std::pair("v100x", 2),    std::pair("TEKT4010", 3),  std::pair("TEKTRONIX", 3),
             std::pair("TEK", 0),      std::pair("Ansi", 4),      std::pair("VT200", 5),
             std::pair("VT220", 0),    std::pair("CDC721", 6),    std::pair("CDC72", 0),
             std::pair("masscomp", 7), std::pair("HP2621B", 8),   std::pair("IBM", 9),
             std::pair("IBM/PC", 9),   std::pair("default", 9),   std::pair("DEFAULTS", 9),
             std::pair("DEF", 0),      std::pair("Automatic", 9), std::pair("AUT", 0),
             std::pair(" VT100", 0),   std::pair("{", 0),
         }) {
        EXPECT_EQ(IMPTerminal(name), code) << name;
    }
    EXPECT_EQ(IMPAutomaticTerm(), 9);
    EXPECT_EQ(IsWin32s(), 0);
}

TEST(Revision, IsOneTextWithoutDots) {
    const char* const first = IMPGetMajorRev();
    EXPECT_STREQ(first, "20160");
    EXPECT_EQ(IMPGetMajorRev(), first);
    EXPECT_STREQ(first, "20160");
}

TEST(ScreenSize, IsThatOfTheFirstCall) {
    double first = -1;
    double second = -1;
    double third = -1;
    double fourth = -1;
    EXPECT_EQ(GetScreenSize(&first, &second, &third, &fourth), 0);
    EXPECT_EQ(first, -1);
    EXPECT_EQ(SetScreenSize(0.0, 2.5, 3.5, 4.5), 1);
    EXPECT_EQ(SetScreenSize(9, 9, 9, 9), 0);
    EXPECT_EQ(GetScreenSize(nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(GetScreenSize(nullptr, nullptr, &third, nullptr), 1);
    EXPECT_EQ(third, 3.5);
    third = -1;
    EXPECT_EQ(GetScreenSize(&first, &second, nullptr, &fourth), 1);
    EXPECT_EQ(std::to_string(first) + std::to_string(second) + std::to_string(third) + std::to_string(fourth),
              "0.0000002.500000-1.0000004.500000");
}

}  // namespace
