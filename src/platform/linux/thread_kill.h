// What a thread does for its part so that KillThread can end it.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_H

#include "platform/thread.h"

// Makes sure that there is a signal for ending threads; to be called before the first thread is made.
void ChooseEndSignal() noexcept;

// Lets that signal through on the calling thread, whatever it took over from the thread that made it.
void UnblockEndSignal() noexcept;

// Calls body(block) as the first function of a thread. Returns when the body returns; when the thread dies,
// it doesn't return, or returns with nothing left to do.
void RunUntilDeath(void (*body)(HNativeThread*), HNativeThread* block);

#endif
