// The critical section in a lock's storage, for the lock and for the condition that waits with it.
#ifndef ZANBASE_PLATFORM_WINDOWS_CRITICAL_SECTION_H
#define ZANBASE_PLATFORM_WINDOWS_CRITICAL_SECTION_H

#include "platform/lock.h"
#include "platform/windows/system.h"

inline CRITICAL_SECTION* In(HNativeLock* lock) noexcept {
    return reinterpret_cast<CRITICAL_SECTION*>(lock->storage);
}

#endif
