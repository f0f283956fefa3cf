// Who holds a lock, for the assertions of the lockables.
#include "zanbase/adapters/lockable.h"

#include <cstdio>
#include <cstdlib>

#include "locks/read_write_steps.h"
#include "platform/lock.h"

bool HLockOwner::Owns(const HMutex& mutex) { return OwnsLock(mutex.mpoCriticalSection); }

bool HLockOwner::Writes(const HReadPrefMutex& mutex) { return HReadWriteSteps::IsWriter(mutex, LockOwner()); }
bool HLockOwner::Writes(const HWritePrefMutex& mutex) {
    return HReadWriteSteps::IsWriter(mutex, LockOwner());
}
bool HLockOwner::Reads(const HReadPrefMutex& mutex) { return HReadWriteSteps::IsReader(mutex, LockOwner()); }
bool HLockOwner::Reads(const HWritePrefMutex& mutex) { return HReadWriteSteps::IsReader(mutex, LockOwner()); }

void HLockOwner::Require(bool is_held) {
    if (is_held) return;
    std::fputs("A lock is asserted to be held by a thread that does not hold it\n", stderr);
    std::abort();
}
