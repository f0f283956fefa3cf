// What the class adds to the platform's condition, which platform_test.cpp tests: its block, its limit and
// the mutex around a wait.
#include "zanbase/condition_variable.h"

#include <gtest/gtest.h>

#include <atomic>
#include <new>
#include <thread>

namespace {
thread_local bool malloc_fails = false;
}

extern "C" {
void* __real_malloc(std::size_t size);
void* __wrap_malloc(std::size_t size) { return malloc_fails ? nullptr : __real_malloc(size); }
}

namespace {

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
    std::thread([&] { EXPECT_FALSE(mutex.TryLock()); }).join();
    lock.Release();
    other.join();
}

}  // namespace
