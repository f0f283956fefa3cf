// The re-entrant lock of this system: a critical section. It refers to the stacks of its waiters.
#include "platform/windows/critical_section.h"

static_assert(sizeof(CRITICAL_SECTION) <= sizeof(HNativeLock) &&
              alignof(CRITICAL_SECTION) <= alignof(HNativeLock));

void InitLock(HNativeLock* lock) noexcept { InitializeCriticalSection(In(lock)); }

void DestroyLock(HNativeLock* lock) noexcept { DeleteCriticalSection(In(lock)); }

void AcquireLock(HNativeLock* lock) noexcept { EnterCriticalSection(In(lock)); }

bool TryAcquireLock(HNativeLock* lock) noexcept { return TryEnterCriticalSection(In(lock)) != 0; }

void ReleaseLock(HNativeLock* lock) noexcept { LeaveCriticalSection(In(lock)); }

// The owner's own number is in the section for as long as it owns it, and no other thread writes that number.
bool OwnsLock(const HNativeLock* lock) noexcept {
    const auto section = reinterpret_cast<const CRITICAL_SECTION*>(lock->storage);
    return reinterpret_cast<ULONG_PTR>(section->OwningThread) == GetCurrentThreadId();
}

unsigned long long LockOwner() noexcept { return GetCurrentThreadId(); }
