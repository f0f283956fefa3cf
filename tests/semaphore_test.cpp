// Counts, waits and limits of the semaphore, and the orders of its scoped holder.
#include "zanbase/semaphore.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cmath>
#include <limits>
#include <thread>

#include "locks/milliseconds.h"

namespace {

// The units that nobody holds, at most 9.
int FreeUnits(const HSemaphore& semaphore) {
    int units = 0;
    while (units < 9 && semaphore.TryLock(0.0)) ++units;
    for (int unit = 0; unit < units; ++unit) semaphore.Unlock();
    return units;
}

TEST(MillisecondsIn, CutsAndNeverLeavesTheRange) {
    const double infinity = std::numeric_limits<double>::infinity();
    const struct {
        double seconds;
        unsigned int milliseconds;
    } cases[] = {{0.0, 0},
                 {0.0009, 0},
                 {0.001, 1},
                 {1.9999, 1999},
                 {0.5, 500},
                 {4294967.0, 4294967000},
                 {4294967.5, kForever},
                 {1e300, kForever},
                 {infinity, kForever},
                 {-0.5, 0},
                 {-infinity, 0},
                 {std::nan(""), 0}};
    for (const auto& each : cases) EXPECT_EQ(MillisecondsIn(each.seconds), each.milliseconds) << each.seconds;
}

TEST(HSemaphore, HasTheUnitsItWasGiven) {
    EXPECT_EQ(FreeUnits(HSemaphore()), 1);
    for (const unsigned int count : {0U, 1U, 3U}) {
        const HSemaphore semaphore(count);
        EXPECT_EQ(FreeUnits(semaphore), static_cast<int>(count));
        semaphore.Unlock();  // by one who has taken none
        semaphore.Lock();
        EXPECT_EQ(FreeUnits(semaphore), static_cast<int>(count));
    }
}

TEST(HSemaphore, StaysAtTheMaximum) {
    const HSemaphore full(2147483647);
    full.Unlock();
    EXPECT_EQ(FreeUnits(full), 9);
    EXPECT_EQ(FreeUnits(HSemaphore(4294967295U)), 9);
}

TEST(HSemaphore, WaitsUntilTheLimitOrAUnit) {
    const HSemaphore semaphore(0);
    for (const double seconds : {0.02, 0.0015}) {
        const auto start = std::chrono::steady_clock::now();
        EXPECT_FALSE(semaphore.TryLock(seconds));
        const auto passed = std::chrono::steady_clock::now() - start;
        EXPECT_GE(passed, std::chrono::milliseconds(static_cast<int>(seconds * 1000.0)));
    }
    for (const bool limited : {false, true}) {
        std::thread giver([&] { semaphore.Unlock(); });
        if (limited) {
            EXPECT_TRUE(semaphore.TryLock(1e300));
        } else {
            semaphore.Lock();
        }
        giver.join();
    }
    EXPECT_EQ(FreeUnits(semaphore), 0);
}

TEST(HSemaphoreLock, HoldsOneUnitUntilReleased) {
    HSemaphore semaphore(3);
    HSemaphoreLock none(nullptr);
    none.Release();
    {
        HSemaphoreLock lock = &semaphore;
        HSemaphoreLock copy = lock;
        EXPECT_EQ(FreeUnits(semaphore), 1);
        lock.Release();
        lock.Release();
        EXPECT_EQ(FreeUnits(semaphore), 2);
        lock = copy;
        EXPECT_EQ(FreeUnits(semaphore), 1);
        copy = none;
        EXPECT_EQ(FreeUnits(semaphore), 2);
    }
    EXPECT_EQ(FreeUnits(semaphore), 3);
}

TEST(HSemaphoreLock, GivesBeforeItTakes) {
    HSemaphore first(1);
    HSemaphore second(1);
    HSemaphoreLock lock(&first);
    HSemaphoreLock& same = lock;
    lock = same;  // would wait for itself if it took first
    lock.Reset(&first);
    lock.Reset(&second);
    EXPECT_EQ(FreeUnits(first), 1);
    EXPECT_EQ(FreeUnits(second), 0);
    lock.Reset(nullptr);
    EXPECT_EQ(FreeUnits(second), 1);
}

}  // namespace
