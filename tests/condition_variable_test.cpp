// Wake-ups, limits and the mutex around a wait.
#include "zanbase/condition_variable.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <new>
#include <thread>
#include <vector>

namespace {
thread_local bool malloc_fails = false;
}

extern "C" {
void* __real_malloc(std::size_t size);
void* __wrap_malloc(std::size_t size) { return malloc_fails ? nullptr : __real_malloc(size); }
}

namespace {

TEST(HCondVar, ThrowsIfItsBlockCannotBeHad) {
    malloc_fails = true;
    bool thrown = false;
    try {
        const HCondVar condition;
    } catch (const std::bad_alloc&) {
        thrown = true;
    }
    malloc_fails = false;
    EXPECT_TRUE(thrown);
}

TEST(HCondVar, GivesUpAtTheLimitWithTheMutexHeld) {
    const HMutex mutex;
    const HCondVar condition;
    condition.Signal();  // for nobody, and not kept
    condition.Broadcast();
    const HMutexLock lock(&mutex);
    for (const double seconds : {0.02, 0.0, -1.0}) {
        const auto start = std::chrono::steady_clock::now();
        EXPECT_FALSE(condition.TryWait(mutex, seconds));
        EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::duration<double>(seconds));
        std::thread([&] { EXPECT_FALSE(mutex.TryLock()); }).join();
    }
}

// Waiters that each take one of the items; how they are woken is the case.
class Waiters {
public:
    explicit Waiters(int count) {
        for (int i = 0; i < count; ++i) mThreads.emplace_back([this, i] { TakeOne(i % 2 == 0); });
        while (Locked([this] { return mWaiting; }) != count) std::this_thread::yield();
    }
    ~Waiters() {
        for (std::thread& thread : mThreads) thread.join();
    }
    void Add(int items) {
        Locked([&] { return mItems += items; });
    }
    int Done() {
        return Locked([this] { return mDone; });
    }

    const HCondVar changed;

private:
    template <class Body>
    int Locked(Body body) {
        const HMutexLock lock(&mMutex);
        return body();
    }
    void TakeOne(bool limited) {
        const HMutexLock lock(&mMutex);
        ++mWaiting;
        while (mItems == 0) {
            if (limited) {
                EXPECT_TRUE(changed.TryWait(mMutex, 1e9));
            } else {
                changed.Wait(mMutex);
            }
        }
        --mItems;
        ++mDone;
    }

    HMutex mMutex;
    int mItems = 0, mWaiting = 0, mDone = 0;  // guarded by mMutex
    std::vector<std::thread> mThreads;
};

TEST(HCondVar, WakesOneWithEachSignal) {
    Waiters waiters(4);
    for (int done = 0; done < 4; ++done) {
        waiters.Add(1);
        waiters.changed.Signal();
        while (waiters.Done() == done) std::this_thread::yield();
    }
}

TEST(HCondVar, WakesAllWithABroadcast) {
    Waiters waiters(4);
    waiters.Add(4);
    waiters.changed.Broadcast();
}

TEST(HCondVar, GivesBackOneLevelOnly) {
    const HMutex mutex;
    const HCondVar condition;
    HMutexLock lock(&mutex);
    HMutexLock deeper = lock;
    std::atomic<bool> entered{false};
    std::thread other([&] {
        const HMutexLock mine(&mutex);
        entered = true;
    });
    EXPECT_FALSE(condition.TryWait(mutex, 0.01));
    EXPECT_FALSE(entered);
    deeper.Release();
    while (!entered) static_cast<void>(condition.TryWait(mutex, 0.0));
    lock.Release();
    other.join();
}

}  // namespace
