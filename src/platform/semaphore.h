// Contract: the counting semaphore under HSemaphore.
#ifndef ZANBASE_PLATFORM_SEMAPHORE_H
#define ZANBASE_PLATFORM_SEMAPHORE_H

#include "platform/wait_limit.h"

struct HNativeSemaphore;

constexpr unsigned int kMaxUnits = 2147483647;

// A semaphore with `count` units, at most kMaxUnits; throws std::bad_alloc if there is no memory for it.
HNativeSemaphore* NewSemaphore(unsigned int count);

// Ends a semaphore that nobody waits for.
void DeleteSemaphore(HNativeSemaphore* semaphore) noexcept;

// Takes one unit, waiting up to `limit_ms` (kForever: without end; 0: not at all) for one; false if there was
// none. A semaphore stays whole after one of its waiters was ended by KillThread: no unit is lost, and the
// others are served.
bool AcquireUnit(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept;

// Adds a unit, which any thread may do; at kMaxUnits it has no effect. Whoever takes that unit may end the
// semaphore.
void ReleaseUnit(HNativeSemaphore* semaphore) noexcept;

#endif
