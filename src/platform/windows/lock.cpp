// The re-entrant lock of this system: a critical section. It refers to the stacks of its waiters.
#include "platform/windows/critical_section.h"

static_assert(sizeof(CRITICAL_SECTION) <= sizeof(HNativeLock) &&
              alignof(CRITICAL_SECTION) <= alignof(HNativeLock));

void InitLock(HNativeLock* lock) noexcept { InitializeCriticalSection(In(lock)); }

void DestroyLock(HNativeLock* lock) noexcept { DeleteCriticalSection(In(lock)); }

void AcquireLock(HNativeLock* lock) noexcept { EnterCriticalSection(In(lock)); }

bool TryAcquireLock(HNativeLock* lock) noexcept { return TryEnterCriticalSection(In(lock)) != 0; }

void ReleaseLock(HNativeLock* lock) noexcept { LeaveCriticalSection(In(lock)); }

unsigned long long LockOwner() noexcept { return GetCurrentThreadId(); }
