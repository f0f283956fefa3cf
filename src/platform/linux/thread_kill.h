// Asynchronous termination of threads: the end of a thread that is killed. KillThread itself is declared in
// platform/thread.h.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_H

#include <signal.h>

#include "platform/linux/thread_block.h"

// Terminates the calling thread, which StartThread made. No destructor, cancellation handler or TLS
// destructor runs; wake-ups that the thread has to forward are forwarded.
// Requires: kills are not deferred.
[[noreturn]] void ExitKilledThread() noexcept;

// Calls body(block) as the first function of a thread. Returns when the body returns. Does not return if the
// thread is killed, except under the thread sanitizer: there the thread has to end by a return.
void RunUntilKilled(void (*body)(HNativeThread*), HNativeThread* block);

// The handler of the kill signal.
void OnKillSignal(int number, siginfo_t* info, void* context);

#endif
