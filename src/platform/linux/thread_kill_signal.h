// The signal by which threads are killed: SIGURG, or a real-time signal if the program uses that.
//
// SIGURG, because it is ignored by default, debuggers pass it on, and the system always has room for it, where
// a real-time signal is refused while the queue of signals is full (RLIMIT_SIGPENDING). Of several pending
// signals the system calls the handler of the highest number first, so the C library's own signals, 32 and 33,
// are answered before a thread is killed by SIGURG.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_SIGNAL_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_SIGNAL_H

#include <signal.h>

#include "platform/linux/thread_block.h"

using KillHandler = void (*)(int number, siginfo_t* info, void* context);

// Chooses the signal at the first call and installs `handler` for it. If the program has taken it over since,
// chooses another.
void ChooseKillSignal(KillHandler handler) noexcept ZANBASE_REQUIRES(goBlockMutex);

// Unblocks the kill signal on the calling thread.
void UnblockKillSignal() noexcept;

// Sends the kill signal to the thread with the system's number `thread`. Returns 0, ESRCH if there is no such
// thread, or EAGAIN if the program uses all signals or the system has no room for the one that is left.
// Requires: ChooseKillSignal was called.
int SendKillSignal(unsigned int thread) noexcept ZANBASE_REQUIRES(goBlockMutex);

#endif
