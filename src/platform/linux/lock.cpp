// The re-entrant lock of this system: the algorithm of futex_lock.h in the caller's storage.
#include "platform/lock.h"

#include "platform/linux/system_lock.h"

namespace {
std::atomic<SystemLock::Thread> gnLastThread{0};
}  // namespace

ZANBASE_FAST_THREAD_LOCAL SystemLock::Thread tnLockThread = 0;

SystemLock::Thread NumberLockThread() noexcept {
    tnLockThread = gnLastThread.fetch_add(1, std::memory_order_relaxed) + 1;
    return tnLockThread;
}

void InitLock(HNativeLock* lock) noexcept {
    AllowRestartableStores();
    new (lock->storage) SystemLock;
}

void DestroyLock(HNativeLock*) noexcept {}

void AcquireLock(HNativeLock* lock) noexcept { In(lock).Take(LockThread()); }

bool TryAcquireLock(HNativeLock* lock) noexcept { return In(lock).TryTake(LockThread()); }

void ReleaseLock(HNativeLock* lock) noexcept { In(lock).Give(); }
