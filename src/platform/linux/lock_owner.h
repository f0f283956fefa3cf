// The numbers that identify owners of locks. They are even, and never reused: the system reuses its thread
// identifiers, so the lock of a killed owner would seem to belong to a later thread.
#ifndef ZANBASE_PLATFORM_LINUX_LOCK_OWNER_H
#define ZANBASE_PLATFORM_LINUX_LOCK_OWNER_H

#include "platform/linux/build.h"

using LockOwnerNumber = unsigned long long;  // of a thread never 0

// The calling thread's number; 0: it has none yet.
extern ZANBASE_FAST_THREAD_LOCAL LockOwnerNumber tnLockOwner;

// Gives the calling thread its number and returns it.
LockOwnerNumber NumberLockOwner() noexcept;

inline LockOwnerNumber ThisLockOwner() noexcept {
    return __builtin_expect(tnLockOwner != 0, 1) ? tnLockOwner : NumberLockOwner();
}

#endif
