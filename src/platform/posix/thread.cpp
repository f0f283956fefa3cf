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

#include "platform/posix/kill.h"
#include "platform/posix/thread_block.h"

namespace {

// What each importance adds to the nice value of the process.
int NiceOf(int importance) noexcept {
    struct Step {
        int importance;
        int nice;
    };
    constexpr Step kSteps[] = {{-15, 39}, {-2, 10}, {-1, 5}, {1, -5}, {2, -10}, {15, -39}};
    const auto* const step = std::find_if(std::begin(kSteps), std::end(kSteps),
                                          [=](const Step& each) { return each.importance == importance; });
    return step != std::end(kSteps) ? step->nice : 0;
}

// Only what raises the nice value is allowed to everybody.
void ApplyImportance(const NativeThread* block) noexcept {
    const int own = getpriority(PRIO_PROCESS, static_cast<id_t>(getpid()));  // that of the first thread
    const int nice = std::clamp(own + NiceOf(block->mnImportance), -20, 19);
    setpriority(PRIO_PROCESS, block->mnNumber, nice);
}

// Gives the calling thread its stack for signal handlers, so that they can run when its own is used up. One
// that is there already, as the sanitizers bring, stays.
class HandlerStack {
public:
    explicit HandlerStack(NativeThread* block) noexcept {
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

void FirstStep(NativeThread* block) noexcept {
    AdmitEndSignal();
    bool is_awaited = false;
    {
        const BlockLock lock;
        toSelf.mpoBlock = block;
        block->moThread = pthread_self();
        block->mnNumber = CurrentThreadNumber();
        block->mState = ThreadState::Live;
        if (block->mbImportanceDue) ApplyImportance(block);
        is_awaited = block->mbEndRequested;
    }
    if (is_awaited) Announce(block);
}

// Closes the block when the body has returned, or is being left because the thread asked for its own end.
class LastStep {
public:
    explicit LastStep(NativeThread* block) noexcept : mpoBlock(block) {}
    ~LastStep() { LeaveBlock(mpoBlock); }
    LastStep(const LastStep&) = delete;
    LastStep& operator=(const LastStep&) = delete;

private:
    NativeThread* mpoBlock;
};

void RunBody(NativeThread* block) {
    const LastStep last(block);
    const HandlerStack stack(block);
    FirstStep(block);
    block->mpfnBody(block->mpoArgument);
}

void* Enter(void* block) {
    RunUntilDeath(RunBody, static_cast<NativeThread*>(block));
    return nullptr;
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const Shield shield;
    TakeFaultSignals();
    ChooseEndSignal();
    JoinTheUnjoined();
    NativeThread* const block = OpenBlock(slot);
    if (block == nullptr) return ENOMEM;
    block->mpfnBody = body;
    block->mpoArgument = argument;
    pthread_t thread{};  // not looked at: the thread may be over and its block in other use by now
    const int error = pthread_create(&thread, nullptr, Enter, block);
    if (error != 0) DropBlock(block);
    return error;
}

std::string SystemErrorText(int error) {
    char text[256];
    return strerror_r(error, text, sizeof text);
}

void AwaitThread(ThreadSlot& slot) noexcept {
    NativeThread* const block = JoinWaiters(slot);
    if (block != nullptr && block != toSelf.mpoBlock) SeeThreadOut(block);
}

void ForgetThread(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    if (NativeThread* const block = slot.exchange(nullptr, std::memory_order_acq_rel))
        block->mpoSlot = nullptr;
}

void SetThreadImportance(ThreadSlot& slot, int importance) noexcept {
    const BlockLock lock;
    NativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr) return;
    block->mnImportance = importance;
    if (block->mState == ThreadState::Live) {
        ApplyImportance(block);
    } else {
        block->mbImportanceDue = true;
    }
}

// The exception of pthread_exit has no object, which a sanitizer takes for a reference to nothing.
__attribute__((no_sanitize("undefined"))) void PassThreadExitOn() {
    try {
        throw;
    } catch (abi::__forced_unwind&) {
        throw;
    } catch (...) {
    }
}

unsigned int CurrentThreadNumber() noexcept {
    // The system call costs thirty times as much as the copy, which the child of a fork drops.
    if (__builtin_expect(toSelf.mnNumber == 0, 0))
        toSelf.mnNumber = static_cast<unsigned int>(syscall(SYS_gettid));
    return toSelf.mnNumber;
}

void GiveWay() noexcept { sched_yield(); }
