// The lock inside a NativeLock, and the numbers by which locks know their owners.
#ifndef ZANBASE_PLATFORM_POSIX_SYSTEM_LOCK_H
#define ZANBASE_PLATFORM_POSIX_SYSTEM_LOCK_H

#include <new>

#include "platform/lock.h"
#include "platform/posix/futex_lock.h"
#include "platform/posix/futex_system.h"

using SystemLock = FutexLock<FutexSystem>;
static_assert(sizeof(SystemLock) <= sizeof(NativeLock::storage) &&
              alignof(SystemLock) <= alignof(NativeLock));

inline SystemLock& In(NativeLock* lock) noexcept {
    return *std::launder(reinterpret_cast<SystemLock*>(lock->storage));
}

extern ZANBASE_FAST_THREAD_LOCAL SystemLock::Thread tnLockThread;  // 0: no number yet
SystemLock::Thread NumberLockThread() noexcept;

inline SystemLock::Thread LockThread() noexcept {
    return __builtin_expect(tnLockThread != 0, 1) ? tnLockThread : NumberLockThread();
}

#endif
