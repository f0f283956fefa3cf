// The formulas of the clocks, the stopwatch on a clock of the test's own, and the text of a time.
#include "zanbase/clock.h"

#include <gtest/gtest.h>

#include <cmath>

#include "platform/clock.h"
#include "timing/time_text.h"

WallClock now = {};
extern "C" WallClock __wrap__Z13ReadWallClockv() { return now; }

class CopyableTimer : public HTimer {};

TEST(Clock, TellsTheTimeInEachUnitAndSinceATimersOwnStart) {
    now = {-2, 250};
    EXPECT_EQ(GetMicroSeconds(), -1750000.0);
    EXPECT_EQ(GetMilliSeconds(), -1750.0);
    EXPECT_EQ(GetTimeInSeconds(), -1.75);
    CopyableTimer timer;
    now = {7198, 750};
    EXPECT_EQ(timer.GetTimeInSeconds(), 7200.5);
    EXPECT_EQ(timer.GetTimeInMinutes(), 7200.5 / 60.0);
    EXPECT_EQ(timer.GetTimeInHours(), 7200.5 / 60.0 / 60.0);
    CopyableTimer copy(timer);  // starts anew, and keeps that when it is assigned to
    now = {7200, 750};
    EXPECT_EQ((copy = timer).GetTimeInSeconds(), 2.0);
    timer.Reset();
    now = {7200, 500};
    EXPECT_EQ(timer.GetTimeAsString(), "-250.000 milliseconds");
}

TEST(TimeText, ChoosesUnitsBySize) {
    const std::pair<double, const char*> rows[] = {{0, "0.000 milliseconds"},
                                                   {0.9996, "999.600 milliseconds"},
                                                   {1, "1.000 seconds"},
                                                   {59.9996, "60.000 seconds"},
                                                   {61.9, "1m01s"},
                                                   {3599, "59m59s"},
                                                   {3600, "1h00m00s"},
                                                   {90061, "1d01h01m01s"},
                                                   {604799.9, "6d23h59m59s"},
                                                   {6048000, "10w00d00h00m00s"},
                                                   {2147483647.9, "3550w05d03h14m07s"},
                                                   {2147483648.0, "2147483648.000 seconds"},
                                                   {-90061, "-90061000.000 milliseconds"},
                                                   {HUGE_VAL, "inf seconds"},
                                                   {std::nan(""), "nan milliseconds"}};
    for (const auto& [seconds, text] : rows) EXPECT_EQ(TimeText(seconds), text);
}
