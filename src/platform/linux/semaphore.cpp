// The semaphore of this system: the algorithm of futex_semaphore.h in a block of its own.
#include "platform/semaphore.h"

#include <algorithm>

#include "platform/linux/futex_semaphore.h"
#include "platform/linux/futex_system.h"

struct HNativeSemaphore : FutexSemaphore<FutexSystem> {
    using FutexSemaphore::FutexSemaphore;
};
static_assert(kMaxUnits == HNativeSemaphore::kMost);

HNativeSemaphore* NewSemaphore(unsigned int count) {
    return new HNativeSemaphore(std::min(count, kMaxUnits));
}

void DeleteSemaphore(HNativeSemaphore* semaphore) noexcept { delete semaphore; }

bool AcquireUnit(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept {
    if (limit_ms == 0) return semaphore->TryAcquire();
    if (limit_ms == kForever) return semaphore->Acquire(nullptr);
    if (semaphore->TryAcquire()) return true;
    const timespec deadline = DeadlineIn(limit_ms);
    return semaphore->Acquire(&deadline);
}

void ReleaseUnit(HNativeSemaphore* semaphore) noexcept { semaphore->Release(); }
