// HMutex and its holder; stress/all_stress.cpp runs them under many threads.
#include "zanbase/mutex.h"

#include <gtest/gtest.h>

#include <thread>

#include "support/holder_rules.h"

// One thread acquires two mutexes in both orders.
extern "C" const char* __tsan_default_options() { return "detect_deadlocks=0"; }

namespace {

bool IsFreeForOthers(const HMutex& mutex) {
    bool is_free = false;
    std::thread other([&] {
        is_free = mutex.TryLock();
        if (is_free) mutex.Unlock();
    });
    other.join();
    return is_free;
}

// The levels that this thread holds, all released and acquired again.
int LevelsOf(const HMutex& mutex) {
    if (IsFreeForOthers(mutex)) return 0;
    mutex.Unlock();
    const int levels = 1 + LevelsOf(mutex);
    mutex.Lock();
    return levels;
}

TEST(HMutexLock, ReleasesBeforeItAcquires) {
    const HMutex first;
    const HMutex second;
    ExpectHolderRules<HMutexLock>(first, second, LevelsOf);
}

}  // namespace
