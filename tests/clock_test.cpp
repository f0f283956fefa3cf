// Clocks, stopwatch and its text, on a clock of the test's own.
#include "zanbase/clock.h"

#include <gtest/gtest.h>

#include "platform/clock.h"
#include "timing/time_text.h"

namespace {
WallClock now = {};
}

WallClock ReadWallClock() noexcept { return now; }
unsigned int ReadTicks() noexcept { return 0; }
void SleepFor(unsigned int) noexcept {}

namespace {

class CopyableTimer : public HTimer {};

TEST(Timer, ReportsTheTimeSinceItsStart) {
    now = {0, 0};
    CopyableTimer timer;
    now = {7200, 500};
    EXPECT_EQ(timer.GetTimeInMinutes(), 7200.5 / 60);
    EXPECT_EQ(timer.GetTimeInHours(), 7200.5 / 60 / 60);
    timer.Reset();
    now = {7200, 250};
    EXPECT_EQ(timer.GetTimeAsString(), "-250.000 milliseconds");
}

TEST(Timer, StartsACopyAndKeepsTheStartOfATarget) {
    const CopyableTimer timer;
    now.seconds += 10;
    CopyableTimer copy(timer);
    EXPECT_EQ(copy.GetTimeInSeconds(), 0.0);
    now.seconds += 2;
    copy = timer;
    EXPECT_EQ(copy.GetTimeInSeconds(), 2.0);
}

TEST(TimeText, HasTheLargestUnitFirst) {
    const struct {
        double seconds;
        const char* text;
    } cases[] = {{0.9996, "999.600 milliseconds"},
                 {1.0, "1.000 seconds"},
                 {59.9996, "60.000 seconds"},
                 {61.9, "1m01s"},
                 {3600.0, "1h00m00s"},
                 {90061.0, "1d01h01m01s"},
                 {6048000.0, "10w00d00h00m00s"},
                 {2147483647.9, "3550w05d03h14m07s"},
                 {2147483648.0, "2147483648.000 seconds"}};
    for (const auto& [seconds, text] : cases) EXPECT_EQ(TimeText(seconds), text);
}

}  // namespace
