// Contract: the condition under HCondVar, waited for with a lock of lock.h.
#ifndef ZANBASE_PLATFORM_CONDITION_H
#define ZANBASE_PLATFORM_CONDITION_H

#include "platform/lock.h"
#include "platform/wait_limit.h"

// Storage for one condition, in any memory. There is nothing to destroy.
struct HNativeCondition {
    alignas(8) unsigned char storage[16];
};

// Makes the condition ready. Can't fail.
void InitCondition(HNativeCondition* condition) noexcept;

// Releases one level of `lock`, sleeps once until a wake-up or for `limit_ms`, and acquires the lock again.
// True if it was woken; spurious wake-ups are possible. False on a timeout. A limit of 0 does not sleep,
// consumes no wake-up and returns false. A waiter must not be killed by KillThread, unless the back end says that it
// may: the condition may refer to its stack. Thread-safe. Requires: the caller owns the lock exactly once; if it owns
// it more often, the lock stays owned during the sleep.
bool WaitOnCondition(HNativeCondition* condition, HNativeLock* lock, unsigned int limit_ms) noexcept;

// Wakes one of the threads that sleep now, or all of them; no effect if none does. A thread counts as asleep
// from the moment it has released its lock. Thread-safe.
void SignalCondition(HNativeCondition* condition) noexcept;
void BroadcastCondition(HNativeCondition* condition) noexcept;

#endif
