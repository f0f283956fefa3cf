// Choice of signals that the program does not use.
#include "platform/linux/thread_kill_signal.h"

#include <cerrno>

#include <pthread.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace {

KillHandler gpfnHandler = nullptr;  // written under the block mutex

std::atomic<int> gnKillSignal{0};  // 0: none; written under the block mutex

using Action = struct sigaction;

bool IsOurs(int signal) noexcept {
    Action action{};
    return signal != 0 && sigaction(signal, nullptr, &action) == 0 && (action.sa_flags & SA_SIGINFO) != 0 &&
           action.sa_sigaction == gpfnHandler;
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

// SIGURG, or else the highest real-time signal below SIGRTMAX, without a handler; 0 if there is none. A signal
// that the calling thread blocks is taken only if all others have a handler: a program that reads a signal by
// signalfd or sigwait blocks it.
int FindUnusedSignal() noexcept {
    sigset_t blocked;
    pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
    int blocked_choice = 0;
    for (int candidate = SIGRTMAX; candidate >= SIGRTMIN; --candidate) {
        const int signal = candidate == SIGRTMAX ? SIGURG : candidate;
        if (HasHandler(signal) || !IsDeliverable(signal)) continue;
        if (sigismember(&blocked, signal) == 0) return signal;
        if (blocked_choice == 0) blocked_choice = signal;
    }
    return blocked_choice;
}

}  // namespace

void ChooseKillSignal(KillHandler handler) noexcept {
    gpfnHandler = handler;
    if (IsOurs(gnKillSignal)) return;
    gnKillSignal = FindUnusedSignal();
    Action ours{};
    ours.sa_sigaction = handler;
    ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_RESTART;
    sigfillset(&ours.sa_mask);  // without the C library's own signals
    if (gnKillSignal != 0) sigaction(gnKillSignal, &ours, nullptr);
}

void UnblockKillSignal() noexcept {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, gnKillSignal);
    pthread_sigmask(SIG_UNBLOCK, &signals, nullptr);
}

int SendKillSignal(unsigned int thread) noexcept {
    ChooseKillSignal(gpfnHandler);
    if (gnKillSignal == 0) return EAGAIN;
    return syscall(SYS_tgkill, getpid(), thread, gnKillSignal.load()) == 0 ? 0 : errno;
}
