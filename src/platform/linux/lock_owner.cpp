// The count of the numbers that identify owners of locks.
#include "platform/linux/lock_owner.h"

#include <atomic>

#include "platform/lock.h"

namespace {

std::atomic<LockOwnerNumber> gnLastOwner{0};  // even

}  // namespace

ZANBASE_FAST_THREAD_LOCAL LockOwnerNumber tnLockOwner = 0;

LockOwnerNumber NumberLockOwner() noexcept {
    tnLockOwner = gnLastOwner.fetch_add(2, std::memory_order_relaxed) + 2;
    return tnLockOwner;
}

unsigned long long LockOwner() noexcept { return ThisLockOwner(); }
