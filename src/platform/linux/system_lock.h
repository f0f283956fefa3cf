// The lock inside an HNativeLock.
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

#endif
