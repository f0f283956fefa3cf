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

unsigned long long LockOwner() noexcept { return LockThread(); }

void InitLock(HNativeLock* lock) noexcept { new (lock->storage) SystemLock; }

void DestroyLock(HNativeLock*) noexcept {}

// Two calls of Acquire instead of Acquire(LockThread()): a call before the frequent path's own work would make
// that path save registers.
void AcquireLock(HNativeLock* lock) noexcept {
    if (__builtin_expect(tnLockThread != 0, 1)) return In(lock).Acquire(tnLockThread);
    In(lock).Acquire(NumberLockThread());
}

bool TryAcquireLock(HNativeLock* lock) noexcept { return In(lock).TryAcquire(LockThread()); }

void ReleaseLock(HNativeLock* lock) noexcept { In(lock).Release(); }
