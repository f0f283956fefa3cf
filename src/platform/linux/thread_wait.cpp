// Waiting for the end of a thread, and pthread_join for the killed ones.
#include "platform/linux/thread_wait.h"

#include "platform/linux/cancellation.h"
#include "platform/linux/thread_kill.h"
#include "platform/linux/thread_self.h"
#include "platform/race_detector.h"

namespace {

// Reclaims the stack of a Killed thread. Releases the block mutex meanwhile, and with it the mutex's deferral
// of kills.
// Requires: the caller defers kills itself. If the calling thread were killed in pthread_join, no other thread
// could join the Killed thread again.
void Reap(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    block->mState = ThreadState::Reaping;
    const pthread_t thread = block->moThread;
    goBlockMutex.Release();
    {
        const NoCancellation no_cancellation;
        pthread_join(thread, nullptr);
    }
    goBlockMutex.Acquire();
    MarkEnded(block);
}

// If the thread of the block has ended, removes the calling thread as a waiter and returns true. Otherwise
// returns false, with the block's generation in `seen`.
bool RemoveWaiterIfEnded(HNativeThread* block, unsigned int& seen) noexcept {
    const DeferKill defer_kill;
    bool is_reaper = false;
    {
        const BlockLock lock;
        seen = block->mnGeneration.load(std::memory_order_relaxed);
        is_reaper = block->mState == ThreadState::Killed;
        if (is_reaper) Reap(block);
        if (block->mState != ThreadState::Ended) return false;
        RemoveWaiter(block);
    }
    NoteAcquire(block);
    if (is_reaper) WakeWaiters(block);
    return true;
}

}  // namespace

HNativeThread* AddWaiter(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    HNativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr) NoteAcquire(&slot);
    if (block == nullptr || block == toSelf.mpoBlock) return block;
    ++block->mnWaiters;
    toSelf.mpoAwaited = block;
    return block;
}

void WaitForThreadEnd(HNativeThread* block) noexcept {
    for (unsigned int seen = 0; !RemoveWaiterIfEnded(block, seen);) WaitForNewGeneration(block, seen);
}

void AbandonWait() noexcept {
    if (toSelf.mpoAwaited == nullptr) return;
    const BlockLock lock;
    RemoveWaiter(toSelf.mpoAwaited);
}

void WaitForNewGeneration(HNativeThread* block, unsigned int seen) noexcept {
    const PendingWakeup pending(block->mnGeneration);
    while (block->mnGeneration.load(std::memory_order_relaxed) == seen)
        SleepWhile(block->mnGeneration, seen, nullptr);
}

void WakeWaiters(HNativeThread* block) noexcept { WakeSleepers(block->mnGeneration, kEverySleeper); }

void NotifyWaiters(HNativeThread* block) noexcept {
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    WakeWaiters(block);
}

void ReapKilledThreads() noexcept {
    const DeferKill defer_kill;
    const BlockLock lock;
    while (HNativeThread* const block = TakeUnreaped()) Reap(block);
}
