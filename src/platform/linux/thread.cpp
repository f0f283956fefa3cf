// Threads of POSIX, with what Linux adds: a number and a nice value for each thread.
#include "platform/thread.h"

#include <algorithm>
#include <cstring>

#include <cxxabi.h>
#include <pthread.h>
#include <sched.h>
#include <sys/resource.h>
#include <unistd.h>

#include "platform/linux/fault_handlers.h"
#include "platform/linux/thread_kill.h"
#include "platform/linux/thread_kill_safety.h"
#include "platform/linux/thread_kill_signal.h"
#include "platform/linux/thread_wait.h"

namespace {

// What each priority level adds to the nice value of the process.
constexpr int kNiceOffsets[] = {39, 10, 5, 0, -5, -10, -39};

// Every process may raise a nice value; only privileged ones may lower it.
void ApplyPriority(const HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    const int own = getpriority(PRIO_PROCESS, static_cast<id_t>(getpid()));  // that of the first thread
    const int nice = std::clamp(own + kNiceOffsets[block->mnPriority], -20, 19);
    setpriority(PRIO_PROCESS, block->mnNumber, nice);
}

// True if KillThread was called before this step: then the body must not run.
bool MakeFirstStep(HNativeThread* block) noexcept {
    UnblockKillSignal();
    InstallSignalStack(block->mpoSignalStack);
    const BlockLock lock;
    EnterBlock(block);
    if (block->mbPriorityPending) ApplyPriority(block);
    return block->mbKillRequested;
}

void RunBody(HNativeThread* block) {
    if (MakeFirstStep(block)) ExitKilledThread();
    // Closes the block also when pthread_exit unwinds the body.
    struct Closer {
        HNativeThread* mpoBlock;
        ~Closer() { CloseBlock(mpoBlock); }
    };
    const Closer closer{block};
    block->mpfnBody(block->mpoArgument);
}

void* RunThread(void* block) {
    RunUntilKilled(RunBody, static_cast<HNativeThread*>(block));
    return nullptr;
}

// Before the first thread is made, so that KillThread finds a signal that is unblocked on every thread.
void ChooseKillSignal() noexcept {
    const BlockLock lock;
    KillSignal();
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const DeferKill defer_kill;
    InstallFaultHandlers();
    FindLibraryCode();
    ChooseKillSignal();
    ReapKilledThreads();
    HNativeThread* const block = OpenBlock(slot);
    if (block == nullptr) return ENOMEM;
    block->mpfnBody = body;
    block->mpoArgument = argument;
    pthread_t thread{};  // unused: the thread may have ended and its block may have been reused by then
    const int error = pthread_create(&thread, nullptr, RunThread, block);
    if (error != 0) AbandonBlock(block);
    return error;
}

std::string SystemErrorText(int error) {
    char text[256];
    return strerror_r(error, text, sizeof text);
}

void JoinThread(ThreadSlot& slot) noexcept {
    HNativeThread* const block = AddWaiter(slot);
    if (block != nullptr && block != toSelf.mpoBlock) WaitForThreadEnd(block);
}

void DetachThread(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    if (HNativeThread* const block = slot.exchange(nullptr, std::memory_order_acq_rel))
        block->mpoSlot = nullptr;
}

void SetNativePriority(ThreadSlot& slot, int level) noexcept {
    const BlockLock lock;
    HNativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr) return;
    block->mnPriority = level;
    if (block->mState == ThreadState::Running) {
        ApplyPriority(block);
    } else {
        block->mbPriorityPending = true;
    }
}

// The exception of pthread_exit has no object; the undefined-behaviour sanitizer takes it for a null
// reference.
__attribute__((no_sanitize("undefined"))) void RethrowThreadExit() {
    try {
        throw;
    } catch (abi::__forced_unwind&) {
        throw;
    } catch (...) {
    }
}

void YieldThread() noexcept { sched_yield(); }
