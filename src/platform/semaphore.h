// Contract: the counting semaphore under HSemaphore.
#ifndef ZANBASE_PLATFORM_SEMAPHORE_H
#define ZANBASE_PLATFORM_SEMAPHORE_H

#include "platform/wait_limit.h"

struct HNativeSemaphore;

constexpr unsigned int kMaxUnits = 2147483647;

// Makes a semaphore with `count` units; more than kMaxUnits count as that. Throws std::bad_alloc if memory is
// exhausted.
HNativeSemaphore* NewSemaphore(unsigned int count);

// Destroys a semaphore. Requires: no thread waits for it.
void DeleteSemaphore(HNativeSemaphore* semaphore) noexcept;

// Acquires one unit; waits for it up to `limit_ms` (kForever: without a timeout; 0: not at all). False if
// there was none. A waiter that is killed by KillThread consumes no unit and no wake-up of the others.
// Thread-safe.
bool AcquireUnit(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept;

// Releases one unit; no effect at kMaxUnits. The thread that acquires that unit may destroy the semaphore
// while this call is still returning. Thread-safe.
void ReleaseUnit(HNativeSemaphore* semaphore) noexcept;

#endif
