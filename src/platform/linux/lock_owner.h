// The lock inside a HNativeLock, and the numbers that identify owners of locks.
#ifndef ZANBASE_PLATFORM_LINUX_SYSTEM_LOCK_H
#define ZANBASE_PLATFORM_LINUX_SYSTEM_LOCK_H

#include <new>

#include "platform/linux/futex_lock.h"
#include "platform/linux/futex_system.h"
#include "platform/lock.h"

using SystemLock = FutexLock<FutexSystem>;
static_assert(sizeof(SystemLock) <= sizeof(HNativeLock::storage) &&
              alignof(SystemLock) <= alignof(HNativeLock));

inline SystemLock& In(HNativeLock* lock) noexcept {
    return *std::launder(reinterpret_cast<SystemLock*>(lock->storage));
}

inline const SystemLock& In(const HNativeLock* lock) noexcept {
    return *std::launder(reinterpret_cast<const SystemLock*>(lock->storage));
}

// The calling thread's number as an owner of locks; 0: it has none yet. Numbers are even and never
// reused.
extern ZANBASE_FAST_THREAD_LOCAL SystemLock::Thread tnLockThread;

// Gives the calling thread its number.
SystemLock::Thread NumberLockThread() noexcept;

inline SystemLock::Thread LockThread() noexcept {
    return __builtin_expect(tnLockThread != 0, 1) ? tnLockThread : NumberLockThread();
}

#endif
