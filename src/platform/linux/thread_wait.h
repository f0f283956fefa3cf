// Waiting for the end of a thread. Any number of threads may wait for one; each is counted in its block.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_WAIT_H
#define ZANBASE_PLATFORM_LINUX_THREAD_WAIT_H

#include "platform/linux/thread_block.h"

// Counts the calling thread as a waiter of the block in `slot` and returns that block; null if the slot is
// empty. A thread does not become a waiter of its own block.
HNativeThread* AddWaiter(ThreadSlot& slot) noexcept;

// Waits until the thread of `block` has ended, then removes the calling thread as a waiter.
// Requires: the calling thread is a waiter of the block.
void WaitForThreadEnd(HNativeThread* block) noexcept;

// Removes the calling thread as a waiter, if it is one, because the code that waits will not run again.
void AbandonWait() noexcept;

// Sleeps until the block's generation differs from `seen`.
// Requires: the calling thread is a waiter of the block and does not hold the block mutex.
void WaitForNewGeneration(HNativeThread* block, unsigned int seen) noexcept;

// Joins the killed threads that have no waiter, so that their stacks and blocks are used again.
void JoinKilledThreads() noexcept;

#endif
