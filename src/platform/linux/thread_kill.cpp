// Asynchronous termination: the handler of a signal exits the thread by the raw exit system call.
//
// No destructors, cancellation handlers or TLS destructors run; the C library's per-thread caches leak. A lock
// of the C or C++ library that the thread holds, such as malloc's, would stay held, and other threads would
// deadlock. So the handler returns if the thread may hold one (see thread_kill_safety.h), and KillThread sends
// the signal again.
#include "platform/linux/thread_kill.h"

#include <cerrno>
#include <climits>
#include <ctime>

#include <pthread.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/linux/cancellation.h"
#include "platform/linux/kill_deferral.h"
#include "platform/linux/thread_exit.h"
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

void BlockSignals() noexcept {
    sigset_t all;
    sigfillset(&all);  // those of the C library are left out
    pthread_sigmask(SIG_BLOCK, &all, nullptr);
}

bool IsAlive(const HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    return block->mnState == ThreadState::Starting || block->mnState == ThreadState::Running;
}

// What a request to exit has led to.
enum class KillResult { Gone, StillBusy, NotSent };

// Requests that the thread of `block` exit, and waits until it has left the block or its signal handler has
// returned.
// Requires: the calling thread is a waiter of the block.
KillResult RequestKill(HNativeThread* block) noexcept {
    const bool output_is_held = StandardOutputIsHeld();
    unsigned int seen = 0;
    {
        const BlockLock lock;
        if (!IsAlive(block)) return KillResult::Gone;
        seen = block->mnGeneration.load(std::memory_order_relaxed);
        if (!block->mbKillRequested) block->mnKillRequestedAt = ReadTicks();
        block->mbOutputIsHeld = output_is_held;
        block->mbKillRequested = true;
        // The thread can't end while this one holds the mutex, so no other thread has its number.
        const int error = block->mnState == ThreadState::Running ? SendKillSignal(block->mnNumber) : 0;
        if (error == ESRCH) MarkLeft(block, ThreadState::Killed);  // it has called exit(2) by itself
        if (error != 0) return error == ESRCH ? KillResult::Gone : KillResult::NotSent;
    }
    WaitForNewGeneration(block, seen);
    const BlockLock lock;
    return IsAlive(block) ? KillResult::StillBusy : KillResult::Gone;
}

// The last steps of a killed thread, on whichever stack it is.
void LeaveAndExit(void* block) {
    LeaveBlock(static_cast<HNativeThread*>(block), ThreadState::Killed);
    for (;;) syscall(SYS_exit, 0);
}

}  // namespace

void OnKillSignal(int, siginfo_t*, void* context) {
    HNativeThread* const block = toSelf.mpoBlock;
    if (block == nullptr || !block->mbKillRequested.load(std::memory_order_relaxed)) return;  // not from us
    if (toSelf.mnKillDeferrals != 0) {
        toSelf.mpfnDeferredKill = ExitKilledThread;
        return;
    }
    const int error = errno;
    if (!MayHoldRuntimeLock(block, context)) ExitKilledThread();
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    WakeWaiters(block);
    errno = error;
}

void KillThread(ThreadSlot& slot) noexcept {
    HNativeThread* const block = AddWaiter(slot);
    if (block == nullptr) return;
    if (block == toSelf.mpoBlock) ExitKilledThread();
    const NoCancellation no_cancellation;
    constexpr timespec kPause{0, 50000};  // without it the thread might never leave its signal handler
    constexpr timespec kUnsentPause{0, 5000000};  // until the system has room for a signal
    for (;;) {
        const KillResult result = RequestKill(block);
        if (result == KillResult::Gone) break;
        nanosleep(result == KillResult::NotSent ? &kUnsentPause : &kPause, nullptr);
    }
    WaitForThreadEnd(block);
}

void ExitKilledThread() noexcept {
    DeferKill::Begin();  // for ever
    BlockSignals();
    ForwardPendingWakeups();
    AbandonWait();
    DropThreadKeys();
    HNativeThread* const block = toSelf.mpoBlock;
    if (toSelf.mpoKilledExit == nullptr) CallAsExiting(LeaveAndExit, block);
    LeaveBlock(block, ThreadState::Killed);
    JumpTo(*toSelf.mpoKilledExit, 1);
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
