// The semaphore of this system: a kernel object, which survives the end of its waiters.
#include "platform/semaphore.h"

#include <algorithm>
#include <new>

#include "platform/windows/system.h"

namespace {
HANDLE HandleOf(HNativeSemaphore* semaphore) noexcept { return semaphore; }
}  // namespace

HNativeSemaphore* NewSemaphore(unsigned int count) {
    const auto units = static_cast<LONG>(std::min(count, kMaxUnits));
    const HANDLE handle = CreateSemaphoreA(nullptr, units, kMaxUnits, nullptr);
    if (handle == nullptr) throw std::bad_alloc();
    return static_cast<HNativeSemaphore*>(handle);
}

void DeleteSemaphore(HNativeSemaphore* semaphore) noexcept { CloseHandle(HandleOf(semaphore)); }

bool AcquireUnit(HNativeSemaphore* semaphore, unsigned int limit_ms) noexcept {
    return WaitForSingleObject(HandleOf(semaphore), limit_ms) == WAIT_OBJECT_0;
}

void ReleaseUnit(HNativeSemaphore* semaphore) noexcept { ReleaseSemaphore(HandleOf(semaphore), 1, nullptr); }
