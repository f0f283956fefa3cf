// Clocks, stopwatch and sleep, on clocks of the test's own.
#include "zanbase/clock.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>
#include <utility>

#include "platform/clock.h"
#include "timing/time_text.h"
#include "zanbase/sleep.h"

WallClock now = {};
unsigned int ticks = UINT_MAX - 4, pauses = 1;  // a tick at every other pause
std::string calls;

WallClock ReadWallClock() noexcept { return now; }
unsigned int ReadTicks() noexcept { return ticks; }
void SleepFor(unsigned ms) noexcept { ticks += ++pauses % 2, calls += std::to_string(ms) + ";"; }

class CopyableTimer : public HTimer {};

TEST(Clock, TellsTimesInEachUnitAndAsText) {
    now = {-2, 250};
    EXPECT_EQ(std::pair(GetMicroSeconds(), GetMilliSeconds()), std::pair(-1750000.0, -1750.0));
    CopyableTimer timer;
    now = {7198, 750};
    EXPECT_TRUE(timer.GetTimeInMinutes() == 7200.5 / 60 && timer.GetTimeInHours() == 7200.5 / 60 / 60);
    CopyableTimer copy(timer);  // starts anew, and keeps that when it is assigned to
    now = {7200, 750};
    EXPECT_EQ((copy = timer).GetTimeInSeconds(), 2.0);
    timer.Reset();
    now = {7200, 500};
    std::string texts = timer.GetTimeAsString();
    for (const double seconds : {0.9996, 1.0, 59.9996, 61.9, 3599.0, 3600.0, 90061.0, 604799.9, 6048000.0,
                                 2147483647.9, 2147483648.0})
        texts += '|' + TimeText(seconds);
    EXPECT_EQ(texts,
              "-250.000 milliseconds|999.600 milliseconds|1.000 seconds|60.000 seconds|1m01s|59m59s|1h00m00s|"
              "1d01h01m01s|6d23h59m59s|10w00d00h00m00s|3550w05d03h14m07s|2147483648.000 seconds");
}

TEST(USleep, PausesForATenthOfTheTimeAtLeastUntilAHookIsInstalled) {
    for (const int microseconds : {0, INT_MIN, 1, 5000, 19999, 39999}) USleep(microseconds);
    EXPECT_EQ(calls, "0;0;5;5;19;19;39;39;39;39;39;39;");
    InstallUSleepHook([](int microseconds) { calls = std::to_string(microseconds); });
    for (const int microseconds : {INT_MAX, 0, -1}) USleep(microseconds);
    EXPECT_EQ(calls, "2147483647");
}
