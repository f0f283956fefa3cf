// The semaphore of this system: the algorithm of futex_semaphore.h in a block of its own.
#include "platform/semaphore.h"

#include <algorithm>

#include "platform/posix/futex_semaphore.h"
#include "platform/posix/futex_system.h"

struct NativeSemaphore : FutexSemaphore<FutexSystem> {
    using FutexSemaphore::FutexSemaphore;
};
static_assert(kMostUnits == NativeSemaphore::kMost);

NativeSemaphore* NewSemaphore(unsigned int count) { return new NativeSemaphore(std::min(count, kMostUnits)); }

void EndSemaphore(NativeSemaphore* semaphore) noexcept { delete semaphore; }

bool TakeUnit(NativeSemaphore* semaphore, unsigned int limit_ms) noexcept {
    if (limit_ms == 0) return semaphore->TryTake();
    if (limit_ms == kForever) return semaphore->Take(nullptr);
    if (semaphore->TryTake()) return true;
    const timespec deadline = DeadlineIn(limit_ms);
    return semaphore->Take(&deadline);
}

void GiveUnit(NativeSemaphore* semaphore) noexcept { semaphore->Give(); }
