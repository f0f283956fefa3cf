// HSemaphore, its holder, and the limits of all waits.
#include "zanbase/semaphore.h"

#include <gtest/gtest.h>

#include <cmath>

#include "locks/milliseconds.h"
#include "support/holder_rules.h"

namespace {

TEST(MillisecondsIn, CutsAndStaysInRange) {
    struct Case {
        double seconds;
        unsigned int milliseconds;
    };
    const Case cases[] = {
        {0.0009, 0},          {1.9999, 1999}, {4294967.0, 4294967000}, {4294967.5, kForever},
        {HUGE_VAL, kForever}, {-0.5, 0},      {-HUGE_VAL, 0},          {std::nan(""), 0},
    };
    for (const Case& each : cases) EXPECT_EQ(MillisecondsIn(each.seconds), each.milliseconds) << each.seconds;
}

// The units that are free, all acquired and released.
int FreeUnits(const HSemaphore& semaphore) {
    if (!semaphore.TryLock(0.0)) return 0;
    const int units = 1 + FreeUnits(semaphore);
    semaphore.Unlock();
    return units;
}

TEST(HSemaphoreLock, ReleasesBeforeItAcquires) {
    HSemaphore first(2);
    HSemaphore second(2);
    const auto held = [](const HSemaphore& semaphore) { return 2 - FreeUnits(semaphore); };
    ExpectHolderRules<HSemaphoreLock>(first, second, held);
}

}  // namespace
