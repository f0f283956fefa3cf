// The re-entrant lock of this system: the algorithm of futex_lock.h in the caller's storage.
#include "platform/lock.h"

#include "platform/linux/lock_owner.h"
#include "platform/linux/race_detector.h"
#include "platform/linux/system_lock.h"
#include "platform/race_detector.h"

namespace {

// The operations as the thread sanitizer is shown them. All locks are shown, also those of the library's own
// tables: they order threads as well. The block mutex alone is not (thread_block.cpp).
//
// BeginAcquire finds potential deadlocks, so a deadlock is reported before the thread waits for ever. From
// there to EndAcquire the tool would ignore all that the thread does. But a waiting thread may run a signal
// handler, or be killed and never reach EndAcquire; the two "divert" calls end that state for the wait.
void BeginAcquire(HNativeLock* lock, unsigned int flags) noexcept {
    __tsan_mutex_pre_lock(lock, flags);
    __tsan_mutex_pre_divert(lock, 0);
}

void EndAcquire(HNativeLock* lock, unsigned int flags) noexcept {
    __tsan_mutex_post_divert(lock, 0);
    __tsan_mutex_post_lock(lock, flags, 0);
}

[[gnu::cold, gnu::noinline]] void AcquireWatched(HNativeLock* lock) noexcept {
    const CallerFrame caller(__builtin_return_address(0));
    BeginAcquire(lock, kTsanReentrant);
    In(lock).Acquire(ThisLockOwner());
    EndAcquire(lock, kTsanReentrant);
}

[[gnu::cold, gnu::noinline]] bool TryAcquireWatched(HNativeLock* lock) noexcept {
    const CallerFrame caller(__builtin_return_address(0));
    constexpr unsigned int kFlags = kTsanReentrant | kTsanTry;
    BeginAcquire(lock, kFlags);
    const bool acquired = In(lock).TryAcquire(ThisLockOwner());
    EndAcquire(lock, acquired ? kFlags : kFlags | kTsanTryFailed);
    return acquired;
}

// Shown before it happens: after the release the next owner may destroy the lock.
[[gnu::cold, gnu::noinline]] void ReleaseWatched(HNativeLock* lock) noexcept {
    __tsan_mutex_pre_unlock(lock, 0);
    __tsan_mutex_post_unlock(lock, 0);
    In(lock).Release(tnLockOwner);
}

}  // namespace

bool OwnsLock(const HNativeLock* lock) noexcept { return In(lock).IsOwnedBy(ThisLockOwner()); }

void InitLock(HNativeLock* lock) noexcept {
    new (lock->storage) SystemLock;
    if (!IsThreadSanitizerOn()) return;
    const CallerFrame caller(__builtin_return_address(0));
    __tsan_mutex_create(lock, kTsanReentrant);
}

// Not shown: the tool would report a lock whose owner was killed. It forgets a lock when its memory is freed.
void DestroyLock(HNativeLock*) noexcept {}

// Two calls of Acquire instead of Acquire(ThisLockOwner()): a call before the frequent path's own work would make
// that path save registers.
void AcquireLock(HNativeLock* lock) noexcept {
    if (IsThreadSanitizerOn()) return AcquireWatched(lock);
    if (__builtin_expect(tnLockOwner != 0, 1)) return In(lock).Acquire(tnLockOwner);
    In(lock).Acquire(NumberLockOwner());
}

bool TryAcquireLock(HNativeLock* lock) noexcept {
    if (IsThreadSanitizerOn()) return TryAcquireWatched(lock);
    return In(lock).TryAcquire(ThisLockOwner());
}

void ReleaseLock(HNativeLock* lock) noexcept {
    if (IsThreadSanitizerOn()) return ReleaseWatched(lock);
    In(lock).Release(tnLockOwner);
}
