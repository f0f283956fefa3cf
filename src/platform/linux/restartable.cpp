// Whether there are restartable stores, and the barrier that breaks them.
#include "platform/linux/restartable.h"

#ifdef ZANBASE_RESTARTABLE_STORES

#include <cerrno>

#include <linux/membarrier.h>

std::atomic<std::ptrdiff_t> gnRestartableArea{0};

namespace {

std::atomic<bool> gbDecided{false};

bool Barrier(int command) noexcept { return syscall(SYS_membarrier, command, 0, 0) == 0; }

}  // namespace

void AllowRestartableStores() noexcept {
    // Threads that decide at the same time come to the same result.
    if (gbDecided.load(std::memory_order_acquire)) return;
    if (__rseq_size != 0 && Barrier(MEMBARRIER_CMD_REGISTER_PRIVATE_EXPEDITED_RSEQ))
        gnRestartableArea.store(__rseq_offset, std::memory_order_relaxed);
    gbDecided.store(true, std::memory_order_release);
}

bool BreakStores() noexcept {
    if (gnRestartableArea.load(std::memory_order_relaxed) == 0) return true;
    const int callers_errno = errno;
    const bool broken = Barrier(MEMBARRIER_CMD_PRIVATE_EXPEDITED_RSEQ);
    errno = callers_errno;
    return broken;
}

#endif
