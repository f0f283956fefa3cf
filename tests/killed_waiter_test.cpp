// A thread that is ended while it waits takes nothing from the others that wait for the same.
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <functional>
#include <thread>

#include "support/blocked_thread.h"
#include "support/runner.h"
#include "zanbase/condition_variable.h"
#include "zanbase/semaphore.h"

namespace {

using Action = std::function<void()>;

class Waiter {
public:
    explicit Waiter(const Action& waits)
        : mRunner([&] {
              mNumber = HThread::GetCurrentThreadId();
              waits();
          }) {
        mRunner.Start(true);
        while (mNumber == 0) std::this_thread::yield();
        AwaitSleepOf(mNumber);
    }
    ~Waiter() { mRunner.Wait(); }
    void Kill() { mRunner.Kill(); }

private:
    std::atomic<unsigned long long> mNumber{0};
    Runner mRunner;
};

// Three wait; the first is ended asleep, or every other time, if `beside`, while one of them is served. What was
// meant for it may be gone with it, but two more servings must do for the other two. Then all is `cleared`.
void ExpectOthersServed(const Action& waits, const Action& serve, const Action& clear, bool beside) {
    for (int round = 0; round < 100; ++round) {
        {
            std::array<Waiter, 3> waiters{Waiter(waits), Waiter(waits), Waiter(waits)};
            std::thread server([&] {
                if (beside && round % 2 == 0) serve();
            });
            waiters[0].Kill();
            server.join();
            for (int other = 1; other < 3; ++other) serve();
        }
        clear();
    }
}

TEST(KilledWaiter, LeavesASemaphoreToTheOthers) {
    HSemaphore semaphore(0);
    const Action all_waits[] = {
        [&] { semaphore.Lock(); },
        [&] { EXPECT_TRUE(semaphore.TryLock(1e6)); },
        [&] { const HSemaphoreLock lock(&semaphore); },
    };
    const Action clear = [&] {
        while (semaphore.TryLock(0.0)) continue;
    };
    for (const Action& waits : all_waits)
        ExpectOthersServed(
            waits, [&] { semaphore.Unlock(); }, clear, true);
}

// Killed while it is served, the waiter could hold the mutex, which would stay held.
TEST(KilledWaiter, LeavesAConditionToTheOthers) {
    const HMutex mutex;
    const HCondVar condition;
    int items = 0;  // guarded by mutex
    for (const double limit : {1e6, 1e300}) {
        const Action waits = [&] {
            const HMutexLock lock(&mutex);
            while (items == 0) EXPECT_TRUE(condition.TryWait(mutex, limit));
            --items;
        };
        const Action serve = [&] {
            const HMutexLock lock(&mutex);
            ++items;
            condition.Signal();
        };
        ExpectOthersServed(
            waits, serve, [] {}, false);
    }
}

TEST(KilledWaiter, LeavesAMutexToTheOthers) {
    const HMutex mutex;
    for (int round = 0; round < 100; ++round) {
        const Action waits = [&] { const HMutexLock lock(&mutex); };
        HMutexLock lock(&mutex);
        std::array<Waiter, 3> waiters{Waiter(waits), Waiter(waits), Waiter(waits)};
        waiters[0].Kill();
        lock.Release();
    }
}

}  // namespace
