// Asynchronous termination of threads: deferring it, and the end of a thread that is killed. KillThread
// itself is declared in platform/thread.h.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_H

#include <atomic>

#include "platform/linux/thread_self.h"

// Terminates the calling thread, which StartThread made. No destructor, cancellation handler or TLS
// destructor runs; wake-ups that the thread has to forward are forwarded.
// Requires: kills are not deferred.
[[noreturn]] void ExitKilledThread() noexcept;

// Calls body(block) as the first function of a thread. Returns when the body returns. Does not return if the
// thread is killed, except under the thread sanitizer: there the thread has to end by a return.
void RunUntilKilled(void (*body)(HNativeThread*), HNativeThread* block);

// Defers kills of the calling thread for a scope. A kill that arrives meanwhile takes effect at its end.
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
        if (__builtin_expect(toSelf.mbKillPending, false) && toSelf.mnKillDeferrals == 0) ExitKilledThread();
    }
};

#endif
