// Contract: the counting semaphore under HSemaphore.
#ifndef ZANBASE_PLATFORM_SEMAPHORE_H
#define ZANBASE_PLATFORM_SEMAPHORE_H

#include "platform/condition.h"  // kForever

struct NativeSemaphore;

constexpr unsigned int kMostUnits = 2147483647;

// A semaphore with `count` units, at most kMostUnits; throws std::bad_alloc if there is no memory for it.
NativeSemaphore* NewSemaphore(unsigned int count);

// Ends a semaphore that nobody waits for.
void EndSemaphore(NativeSemaphore* semaphore) noexcept;

// Takes one unit, waiting up to `limit_ms` (kForever: without end; 0: not at all) for one; false if there was
// none. A semaphore stays whole after one of its waiters was ended by EndThread: no unit is lost, and the
// others are served.
bool TakeUnit(NativeSemaphore* semaphore, unsigned int limit_ms) noexcept;

// Adds a unit, which any thread may do; at kMostUnits it has no effect. Whoever takes that unit may end the
// semaphore.
void GiveUnit(NativeSemaphore* semaphore) noexcept;

#endif
