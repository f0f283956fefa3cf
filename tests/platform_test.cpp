// The platform contracts by themselves, in the words of their headers: every back end runs this file.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>

#include "platform/clock.h"
#include "platform/condition.h"
#include "platform/guard.h"
#include "platform/lock.h"
#include "platform/processors.h"
#include "platform/semaphore.h"
#include "platform/thread.h"
#include "support/faults.h"

TEST(PlatformClock, GivesTheWallTimeAndTicksAndPausesInMilliseconds) {
    const auto wall_before = std::chrono::system_clock::now().time_since_epoch();
    const WallClock wall = ReadWallClock();
    const std::chrono::milliseconds read(wall.seconds * 1000 + wall.milliseconds), one(1);
    EXPECT_TRUE(wall.milliseconds < 1000 && read > wall_before - one &&
                read <= std::chrono::system_clock::now().time_since_epoch());
    const auto before = std::chrono::steady_clock::now();
    const unsigned int start = ReadTicks();
    for (const unsigned int ms : {0U, 1U, 29U}) PauseFor(ms);
    const unsigned int ticks = ReadTicks() - start;
    EXPECT_TRUE(ticks >= 30 && std::chrono::steady_clock::now() - before > (ticks - 1) * one) << ticks;
}

TEST(PlatformProcessors, AreKnownAndAtLeastAsManyAsCores) {
    EXPECT_TRUE(CountLogicalProcessors() >= 1 && CountProcessorCores() <= CountLogicalProcessors());
}

TEST(PlatformLock, IsFreeAtLevelZeroOnly) {
    NativeLock lock;
    OpenLock(&lock);
    TakeLock(&lock);
    EXPECT_TRUE(TryTakeLock(&lock));
    for (const bool free_after : {false, true}) {
        GiveLock(&lock);
        std::thread([&] {
            EXPECT_EQ(TryTakeLock(&lock), free_after);
            if (free_after) GiveLock(&lock);
        }).join();
    }
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
    NativeSemaphore* semaphore = NewSemaphore(0);
    for (const unsigned int limit_ms : {0U, 5U}) EXPECT_FALSE(TakeUnit(semaphore, limit_ms));
    for (const unsigned int limit_ms : {kForever, kForever - 1}) {
        std::thread giver([&] { GiveUnit(semaphore); });
        EXPECT_TRUE(TakeUnit(semaphore, limit_ms));
        giver.join();
    }
    EndSemaphore(semaphore);
    semaphore = NewSemaphore(kMostUnits);
    GiveUnit(semaphore);
    EXPECT_TRUE(TakeUnit(semaphore, 0));
    EndSemaphore(semaphore);
}

TEST(PlatformThread, HasItsSlotFromBeforeItsBodyToItsEnd) {
    static ThreadSlot slot{nullptr};
    static std::atomic<int> steps{0};
    const auto one_step = [](void*) { steps += slot.load() != nullptr ? 1 : 0; };
    const auto endless = [](void*) {
        for (;; ++steps) GiveWay();
    };
    for (int round = 1; round <= 100; ++round) {
        steps = 0;
        ASSERT_EQ(StartThread(slot, one_step, nullptr), 0) << SystemErrorText(0);
        AwaitThread(slot);
        EXPECT_EQ(steps, 1);
        StartThread(slot, endless, nullptr);
        while (steps < round % 3) GiveWay();
        EndThread(slot);
        EXPECT_EQ(slot.load(), nullptr);
    }
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
