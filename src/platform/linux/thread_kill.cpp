// Ending a thread from outside: a signal of our own makes it leave by the bare system call.
//
// Nothing of the thread runs after that, so nothing puts in order what it was in the middle of. Memory that
// the C library holds for it is lost: its cache of free blocks and its list of thread-exit routines. A lock
// of the C library that it holds would stay held, malloc's for instance, and stop every other thread sooner
// or later. So a thread that the signal finds inside the library's code is let go on, and is asked again a
// moment later; see MayHoldLibraryLock.
#include "platform/linux/thread_kill.h"

#include <cerrno>
#include <climits>
#include <csetjmp>

#include <pthread.h>
#include <signal.h>

#include "platform/clock.h"
#include "platform/linux/thread_block.h"
#include "platform/linux/thread_kill_safety.h"

namespace {

std::atomic<int> gnEndSignal{0};  // 0: none; written under the block lock

#ifdef ZANBASE_THREAD_SANITIZER  // has to see a thread end in good order
ZANBASE_FAST_THREAD_LOCAL sigjmp_buf toWayOut;
#endif

// The destructors of thread-specific data don't run, and the next thread on the same stack must not see the
// values.
void DropThreadKeys() noexcept {
#ifndef ZANBASE_THREAD_SANITIZER  // which finds its own record of the thread there
    for (pthread_key_t key = 0; key < PTHREAD_KEYS_MAX; ++key) pthread_setspecific(key, nullptr);
#endif
}

void OnEndSignal(int, siginfo_t*, void* context) {
    HNativeThread* const block = toSelf.mpoBlock;
    if (block == nullptr || !block->mbEndRequested.load(std::memory_order_relaxed)) return;  // not from us
    if (toSelf.mnShields != 0) {
        toSelf.mbEndPending = true;
        return;
    }
    const int error = errno;
    if (!MayHoldLibraryLock(block, context)) ExitKilledThread();
    NotifyWaiters(block);
    errno = error;
}

using Action = struct sigaction;

bool IsOurs(int signal) noexcept {
    Action action{};
    return signal != 0 && sigaction(signal, nullptr, &action) == 0 && (action.sa_flags & SA_SIGINFO) != 0 &&
           action.sa_sigaction == OnEndSignal;
}

// The end signal, chosen anew if a part of the program took it over; 0 if every real-time signal is in use.
int EndSignal() noexcept {
    if (IsOurs(gnEndSignal)) return gnEndSignal;
    Action ours{};
    ours.sa_sigaction = OnEndSignal;
    ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_RESTART;
    sigfillset(&ours.sa_mask);
    for (int signal = SIGRTMAX - 1; signal >= SIGRTMIN; --signal) {
        Action action{};
        sigaction(signal, nullptr, &action);
        if ((action.sa_flags & SA_SIGINFO) != 0 || action.sa_handler != SIG_DFL) continue;
        sigaction(signal, &ours, nullptr);
        return gnEndSignal = signal;
    }
    return gnEndSignal = 0;
}

// Asks a thread to die and waits until it has died or put that off. False if nothing is left to ask for, or
// no signal to ask with.
bool AskToDie(HNativeThread* block) noexcept {
    unsigned int news = 0;
    {
        const BlockLock lock;
        news = block->mnGeneration.load(std::memory_order_relaxed);
        if (!block->mbEndRequested) block->mnAskedAt = ReadTicks();
        block->mbEndRequested = true;
        if (block->mState == ThreadState::Live) {
            const int signal = EndSignal();
            if (signal == 0) return false;
            // It can't get past its last step now, so the number is still its own. The queue may be full.
            if (syscall(SYS_tgkill, getpid(), block->mnNumber, signal) != 0) return true;
        } else if (block->mState != ThreadState::Starting) {
            return false;
        }
    }
    WaitForNewGeneration(block, news);
    return true;
}

}  // namespace

void ChooseEndSignal() noexcept {
    if (gnEndSignal.load(std::memory_order_relaxed) != 0) return;
    FindLibraryCode();
    const BlockLock lock;
    EndSignal();
}

void UnblockEndSignal() noexcept {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, gnEndSignal);
    pthread_sigmask(SIG_UNBLOCK, &signals, nullptr);
}

void KillThread(ThreadSlot& slot) noexcept {
    HNativeThread* const block = AddWaiter(slot);
    if (block == nullptr) return;
    if (block == toSelf.mpoBlock) ExitKilledThread();
    // Time for the thread to get on: asked again at once it might never leave its signal handler.
    constexpr timespec kPause{0, 50000};
    while (AskToDie(block)) nanosleep(&kPause, nullptr);
    WaitForThreadEnd(block);
}

void ExitKilledThread() noexcept {
    Shield::Raise();  // for ever
    ForwardPendingWakeups();
    DropThreadKeys();
    MarkBlockDead(toSelf.mpoBlock);
#ifdef ZANBASE_THREAD_SANITIZER
    siglongjmp(toWayOut, 1);
#else
    for (;;) syscall(SYS_exit, 0);
#endif
}

void RunUntilDeath(void (*body)(HNativeThread*), HNativeThread* block) {
#ifdef ZANBASE_THREAD_SANITIZER
    if (sigsetjmp(toWayOut, 1) != 0) return;
#endif
    body(block);
}
