// Contract: the condition under HCondVar, waited for with a lock of lock.h.
#ifndef ZANBASE_PLATFORM_CONDITION_H
#define ZANBASE_PLATFORM_CONDITION_H

#include "platform/lock.h"

// Storage for one condition; may lie in any block of the heap. There is nothing to close.
struct NativeCondition {
    alignas(8) unsigned char storage[16];
};

// A limit that never runs out.
constexpr unsigned int kForever = 0xFFFFFFFF;

// Makes the condition ready. Can't fail.
void OpenCondition(NativeCondition* condition) noexcept;

// Gives back one level of `lock`, sleeps once until a wake-up or for `limit_ms`, and takes the lock again.
// The caller owns the lock exactly once; if it owns it more than once, others stay out while it sleeps. True
// if it was woken, which may also be for no reason; false if the limit ran out. A limit of 0 doesn't sleep,
// takes nobody's wake-up and gives false. A waiter that was ended by EndThread may hold up later waiters on
// some systems; where it doesn't, the back end says so.
bool SleepOn(NativeCondition* condition, NativeLock* lock, unsigned int limit_ms) noexcept;

// Wakes one of the threads that sleep now, or all of them; nothing is kept if none does. A thread sleeps from
// the moment its lock is free for others.
void WakeOne(NativeCondition* condition) noexcept;
void WakeAll(NativeCondition* condition) noexcept;

#endif
