// Frames for machine faults, on the signals that the system makes of them.
#include "platform/guard.h"

#include <csetjmp>

#include <cxxabi.h>
#include <pthread.h>
#include <signal.h>

#include "platform/linux/fault_handlers.h"
#include "platform/linux/thread_place.h"
#include "platform/linux/thread_self.h"
#include "platform/linux/thread_wait.h"

// What the C++ runtime keeps of a thread's exceptions, as the C++ ABI of 64-bit processors lays it out.
struct ExceptionState {
    void* mpoCaught;          // those whose handlers run, by a list
    unsigned int mnUncaught;  // those that are being thrown

    static ExceptionState& OfThread() noexcept {
        return *reinterpret_cast<ExceptionState*>(abi::__cxa_get_globals());
    }
};

// Part of RunGuarded's stack frame. The frames of a thread form a stack.
struct FaultFrame {
    FaultFrame() noexcept;  // unblocks the fault signals: a fault whose signal is blocked ends the process
    ~FaultFrame() { toSelf.mpoFrame = mpoOuter; }
    FaultFrame(const FaultFrame&) = delete;
    FaultFrame& operator=(const FaultFrame&) = delete;

    FaultFrame* mpoOuter;
    sigset_t moBlocked;           // the signals that a fault leaves blocked
    ExceptionState moExceptions;  // as a fault leaves it
    sigjmp_buf moPlace;
};

namespace {

using Action = struct sigaction;

struct FaultSignal {
    int number;
    Action previous;  // what received it before us; written once, under the block mutex
};

FaultSignal gaFaults[] = {{SIGSEGV, {}}, {SIGBUS, {}}, {SIGFPE, {}}, {SIGILL, {}}};
std::atomic<bool> gbInstalled{false};  // written under the block mutex; its release publishes gaFaults

const Action& PreviousOf(int signal) noexcept {
    const FaultSignal* fault = gaFaults;
    while (fault->number != signal) ++fault;
    return fault->previous;
}

// Gives the signal its default action. A fault takes it when the faulting instruction runs again; a signal
// that was sent is sent again.
void RestoreDefaultAction(int signal, bool sent) noexcept {
    Action standard{};
    standard.sa_handler = SIG_DFL;
    sigaction(signal, &standard, nullptr);
    if (sent) raise(signal);
}

void CallPreviousHandler(int signal, siginfo_t* info, void* context, bool sent) {
    const Action& previous = PreviousOf(signal);
    const bool has_handler = (previous.sa_flags & SA_SIGINFO) != 0 ||
                             (previous.sa_handler != SIG_DFL && previous.sa_handler != SIG_IGN);
    if (!has_handler) {
        // The system does not let a thread ignore its own fault either.
        if (!sent || previous.sa_handler == SIG_DFL) RestoreDefaultAction(signal, sent);
        return;
    }
    if ((previous.sa_flags & static_cast<int>(SA_RESETHAND)) != 0) RestoreDefaultAction(signal, false);
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
    // While kills are deferred the thread may hold the block mutex: a fault there must not be survived.
    if (sent || frame == nullptr || toSelf.mnKillDeferrals != 0)
        return CallPreviousHandler(signal, info, context, sent);
    // The fault may have occurred in a signal handler that interrupted a lock operation or a wait for a thread;
    // neither continues. Both calls are safe here: the first makes system calls only, and this thread does
    // not hold the block mutex that the second acquires.
    ForwardPendingWakeups();
    AbandonWait();
    ExceptionState::OfThread() = frame->moExceptions;
    pthread_sigmask(SIG_SETMASK, &frame->moBlocked, nullptr);
    RestoreFloatControl(*static_cast<const ucontext_t*>(context));
    JumpTo(frame->moPlace, 1);
}

}  // namespace

FaultFrame::FaultFrame() noexcept : mpoOuter(toSelf.mpoFrame), moExceptions(ExceptionState::OfThread()) {
    toSelf.mpoFrame = this;
    sigset_t faults;
    sigemptyset(&faults);
    for (const FaultSignal& fault : gaFaults) sigaddset(&faults, fault.number);
    pthread_sigmask(SIG_UNBLOCK, &faults, &moBlocked);
    for (const FaultSignal& fault : gaFaults) sigdelset(&moBlocked, fault.number);
}

void InstallFaultHandlers() noexcept {
    if (gbInstalled.load(std::memory_order_acquire)) return;  // pairs with the store below
    const BlockLock lock;
    if (gbInstalled.load(std::memory_order_relaxed)) return;
    Action ours{};
    ours.sa_sigaction = OnFault;
    ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_NODEFER;  // a previous handler's mask says what to block
    for (FaultSignal& fault : gaFaults) {
        sigaction(fault.number, nullptr, &fault.previous);  // first: a fault may come at once
        sigaction(fault.number, &ours, nullptr);
    }
    gbInstalled.store(true, std::memory_order_release);  // pairs with the load above: gaFaults is complete
}

bool RunGuarded(void (*body)(void*), void* argument) {
    InstallFaultHandlers();
    FaultFrame frame;
    if (sigsetjmp(frame.moPlace, 0) != 0) return true;
    body(argument);
    return false;
}
