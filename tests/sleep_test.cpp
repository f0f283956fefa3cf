// The default sleep on a clock and a pause of the test's own, and the hook.
#include "zanbase/sleep.h"

#include <gmock/gmock.h>

#include <climits>
#include <cstdio>
#include <vector>

#include "support/run_in_child.h"

namespace {

unsigned int ticks = 0;
std::vector<unsigned int> advances;  // by how much each coming pause moves the clock
std::vector<unsigned int> pauses;

}  // namespace

extern "C" {
unsigned int __wrap__Z9ReadTicksv() { return ticks; }
void __wrap__Z8PauseForj(unsigned int ms) {
    ticks += advances.at(pauses.size());
    pauses.push_back(ms);
}
}

namespace {

TEST(USleep, PausesUntilTheClockHasMovedATenthOfTheTime) {
    const struct {
        int microseconds;
        std::vector<unsigned int> advances;
        unsigned int pause;
    } rows[] = {
        {1, {1}, 0},  // below a millisecond: gives way until the clock ticks
        {999, {0, 0, 0, 1}, 0},
        {5000, {1}, 5},
        {19999, {0, 1}, 19},
        {20000, {1, 1}, 20},
        {100000, {10}, 100},
        {100000, {9, 0, 1}, 100},
        {INT_MAX, {214747, 1}, 2147483},
    };
    for (const unsigned int start : {0U, UINT_MAX, UINT_MAX - 5}) {
        for (const auto& row : rows) {
            ticks = start;
            advances = row.advances;
            pauses.clear();
            USleep(row.microseconds);
            EXPECT_EQ(pauses, std::vector<unsigned int>(row.advances.size(), row.pause)) << row.microseconds;
        }
    }
}

TEST(USleep, CallsTheNewestHookWithPositiveTimesOnly) {
    const ChildResult child = RunInChild([] {
        InstallUSleepHook([](int) { std::puts("old"); });
        InstallUSleepHook([](int microseconds) { std::printf("%d\n", microseconds); });
        for (const int microseconds : {0, -1, INT_MIN, 1, INT_MAX}) USleep(microseconds);
        return 0;
    });
    EXPECT_EQ(child.out, "1\n2147483647\n");
}

}  // namespace
