// HCondVar with its mutex, and what a killed waiter of a semaphore leaves to the others.
#include "zanbase/condition_variable.h"

#include <gtest/gtest.h>

#include <atomic>
#include <deque>
#include <thread>

#include "support/blocked_thread.h"
#include "support/runner.h"
#include "zanbase/semaphore.h"

namespace {

TEST(HCondVar, ReleasesOneLevelWhileItWaits) {
    const HMutex mutex;
    const HCondVar condition;
    HMutexLock lock(&mutex);
    HMutexLock deeper(lock);
    std::atomic<bool> entered{false};
    std::thread other([&] {
        const HMutexLock mine(&mutex);
        entered = true;
        condition.Signal();
    });
    EXPECT_FALSE(condition.TryWait(mutex, 0.01));
    EXPECT_FALSE(entered);
    deeper.Release();
    while (!entered) EXPECT_TRUE(condition.TryWait(mutex, 1e9));
    EXPECT_FALSE(condition.TryWait(mutex, 0.0));
    lock.Release();
    other.join();
}

// Three threads wait for a unit. The first is killed, asleep or on a release, whose unit may be lost with it. Two more
// releases must serve the other two; otherwise this hangs.
TEST(HSemaphore, LosesNoUnitWithAKilledWaiter) {
    for (int round = 0; round < 200; ++round) {
        const HSemaphore semaphore(0);
        const double seconds = round < 100 ? 1e6 : 1e300;  // a wait with a deadline, and one without
        std::deque<Runner> waiters;
        for (int waiter = 0; waiter < 3; ++waiter) {
            std::atomic<unsigned long long> id{0};
            waiters.emplace_back([&] {
                id = HThread::GetCurrentThreadId();
                EXPECT_TRUE(semaphore.TryLock(seconds));
            });
            waiters.back().Start(true);
            while (id == 0) std::this_thread::yield();
            AwaitSleepOf(id);
        }
        if (round % 2 == 0) semaphore.Unlock();
        waiters[0].Kill();
        semaphore.Unlock();
        semaphore.Unlock();
        for (Runner& waiter : waiters) waiter.Wait();
    }
}

}  // namespace
