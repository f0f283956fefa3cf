// Choice of a real-time signal that the program does not use.
#include "platform/linux/thread_kill_signal.h"

#include <pthread.h>

namespace {

std::atomic<int> gnKillSignal{0};  // 0: none; written under the block mutex

using Action = struct sigaction;

bool IsOurs(int signal) noexcept {
    Action action{};
    return signal != 0 && sigaction(signal, nullptr, &action) == 0 && (action.sa_flags & SA_SIGINFO) != 0 &&
           action.sa_sigaction == OnKillSignal;
}

bool HasHandler(int signal) noexcept {
    Action action{};
    sigaction(signal, nullptr, &action);
    return (action.sa_flags & SA_SIGINFO) != 0 || action.sa_handler != SIG_DFL;
}

// False for a signal that the system can't deliver: user-mode emulators accept a handler for SIGRTMAX - 1,
// but can neither send nor block that signal.
bool IsDeliverable(int signal) noexcept {
    sigset_t one, before, with_it;
    sigemptyset(&one);
    sigaddset(&one, signal);
    pthread_sigmask(SIG_BLOCK, &one, &before);
    pthread_sigmask(SIG_SETMASK, &before, &with_it);
    return sigismember(&with_it, signal) == 1;
}

// The highest real-time signal below SIGRTMAX that has no handler; 0 if there is none. A signal in `excluded`
// is taken only if all others have a handler.
int FindUnusedSignal(const sigset_t& excluded) noexcept {
    int excluded_choice = 0;
    for (int signal = SIGRTMAX - 1; signal >= SIGRTMIN; --signal) {
        if (HasHandler(signal) || !IsDeliverable(signal)) continue;
        if (sigismember(&excluded, signal) == 0) return signal;
        if (excluded_choice == 0) excluded_choice = signal;
    }
    return excluded_choice;
}

}  // namespace

int KillSignal() noexcept {
    if (IsOurs(gnKillSignal)) return gnKillSignal;
    // A program that reads a signal by signalfd or sigwait blocks it and has no handler for it.
    sigset_t blocked;
    pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
    const int signal = FindUnusedSignal(blocked);
    if (signal != 0) {
        Action ours{};
        ours.sa_sigaction = OnKillSignal;
        ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_RESTART;
        sigfillset(&ours.sa_mask);
        sigaction(signal, &ours, nullptr);
    }
    return gnKillSignal = signal;
}

void UnblockKillSignal() noexcept {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, gnKillSignal);
    pthread_sigmask(SIG_UNBLOCK, &signals, nullptr);
}
