// Asynchronous termination: the handler of a real-time signal exits the thread by the raw exit system call.
//
// No destructors, cancellation handlers or TLS destructors run; the C library's per-thread caches leak. A lock
// of the C library that the thread holds, such as malloc's, would stay held, and other threads would deadlock.
// So the handler returns if the thread may hold one (see thread_kill_safety.h), and KillThread sends the
// signal again.
#include "platform/linux/thread_kill.h"

#include <cerrno>
#include <climits>

#include <pthread.h>
#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/linux/cancellation.h"
#include "platform/linux/thread_kill_safety.h"
#include "platform/linux/thread_kill_signal.h"
#include "platform/linux/thread_wait.h"

namespace {

// Clears the values of thread-specific data, whose destructors must not run. The next thread on the same
// stack would find the values otherwise. The thread sanitizer keeps its record of the thread there.
void DropThreadKeys() noexcept {
    if (IsThreadSanitizerOn()) return;
    for (pthread_key_t key = 0; key < PTHREAD_KEYS_MAX; ++key) pthread_setspecific(key, nullptr);
}

// Requests that the thread of `block` exit, and waits until it has exited or its signal handler has returned.
// Returns true if the request must be repeated.
// Requires: the calling thread is a waiter of the block.
bool RequestKill(HNativeThread* block) noexcept {
    const bool output_is_held = StandardOutputIsHeld();
    unsigned int seen = 0;
    {
        const BlockLock lock;
        seen = block->mnGeneration.load(std::memory_order_relaxed);
        if (!block->mbKillRequested) block->mnKillRequestedAt = ReadTicks();
        block->mbOutputIsHeld = output_is_held;
        block->mbKillRequested = true;
        if (block->mState == ThreadState::Running) {
            const int signal = KillSignal();
            if (signal == 0) return false;
            // The thread can't end while this one holds the mutex, so no other thread has its number.
            if (syscall(SYS_tgkill, getpid(), block->mnNumber, signal) != 0) {
                if (errno != ESRCH) return true;  // the queue of signals is full
                MarkKilled(block);                // the thread has called exit(2) by itself
                return false;
            }
        } else if (block->mState != ThreadState::Starting) {
            return false;
        }
    }
    WaitForNewGeneration(block, seen);
    return true;
}

}  // namespace

void OnKillSignal(int, siginfo_t*, void* context) {
    HNativeThread* const block = toSelf.mpoBlock;
    if (block == nullptr || !block->mbKillRequested.load(std::memory_order_relaxed)) return;  // not from us
    if (toSelf.mnKillDeferrals != 0) {
        toSelf.mbKillPending = true;
        return;
    }
    const int error = errno;
    if (!MayHoldLibraryLock(block, context)) ExitKilledThread();
    NotifyWaiters(block);
    errno = error;
}

void KillThread(ThreadSlot& slot) noexcept {
    HNativeThread* const block = AddWaiter(slot);
    if (block == nullptr) return;
    if (block == toSelf.mpoBlock) ExitKilledThread();
    const NoCancellation no_cancellation;
    // Without a pause the thread might never leave its signal handler.
    constexpr timespec kPause{0, 50000};
    while (RequestKill(block)) nanosleep(&kPause, nullptr);
    WaitForThreadEnd(block);
}

void ExitKilledThread() noexcept {
    DeferKill::Begin();  // for ever
    ForwardPendingWakeups();
    AbandonWait();
    DropThreadKeys();
    HNativeThread* const block = toSelf.mpoBlock;
    {
        const BlockLock lock;
        toSelf.mpoBlock = nullptr;
        MarkKilled(block);
    }
    WakeWaiters(block);
    if (toSelf.mpoKilledExit != nullptr) JumpTo(*toSelf.mpoKilledExit, 1);
    for (;;) syscall(SYS_exit, 0);
}

void RunUntilKilled(void (*body)(HNativeThread*), HNativeThread* block) {
    // The thread sanitizer waits in pthread_join until it has seen the thread return.
    sigjmp_buf killed_exit;
    if (IsThreadSanitizerOn()) {
        if (sigsetjmp(killed_exit, 1) != 0) return;
        toSelf.mpoKilledExit = &killed_exit;
    }
    body(block);
}
