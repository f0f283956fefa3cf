// Times, and the orders of the scoped holder; units and limits are the platform's, see platform_test.cpp.
#include "zanbase/semaphore.h"

#include <gtest/gtest.h>

#include <cmath>

#include "locks/milliseconds.h"

namespace {

// The units that nobody holds.
int FreeUnits(const HSemaphore& semaphore) {
    int units = 0;
    while (semaphore.TryLock(0.0)) ++units;
    for (int unit = 0; unit < units; ++unit) semaphore.Unlock();
    return units;
}

TEST(MillisecondsIn, CutsAndNeverLeavesTheRange) {
    const struct {
        double seconds;
        unsigned int milliseconds;
    } cases[] = {{0.0009, 0},          {1.9999, 1999}, {4294967.0, 4294967000}, {4294967.5, kForever},
                 {HUGE_VAL, kForever}, {-0.5, 0},      {-HUGE_VAL, 0},          {std::nan(""), 0}};
    for (const auto& each : cases) EXPECT_EQ(MillisecondsIn(each.seconds), each.milliseconds) << each.seconds;
}

TEST(HSemaphore, CountsForEverybody) {
    EXPECT_EQ(FreeUnits(HSemaphore()), 1);
    const HSemaphore semaphore(3);
    semaphore.Unlock();  // by one who has taken none
    semaphore.Lock();
    EXPECT_TRUE(semaphore.TryLock(1e9));
    EXPECT_EQ(FreeUnits(semaphore), 2);
}

TEST(HSemaphoreLock, HoldsOneUnitAndGivesItBackBeforeItTakes) {
    HSemaphore first(2), second(1);
    HSemaphoreLock none(nullptr);
    none.Release();
    {
        HSemaphoreLock lock = &first;
        HSemaphoreLock copy = lock;
        EXPECT_EQ(FreeUnits(first), 0);
        HSemaphoreLock& same = lock;
        lock = same;  // would wait for itself if it took first
        lock.Reset(&first);
        lock.Release();
        lock.Release();
        EXPECT_EQ(FreeUnits(first), 1);
        lock = copy;
        EXPECT_EQ(FreeUnits(first), 0);
        copy.Reset(&second);
        EXPECT_EQ(FreeUnits(second), 0);
        lock = none;
        EXPECT_EQ(FreeUnits(first), 2);
    }
    EXPECT_EQ(FreeUnits(first), 2);
    EXPECT_EQ(FreeUnits(second), 1);
}

}  // namespace
