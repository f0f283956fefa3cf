// Terminal codes, the revision text and the screen measures.
#include "zanbase/terminal.h"

#include <gmock/gmock.h>

#include <sstream>
#include <string>

TEST(Terminal, IsKnownByTheBeginningOfItsName) {
    std::istringstream table(
        "HARD 0 hardcopy 0 VT52 1 vt 0 vt100-w 2 V100x 2 TEKTRONIX 3 Ansi 4 VT200 5 VT220 0 CDC721 6 CDC72 0 "
        "masscomp 7 HP2621B 8 ibm/pc 9 [BM 0 Defaults 9 DEF 0 Automatic 9 AUT 0");
    int code = -1;
    for (std::string name; table >> name >> code;) EXPECT_EQ(IMPTerminal(name.c_str()), code) << name;
    EXPECT_EQ(IMPTerminal(""), 0);
}

TEST(ScreenSize, IsThatOfTheFirstCall) {
    double sizes[] = {-1, -1, -1, -1};
    EXPECT_EQ(GetScreenSize(&sizes[0], &sizes[1], &sizes[2], &sizes[3]), 0);
    EXPECT_EQ(SetScreenSize(0, 2, 3, 4), 1);
    EXPECT_EQ(SetScreenSize(9, 9, 9, 9), 0);
    EXPECT_EQ(GetScreenSize(nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(GetScreenSize(&sizes[0], &sizes[1], nullptr, nullptr), 1);
    EXPECT_EQ(GetScreenSize(nullptr, nullptr, &sizes[3], nullptr), 1);
    EXPECT_THAT(sizes, testing::ElementsAre(0, 2, -1, 3));
}
