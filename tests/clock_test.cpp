// The formulas of the clocks, the stopwatch on a clock of the test's own, and the text of a time.
#include "zanbase/clock.h"

#include <gtest/gtest.h>

#include <limits>

#include "platform/clock.h"
#include "timing/time_text.h"

namespace {

WallClock now = {};

}  // namespace

extern "C" WallClock __wrap__Z13ReadWallClockv() { return now; }

namespace {

TEST(Clocks, AddSecondsAndMillisecondsInEachUnit) {
    for (const WallClock clock : {WallClock{0, 0}, {0, 999}, {1700000000, 123}, {-2, 250}, {1LL << 40, 1}}) {
        now = clock;
        const auto s = static_cast<double>(clock.seconds);
        EXPECT_EQ(GetMicroSeconds(), clock.milliseconds * 1000.0 + s * 1000000.0);
        EXPECT_EQ(GetMilliSeconds(), s * 1000.0 + clock.milliseconds);
        EXPECT_EQ(GetTimeInSeconds(), clock.milliseconds / 1000.0 + s);
    }
}

class CopyableTimer : public HTimer {};

TEST(HTimer, TellsTheTimeSinceItsStart) {
    now = {1000, 0};
    HTimer timer;
    now = {8200, 500};
    EXPECT_EQ(timer.GetTimeInSeconds(), 7200.5);
    EXPECT_EQ(timer.GetTimeInMinutes(), 7200.5 / 60.0);
    EXPECT_EQ(timer.GetTimeInHours(), 7200.5 / 60.0 / 60.0);
    EXPECT_EQ(timer.GetTimeAsString(), "2h00m00s");
    timer.Reset();
    EXPECT_EQ(timer.GetTimeAsString(), "0.000 milliseconds");
    now = {8199, 0};
    EXPECT_EQ(timer.GetTimeAsString(), "-1500.000 milliseconds");
}

TEST(HTimer, StartsACopyAnewAndKeepsATargetsStart) {
    now = {1000, 0};
    CopyableTimer first;
    now = {1005, 0};
    CopyableTimer second(first);
    now = {1007, 0};
    EXPECT_EQ(second.GetTimeInSeconds(), 2.0);
    EXPECT_EQ(&(second = first), &second);
    EXPECT_EQ(second.GetTimeInSeconds(), 2.0);
}

TEST(TimeText, ChoosesUnitsBySize) {
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const struct {
        double seconds;
        const char* text;
    } rows[] = {
        {0, "0.000 milliseconds"},
        {0.25, "250.000 milliseconds"},
        {0.9996, "999.600 milliseconds"},
        {1, "1.000 seconds"},
        {59.5, "59.500 seconds"},
        {59.9996, "60.000 seconds"},
        {60, "1m00s"},
        {61.9, "1m01s"},
        {3599, "59m59s"},
        {3600, "1h00m00s"},
        {3661, "1h01m01s"},
        {86400, "1d00h00m00s"},
        {90061, "1d01h01m01s"},
        {604799.9, "6d23h59m59s"},
        {604800, "1w00d00h00m00s"},
        {694861, "1w01d01h01m01s"},
        {6048000, "10w00d00h00m00s"},
        {2147483647.9, "3550w05d03h14m07s"},
        {-0.5, "-500.000 milliseconds"},
        {-90061, "-90061000.000 milliseconds"},
        {2147483648.0, "2147483648.000 seconds"},
        {1e15, "1000000000000000.000 seconds"},
        {kInfinity, "inf seconds"},
        {-kInfinity, "-inf milliseconds"},
        {std::numeric_limits<double>::quiet_NaN(), "nan milliseconds"},
    };
    for (const auto& row : rows) EXPECT_EQ(TimeText(row.seconds), row.text);
}

}  // namespace
