// Contract: the condition under HCondVar, waited for with a lock of lock.h.
#ifndef ZANBASE_PLATFORM_CONDITION_H
#define ZANBASE_PLATFORM_CONDITION_H

#include "platform/lock.h"
#include "platform/wait_limit.h"

// Storage for one condition; may lie in any block of the heap. There is nothing to close.
struct HNativeCondition {
    alignas(8) unsigned char storage[16];
};

// Makes the condition ready. Can't fail.
void InitCondition(HNativeCondition* condition) noexcept;

// Gives back one level of `lock`, sleeps once until a wake-up or for `limit_ms`, and takes the lock again.
// The caller owns the lock exactly once; if it owns it more than once, others stay out while it sleeps. True
// if it was woken, which may also be for no reason; false if the limit ran out. A limit of 0 doesn't sleep,
// takes nobody's wake-up and gives false. A waiter that was ended by KillThread may hold up later waiters on
// some systems; where it doesn't, the back end says so.
bool WaitOnCondition(HNativeCondition* condition, HNativeLock* lock, unsigned int limit_ms) noexcept;

// Wakes one of the threads that sleep now, or all of them; nothing is kept if none does. A thread sleeps from
// the moment its lock is free for others.
void SignalCondition(HNativeCondition* condition) noexcept;
void BroadcastCondition(HNativeCondition* condition) noexcept;

#endif
