// The platform contracts by themselves, in the words of their headers: every back end runs this file.
#include <gtest/gtest.h>

#include <chrono>

#include "platform/clock.h"
#include "platform/guard.h"
#include "platform/semaphore.h"
#include "support/faults.h"

TEST(PlatformClock, ReadsTheWallTimeInMilliseconds) {
    using std::chrono::system_clock;
    const auto before = std::chrono::floor<std::chrono::milliseconds>(system_clock::now().time_since_epoch());
    const WallClock wall = ReadWallClock();
    const std::chrono::milliseconds read(wall.seconds * 1000 + wall.milliseconds);
    EXPECT_LT(wall.milliseconds, 1000);
    EXPECT_GE(read, before);
    EXPECT_LE(read, system_clock::now().time_since_epoch());
}

TEST(PlatformSemaphore, KeepsItsMostUnits) {
    HNativeSemaphore* const semaphore = NewSemaphore(kMaxUnits);
    ReleaseUnit(semaphore);
    EXPECT_TRUE(AcquireUnit(semaphore, 0));
    DeleteSemaphore(semaphore);
}

TEST(PlatformGuard, TellsFaultsFromOtherWaysOut) {
    const auto fault = [](void*) { WriteToNull(); };
    const auto nested = [](void*) { EXPECT_TRUE(RunGuarded([](void*) { DivideByZero(); }, nullptr)); };
    for (int round = 0; round < 3; ++round) {
        EXPECT_TRUE(RunGuarded(fault, nullptr));
        EXPECT_FALSE(RunGuarded(nested, nullptr));
        EXPECT_THROW(RunGuarded([](void*) { throw 7; }, nullptr), int);
    }
}
