// The semaphore of this system: the algorithm of futex_semaphore.h in a block of its own.
#include "platform/semaphore.h"

#include <algorithm>

#include "platform/linux/futex_semaphore.h"
#include "platform/linux/futex_system.h"
#include "platform/race_detector.h"

struct HNativeSemaphore : FutexSemaphore<FutexSystem> {
    using FutexSemaphore::FutexSemaphore;
};
static_assert(kMaxUnits == HNativeSemaphore::kMost);

HNativeSemaphore* NewSemaphore(unsigned int count) {
    return new HNativeSemaphore(std::min(count, kMaxUnits));
}

void DeleteSemaphore(HNativeSemaphore* semaphore) noexcept { delete semaphore; }

namespace {

bool Acquire(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept {
    if (limit_ms == 0) return semaphore->TryAcquire();
    if (limit_ms == kForever) return semaphore->Acquire(nullptr);
    if (semaphore->TryAcquire()) return true;
    const timespec deadline = DeadlineIn(limit_ms);
    return semaphore->Acquire(&deadline);
}

// A race detector is shown no lock, because a unit has no owner.
[[gnu::cold, gnu::noinline]] bool AcquireWatched(HNativeSemaphore* semaphore,
                                                 unsigned int limit_ms) noexcept {
    const bool acquired = Acquire(semaphore, limit_ms);
    if (acquired) NoteAcquire(semaphore);
    return acquired;
}

// The note comes first: the thread that acquires the unit may destroy the semaphore.
[[gnu::cold, gnu::noinline]] void ReleaseWatched(HNativeSemaphore* semaphore) noexcept {
    NoteRelease(semaphore);
    semaphore->Release();
}

}  // namespace

bool AcquireUnit(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept {
    return IsThreadSanitizerOn() ? AcquireWatched(semaphore, limit_ms) : Acquire(semaphore, limit_ms);
}

void ReleaseUnit(HNativeSemaphore* semaphore) noexcept {
    if (IsThreadSanitizerOn()) return ReleaseWatched(semaphore);
    semaphore->Release();
}
