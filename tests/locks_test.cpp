// Re-entrancy, times, the orders of the scoped holders, and waiters that are ended; exclusion is the stress
// program's, units and limits are the platform's (platform_test.cpp).
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cmath>
#include <functional>
#include <new>
#include <thread>

#include "locks/milliseconds.h"
#include "support/blocked_thread.h"
#include "support/runner.h"
#include "zanbase/condition_variable.h"
#include "zanbase/semaphore.h"

namespace {
thread_local bool malloc_fails = false;
}

extern "C" {
void* __real_malloc(std::size_t size);
void* __wrap_malloc(std::size_t size) { return malloc_fails ? nullptr : __real_malloc(size); }
}

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

// The units that nobody holds.
int FreeUnits(const HSemaphore& semaphore) {
    int units = 0;
    while (semaphore.TryLock(0.0)) ++units;
    for (int unit = 0; unit < units; ++unit) semaphore.Unlock();
    return units;
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

TEST(HCondVar, ThrowsIfItsBlockCannotBeHad) {
    bool thrown = false;
    malloc_fails = true;
    try {
        const HCondVar condition;
    } catch (const std::bad_alloc&) {
        thrown = true;
    }
    malloc_fails = false;
    EXPECT_TRUE(thrown);
}

TEST(HCondVar, GivesBackOneLevelForTheLengthOfAWait) {
    const HMutex mutex;
    const HCondVar condition;
    HMutexLock lock(&mutex);
    HMutexLock deeper = lock;
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
    EXPECT_FALSE(FreeForOthers(mutex));
    lock.Release();
    other.join();
}

TEST(MillisecondsIn, CutsAndNeverLeavesTheRange) {
    const struct {
        double seconds;
        unsigned int milliseconds;
    } cases[] = {{0.0009, 0},          {1.9999, 1999}, {4294967.0, 4294967000}, {4294967.5, kForever},
                 {HUGE_VAL, kForever}, {-0.5, 0},      {-HUGE_VAL, 0},          {std::nan(""), 0}};
    for (const auto& each : cases) EXPECT_EQ(MillisecondsIn(each.seconds), each.milliseconds) << each.seconds;
}

TEST(HSemaphoreLock, HoldsOneUnitAndGivesItBackBeforeItTakes) {
    EXPECT_EQ(FreeUnits(HSemaphore()), 1);
    HSemaphore first(1), second(1);
    first.Unlock();  // by one who has taken none
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

// Three wait; the first is ended, asleep or, if `beside`, while one of them is served. What was meant for it may
// be gone with it, but two more servings must do for the other two.
void ExpectOthersServed(const Action& waits, const Action& serve, bool beside = false) {
    std::array<Waiter, 3> waiters{Waiter(waits), Waiter(waits), Waiter(waits)};
    std::thread server([&] {
        if (beside) serve();
    });
    waiters[0].Kill();
    server.join();
    for (int other = 1; other < 3; ++other) serve();
}

// Killed while it is served, a waiter of the condition could hold the mutex, which would stay held.
TEST(KilledWaiter, LeavesSemaphoreConditionAndMutexToTheOthers) {
    for (int round = 0; round < 100; ++round) {
        const double limit = round % 3 == 0 ? 1e6 : 1e300;
        HSemaphore semaphore(0);
        const Action take = [&] { EXPECT_TRUE(semaphore.TryLock(limit)); };
        ExpectOthersServed(
            take, [&] { semaphore.Unlock(); }, round % 2 == 0);
        const HMutex mutex;
        const HCondVar condition;
        int items = 0;  // guarded by mutex
        const Action take_item = [&] {
            const HMutexLock lock(&mutex);
            while (items == 0) EXPECT_TRUE(condition.TryWait(mutex, limit));
            --items;
        };
        const Action add_item = [&] {
            const HMutexLock lock(&mutex);
            ++items;
            condition.Signal();
        };
        ExpectOthersServed(take_item, add_item);
        HMutexLock lock(&mutex);
        const Action take_mutex = [&] { const HMutexLock mine(&mutex); };
        ExpectOthersServed(take_mutex, [&] { lock.Release(); });
    }
}

}  // namespace
