// The default sleep on a clock of the test's own that ticks at every other pause, and the hook.
#include "zanbase/sleep.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

unsigned int ticks = UINT_MAX - 4, pauses = 1;
std::string calls;

extern "C" unsigned int __wrap__Z9ReadTicksv() { return ticks; }
extern "C" void __wrap__Z8PauseForj(unsigned int ms) {
    ticks += ++pauses % 2, calls += std::to_string(ms) + ";";
}

TEST(USleep, PausesForATenthOfTheTimeAtLeastUntilAHookIsInstalled) {
    for (const int microseconds : {0, -1, INT_MIN, 1, 5000, 19999, 39999}) USleep(microseconds);
    EXPECT_EQ(calls, "0;0;5;5;19;19;39;39;39;39;39;39;");
    calls.clear();
    InstallUSleepHook([](int) { calls += "old"; });
    InstallUSleepHook([](int microseconds) { calls += std::to_string(microseconds) + ";"; });
    for (const int microseconds : {0, -1, INT_MIN, 1, INT_MAX}) USleep(microseconds);
    EXPECT_EQ(calls, "1;2147483647;");
}
