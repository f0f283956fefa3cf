// The signal by which threads are killed.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_SIGNAL_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_SIGNAL_H

#include <signal.h>

#include "platform/linux/thread_block.h"

// Returns the number of the kill signal. If the program has taken it over, chooses another. 0 if there is no
// unused real-time signal.
int KillSignal() noexcept ZANBASE_REQUIRES(goBlockMutex);

// Unblocks the kill signal on the calling thread.
void UnblockKillSignal() noexcept;

// The signal's handler, defined in thread_kill.cpp.
void OnKillSignal(int number, siginfo_t* info, void* context);

#endif
