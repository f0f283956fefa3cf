// The platform contracts by themselves, in the words of their headers: every back end runs this file.
#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "platform/clock.h"
#include "platform/condition.h"
#include "platform/console.h"
#include "platform/lock.h"
#include "platform/messages.h"
#include "platform/processors.h"
#include "platform/semaphore.h"

TEST(PlatformClock, GivesTheWallTimeInMilliseconds) {
    const WallClock before = ReadWallClock();
    const long long now = std::chrono::system_clock::now().time_since_epoch() / std::chrono::milliseconds(1);
    const WallClock after = ReadWallClock();
    EXPECT_LE(before.seconds * 1000 + before.milliseconds, now);
    EXPECT_GE(after.seconds * 1000 + after.milliseconds, now);
    EXPECT_LT(after.milliseconds, 1000);
}

TEST(PlatformClock, PausesForAtLeastTheTimeGiven) {
    const unsigned int start = ReadTicks();
    const auto before = std::chrono::steady_clock::now();
    for (const unsigned int ms : {0U, 1U, 29U}) PauseFor(ms);
    EXPECT_GE(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(30));
    EXPECT_GE(ReadTicks() - start, 30U);
}

TEST(PlatformProcessors, AreKnownAndAtLeastAsManyAsCores) {
    EXPECT_GE(CountLogicalProcessors(), 1);
    EXPECT_LE(CountProcessorCores(), CountLogicalProcessors());
}

TEST(Messages, AreTheirOwnTranslationWithoutACatalogue) {
    SetMessageLocale("no such locale");
    BindMessages("no_such_domain", nullptr);
    EXPECT_STREQ(Translate("text"), "text");
}

TEST(Console, IsLeftAloneWhereNoneIsOpen) {
    ShowConsoleWindow(false);
    EXPECT_FALSE(CloseConsole());
}

TEST(PlatformLock, IsFreeAtLevelZeroOnly) {
    NativeLock lock;
    OpenLock(&lock);
    const auto free_for_others = [&] {
        bool taken = false;
        std::thread([&] {
            taken = TryTakeLock(&lock);
            if (taken) GiveLock(&lock);
        }).join();
        return taken;
    };
    TakeLock(&lock);
    EXPECT_TRUE(TryTakeLock(&lock));
    GiveLock(&lock);
    EXPECT_FALSE(free_for_others());
    GiveLock(&lock);
    EXPECT_TRUE(free_for_others());
    CloseLock(&lock);
}

TEST(PlatformCondition, SleepsUntilAWakeUpOrTheLimit) {
    NativeLock lock;
    OpenLock(&lock);
    NativeCondition condition;
    OpenCondition(&condition);
    for (const auto wake : {WakeOne, WakeAll}) {
        wake(&condition);  // for nobody, and not kept
        TakeLock(&lock);
        EXPECT_FALSE(SleepOn(&condition, &lock, 0));
        EXPECT_FALSE(SleepOn(&condition, &lock, 5));
        bool woken = false;  // guarded by lock
        std::thread waker([&] {
            TakeLock(&lock);
            woken = true;
            GiveLock(&lock);
            wake(&condition);
        });
        while (!woken) EXPECT_TRUE(SleepOn(&condition, &lock, kForever));
        GiveLock(&lock);
        waker.join();
    }
    CloseLock(&lock);
}

TEST(PlatformSemaphore, CountsUnitsUpToItsMost) {
    NativeSemaphore* const semaphore = NewSemaphore(1);
    EXPECT_TRUE(TakeUnit(semaphore, 0));
    EXPECT_FALSE(TakeUnit(semaphore, 0));
    EXPECT_FALSE(TakeUnit(semaphore, 5));
    std::thread giver([&] { GiveUnit(semaphore); });
    EXPECT_TRUE(TakeUnit(semaphore, kForever));
    giver.join();
    EndSemaphore(semaphore);
    NativeSemaphore* const full = NewSemaphore(kMostUnits);
    GiveUnit(full);
    EXPECT_TRUE(TakeUnit(full, 0));
    EndSemaphore(full);
}
