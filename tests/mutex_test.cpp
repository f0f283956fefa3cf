// Re-entrancy, exclusion and the orders of the scoped holder.
#include "zanbase/mutex.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>
#include <vector>

namespace {

// Whether another thread could take `mutex` right now.
bool FreeForOthers(const HMutex& mutex) {
    bool taken = false;
    std::thread([&] {
        taken = mutex.TryLock();
        if (taken) mutex.Unlock();
    }).join();
    return taken;
}

TEST(HMutex, IsFreeAfterAsManyUnlocksAsLocks) {
    const HMutex mutex;
    mutex.Lock();
    EXPECT_TRUE(mutex.TryLock());
    mutex.Lock();
    for (int level = 3; level > 0; --level) {
        EXPECT_FALSE(FreeForOthers(mutex));
        mutex.Unlock();
    }
    EXPECT_TRUE(FreeForOthers(mutex));
}

TEST(HMutex, LetsOneThreadInAtATime) {
    const HMutex mutex;
    constexpr int kThreads = 4;
    constexpr int kRounds = 20000;
    int count = 0;  // guarded by mutex
    std::vector<std::thread> threads;
    for (int i = 0; i < kThreads; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < kRounds; ++round) {
                if (round % 8 != 0 || !mutex.TryLock()) mutex.Lock();
                const HMutexLock again(&mutex);
                ++count;
                mutex.Unlock();
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(count, kThreads * kRounds);
}

TEST(HMutexLock, HoldsOneLevelUntilReleased) {
    const HMutex mutex;
    const HMutexLock none;
    EXPECT_EQ(none.GetMutex(), nullptr);
    HMutexLock lock = &mutex;
    HMutexLock copy = lock;
    EXPECT_EQ(copy.GetMutex(), &mutex);
    lock.Release();
    lock.Release();
    EXPECT_EQ(lock.GetMutex(), nullptr);
    EXPECT_FALSE(FreeForOthers(mutex));
    copy = none;
    EXPECT_EQ(copy.GetMutex(), nullptr);
    EXPECT_TRUE(FreeForOthers(mutex));
}

TEST(HMutexLock, MovesFromOneMutexToAnother) {
    const HMutex first;
    const HMutex second;
    HMutexLock lock(&first);
    lock.Reset(&second);
    EXPECT_TRUE(FreeForOthers(first));
    EXPECT_FALSE(FreeForOthers(second));
    HMutexLock& same = lock;
    lock = same;
    lock.Reset(lock.GetMutex());
    EXPECT_FALSE(FreeForOthers(second));
    lock.Reset(nullptr);
    EXPECT_TRUE(FreeForOthers(second));
}

// A thread that waits for the mutex gets in while its only level is let go and taken again.
TEST(HMutexLock, LetsAWaiterInBetweenOnSelfAssignment) {
    const HMutex mutex;
    bool entered = false;  // guarded by mutex
    HMutexLock lock(&mutex);
    std::thread waiter([&] {
        const HMutexLock mine(&mutex);
        entered = true;
    });
    HMutexLock& same = lock;
    while (!entered) lock = same;
    lock.Release();
    waiter.join();
}

TEST(HMutexLock, ReleasesWhenAnExceptionPasses) {
    const HMutex mutex;
    try {
        const HMutexLock lock(&mutex);
        throw std::runtime_error("out");
    } catch (const std::runtime_error&) {
    }
    EXPECT_TRUE(FreeForOthers(mutex));
}

}  // namespace
