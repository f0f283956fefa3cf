// Frames for machine faults, on the signals that the system makes of them.
#include "platform/guard.h"

#include <csetjmp>
#include <iterator>

#include <pthread.h>
#include <signal.h>
#include <ucontext.h>

#include "platform/linux/thread_block.h"
#include "platform/linux/thread_self.h"

// Lives in RunGuarded's frame; the thread's frames form a stack.
struct FaultFrame {
    FaultFrame() noexcept : mpoOuter(toSelf.mpoFrame) { toSelf.mpoFrame = this; }
    ~FaultFrame() { toSelf.mpoFrame = mpoOuter; }
    FaultFrame(const FaultFrame&) = delete;
    FaultFrame& operator=(const FaultFrame&) = delete;

    FaultFrame* mpoOuter;
    sigjmp_buf moPlace;
};

namespace {

using Action = struct sigaction;

struct FaultSignal {
    int number;
    Action previous;  // what received it before us; written once, under the block lock
};

FaultSignal gaFaults[] = {{SIGSEGV, {}}, {SIGBUS, {}}, {SIGFPE, {}}, {SIGILL, {}}};
std::atomic<bool> gbInstalled{false};  // written under the block lock

const Action& PreviousOf(int signal) noexcept {
    const FaultSignal* fault = gaFaults;
    while (fault->number != signal) ++fault;
    return fault->previous;
}

// As if our handler had never been there: the default action follows when the fault is repeated, or the
// signal is sent once more if somebody had sent it.
void LeaveToDefault(int signal, bool sent) noexcept {
    Action standard{};
    standard.sa_handler = SIG_DFL;
    sigaction(signal, &standard, nullptr);
    if (sent) raise(signal);
}

void PassOn(int signal, siginfo_t* info, void* context, bool sent) {
    const Action& previous = PreviousOf(signal);
    const bool has_handler = (previous.sa_flags & SA_SIGINFO) != 0 ||
                             (previous.sa_handler != SIG_DFL && previous.sa_handler != SIG_IGN);
    if (!has_handler) {
        // The system doesn't let a thread ignore its own fault either.
        if (!sent || previous.sa_handler == SIG_DFL) LeaveToDefault(signal, sent);
        return;
    }
    if ((previous.sa_flags & static_cast<int>(SA_RESETHAND)) != 0) LeaveToDefault(signal, false);
    sigset_t blocked = previous.sa_mask;
    if ((previous.sa_flags & SA_NODEFER) == 0) sigaddset(&blocked, signal);
    sigset_t before;
    pthread_sigmask(SIG_BLOCK, &blocked, &before);
    if ((previous.sa_flags & SA_SIGINFO) != 0) {
        previous.sa_sigaction(signal, info, context);
    } else {
        previous.sa_handler(signal);
    }
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
}

void OnFault(int signal, siginfo_t* info, void* context) {
    const bool sent = info->si_code <= 0;
    FaultFrame* const frame = toSelf.mpoFrame;
    if (sent || frame == nullptr || toSelf.mnShields != 0) return PassOn(signal, info, context, sent);
    toPendingWakeups = {};  // the code that noted them is left
    // The mask of the fault and not that of a handler, which may be the one that handed the fault on to this.
    pthread_sigmask(SIG_SETMASK, &static_cast<const ucontext_t*>(context)->uc_sigmask, nullptr);
    siglongjmp(frame->moPlace, 1);
}

}  // namespace

void InstallFaultHandlers() noexcept {
    if (gbInstalled.load(std::memory_order_acquire)) return;
    const BlockLock lock;
    if (gbInstalled.load(std::memory_order_relaxed)) return;
    Action ours{};
    ours.sa_sigaction = OnFault;
    ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_NODEFER;  // what else is blocked, previous handlers say
    for (FaultSignal& fault : gaFaults) {
        sigaction(fault.number, nullptr, &fault.previous);  // first: a fault may come at once
        sigaction(fault.number, &ours, nullptr);
    }
    gbInstalled.store(true, std::memory_order_release);
}

bool RunGuarded(void (*body)(void*), void* argument) {
    InstallFaultHandlers();
    FaultFrame frame;
    if (sigsetjmp(frame.moPlace, 0) != 0) return true;
    body(argument);
    return false;
}
