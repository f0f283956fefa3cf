// The default sleep routine on a tick count of the test's own, and the hook.
#include "zanbase/sleep.h"

#include <gmock/gmock.h>

#include <climits>

#include "platform/clock.h"

namespace {
std::vector<unsigned int> pauses;
}

WallClock ReadWallClock() noexcept { return {}; }
// Two pauses to a tick; the count wraps during the test.
unsigned int ReadTicks() noexcept { return UINT_MAX - 4 + static_cast<unsigned int>(pauses.size() / 2); }
void SleepFor(unsigned int ms) noexcept { pauses.push_back(ms); }

namespace {

using testing::ElementsAre;

TEST(USleep, PausesForATenthOfTheTimeAtLeast) {
    USleep(0);
    USleep(INT_MIN);
    USleep(1);
    USleep(19999);
    EXPECT_THAT(pauses, ElementsAre(0, 0, 19, 19));
    USleep(39999);
    EXPECT_THAT(pauses, ElementsAre(0, 0, 19, 19, 39, 39, 39, 39, 39, 39));
}

TEST(USleep, CallsTheHookForPositiveTimes) {
    static std::vector<int> calls;
    InstallUSleepHook([](int microseconds) { calls.push_back(microseconds); });
    USleep(INT_MAX);
    USleep(0);
    USleep(-1);
    EXPECT_THAT(calls, ElementsAre(INT_MAX));
}

}  // namespace
