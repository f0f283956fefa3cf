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
#include "platform/linux/kill_deferral.h"
#include "platform/linux/thread_exit.h"
#include "platform/linux/thread_kill.h"
#include "platform/linux/thread_kill_safety.h"
#include "platform/linux/thread_kill_signal.h"
#include "platform/linux/thread_wait.h"

namespace {

// What each priority level adds to the nice value of the process.
constexpr int kNiceOffsets[] = {39, 10, 5, 0, -5, -10, -39};

int ProcessNice() noexcept {
    return getpriority(PRIO_PROCESS, static_cast<id_t>(getpid()));  // that of the first thread
}

// Every process may raise a nice value; only privileged ones may lower it.
void ApplyPriority(const HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    const int nice = std::clamp(ProcessNice() + kNiceOffsets[block->mnPriority], -20, 19);
    setpriority(PRIO_PROCESS, block->mnNumber, nice);
}

// Makes the calling thread ready for its body and the block Running. False if KillThread was called before: then
// the body must not run.
bool EnterUnlessKilled(HNativeThread* block) noexcept {
    UnblockKillSignal();
    InstallSignalStack(block->mpoSignalStack);
    const BlockLock lock;
    EnterBlock(block);
    // The thread has the nice value of the thread that made it, whatever that had set for itself.
    if (block->mnPriority != kNormalPriority || getpriority(PRIO_PROCESS, 0) != ProcessNice())
        ApplyPriority(block);
    return !block->mbKillRequested;
}

void RunBody(HNativeThread* block) {
    if (!EnterUnlessKilled(block)) ExitKilledThread();
    // Leaves the block also when pthread_exit unwinds the body.
    struct Leaver {
        HNativeThread* mpoBlock;
        ~Leaver() { LeaveBlock(mpoBlock, ThreadState::Leaving); }
    };
    const Leaver leaver{block};
    block->mpfnBody(block->mpoArgument);
}

void* RunThread(void* block) {
    RunUntilKilled(RunBody, static_cast<HNativeThread*>(block));
    return nullptr;
}

// What has to be done before the first thread is made.
void PrepareKills() noexcept {
    FindRuntimeCode();
    PrepareThreadExit();
    const BlockLock lock;
    ChooseKillSignal(OnKillSignal);
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const DeferKill defer_kill;
    InstallFaultHandlers();
    PrepareKills();
    JoinKilledThreads();
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
    // Pairs with the load in HasThread.
    if (HNativeThread* const block = slot.exchange(nullptr, std::memory_order_acq_rel))
        block->mpoSlot = nullptr;
}

void SetNativePriority(ThreadSlot& slot, int level) noexcept {
    const BlockLock lock;
    HNativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr) return;
    block->mnPriority = level;
    if (block->mnState == ThreadState::Running) ApplyPriority(block);  // else its first step does
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
