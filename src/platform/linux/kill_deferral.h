// Deferring kills: code that has to be completed, such as every access to the control blocks, is not terminated.
#ifndef ZANBASE_PLATFORM_LINUX_KILL_DEFERRAL_H
#define ZANBASE_PLATFORM_LINUX_KILL_DEFERRAL_H

#include <atomic>

#include "platform/linux/thread_self.h"

// Defers kills of the calling thread for a scope. A kill that arrives meanwhile takes effect at its end. Only
// the thread and its signal handlers access what it counts, so signal fences suffice.
class DeferKill {
public:
    DeferKill() noexcept { Begin(); }
    ~DeferKill() { End(); }
    DeferKill(const DeferKill&) = delete;
    DeferKill& operator=(const DeferKill&) = delete;

    static void Begin() noexcept {
        toSelf.mnKillDeferrals = toSelf.mnKillDeferrals + 1;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    static void End() noexcept {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toSelf.mnKillDeferrals = toSelf.mnKillDeferrals - 1;
        if (__builtin_expect(toSelf.mpfnDeferredKill != nullptr, false) && toSelf.mnKillDeferrals == 0)
            toSelf.mpfnDeferredKill();
    }
};

#endif
