// Re-entrancy and the orders of the scoped holder; locks_stress.cpp shows that one thread is in at a time.
#include "zanbase/mutex.h"

#include <gtest/gtest.h>

#include <thread>

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

TEST(HMutexLock, HoldsOneLevelUntilReleased) {
    const HMutex first, second;
    const HMutexLock none;
    EXPECT_EQ(none.GetMutex(), nullptr);
    HMutexLock lock = &first;
    HMutexLock copy = lock;
    EXPECT_TRUE(first.TryLock());
    first.Unlock();
    lock.Release();
    lock.Release();
    EXPECT_EQ(lock.GetMutex(), nullptr);
    EXPECT_EQ(copy.GetMutex(), &first);
    EXPECT_FALSE(FreeForOthers(first));
    copy.Reset(&second);
    EXPECT_TRUE(FreeForOthers(first));
    EXPECT_FALSE(FreeForOthers(second));
    copy = none;
    EXPECT_EQ(copy.GetMutex(), nullptr);
    EXPECT_TRUE(FreeForOthers(second));
    try {
        const HMutexLock passed_by(&first);
        throw 1;
    } catch (int) {
    }
    EXPECT_TRUE(FreeForOthers(first));
}

// A thread that waits for the mutex gets in while its only level is let go and taken again.
TEST(HMutexLock, LetsAWaiterInBetweenOnSelfAssignmentAndReset) {
    for (const bool by_reset : {false, true}) {
        const HMutex mutex;
        bool entered = false;  // guarded by mutex
        HMutexLock lock(&mutex);
        std::thread waiter([&] {
            const HMutexLock mine(&mutex);
            entered = true;
        });
        HMutexLock& same = lock;
        while (!entered) by_reset ? lock.Reset(&mutex) : static_cast<void>(lock = same);
        lock.Release();
        waiter.join();
    }
}

}  // namespace
