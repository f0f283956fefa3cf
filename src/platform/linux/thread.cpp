// Threads of POSIX, with what Linux adds: a number and a nice value for each of them.
#include "platform/thread.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include <cxxabi.h>
#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <sys/resource.h>

#include "platform/linux/thread_block.h"
#include "platform/linux/thread_kill.h"

namespace {

// What each priority level adds to the nice value of the process.
constexpr int kNiceOffsets[] = {39, 10, 5, 0, -5, -10, -39};

// Only what raises the nice value is allowed to everybody.
void ApplyPriority(const HNativeThread* block) noexcept {
    const int own = getpriority(PRIO_PROCESS, static_cast<id_t>(getpid()));  // that of the first thread
    const int nice = std::clamp(own + kNiceOffsets[block->mnPriority], -20, 19);
    setpriority(PRIO_PROCESS, block->mnNumber, nice);
}

// Gives the calling thread its stack for signal handlers, so that they can run when its own is used up. One
// that is there already, as the sanitizers bring, stays.
class HandlerStack {
public:
    explicit HandlerStack(HNativeThread* block) noexcept {
        stack_t mine{};
        mine.ss_sp = block->mpoHandlerStack;
        mine.ss_size = kHandlerStackBytes;
        stack_t there{};
        sigaltstack(&mine, &there);
        mbMine = (there.ss_flags & SS_DISABLE) != 0;
        if (!mbMine) sigaltstack(&there, nullptr);
    }
    ~HandlerStack() {
        stack_t none{};
        none.ss_flags = SS_DISABLE;
        if (mbMine) sigaltstack(&none, nullptr);
    }
    HandlerStack(const HandlerStack&) = delete;
    HandlerStack& operator=(const HandlerStack&) = delete;

private:
    bool mbMine;
};

void FirstStep(HNativeThread* block) noexcept {
    UnblockEndSignal();
    bool is_awaited = false;
    {
        const BlockLock lock;
        toSelf.mpoBlock = block;
        block->moThread = pthread_self();
        block->mnNumber = CurrentThreadId();
        block->mState = ThreadState::Live;
        if (block->mbPriorityPending) ApplyPriority(block);
        is_awaited = block->mbEndRequested;
    }
    if (is_awaited) NotifyWaiters(block);
}

// Closes the block when the body has returned, or is being left because the thread asked for its own end.
class LastStep {
public:
    explicit LastStep(HNativeThread* block) noexcept : mpoBlock(block) {}
    ~LastStep() { CloseBlock(mpoBlock); }
    LastStep(const LastStep&) = delete;
    LastStep& operator=(const LastStep&) = delete;

private:
    HNativeThread* mpoBlock;
};

void RunBody(HNativeThread* block) {
    const LastStep last(block);
    const HandlerStack stack(block);
    FirstStep(block);
    block->mpfnBody(block->mpoArgument);
}

void* Enter(void* block) {
    RunUntilDeath(RunBody, static_cast<HNativeThread*>(block));
    return nullptr;
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const Shield shield;
    InstallFaultHandlers();
    ChooseEndSignal();
    JoinTheUnjoined();
    HNativeThread* const block = OpenBlock(slot);
    if (block == nullptr) return ENOMEM;
    block->mpfnBody = body;
    block->mpoArgument = argument;
    pthread_t thread{};  // not looked at: the thread may be over and its block in other use by now
    const int error = pthread_create(&thread, nullptr, Enter, block);
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
    if (block->mState == ThreadState::Live) {
        ApplyPriority(block);
    } else {
        block->mbPriorityPending = true;
    }
}

// The exception of pthread_exit has no object, which a sanitizer takes for a reference to nothing.
__attribute__((no_sanitize("undefined"))) void RethrowThreadExit() {
    try {
        throw;
    } catch (abi::__forced_unwind&) {
        throw;
    } catch (...) {
    }
}

unsigned int CurrentThreadId() noexcept {
    // The system call costs thirty times as much as the copy, which the child of a fork drops.
    if (__builtin_expect(toSelf.mnNumber == 0, 0))
        toSelf.mnNumber = static_cast<unsigned int>(syscall(SYS_gettid));
    return toSelf.mnNumber;
}

void YieldThread() noexcept { sched_yield(); }
