// The semaphore of this system: a kernel object, which survives the end of its waiters.
#include "platform/semaphore.h"

#include <algorithm>
#include <new>

#include "platform/windows/deadline.h"

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
    const Deadline deadline(limit_ms);
    DWORD result = WaitForSingleObject(HandleOf(semaphore), limit_ms);
    while (result == WAIT_TIMEOUT) {
        const DWORD left = deadline.MillisecondsLeft();
        if (left == 0) break;
        result = WaitForSingleObject(HandleOf(semaphore), left);
    }
    return result == WAIT_OBJECT_0;
}

void ReleaseUnit(HNativeSemaphore* semaphore) noexcept { ReleaseSemaphore(HandleOf(semaphore), 1, nullptr); }
