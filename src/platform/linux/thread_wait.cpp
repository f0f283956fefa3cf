// Waiting for the end of a thread: one waiter joins it, the others sleep until that is done.
#include "platform/linux/thread_wait.h"

#include <cerrno>
#include <ctime>

#include "platform/linux/cancellation.h"
#include "platform/linux/kill_deferral.h"
#include "platform/race_detector.h"

namespace {

// Waits in pthread_timedjoin_np until the thread has ended, or for at most a hundredth of a second. A thread that
// can't be joined, because its body has detached it, counts as ended.
bool JoinWithinLimit(pthread_t thread) noexcept {
    constexpr long kLimitNanoseconds = 10000000;
    constexpr long kNanosecondsPerSecond = 1000000000;
    timespec deadline{};
    clock_gettime(CLOCK_REALTIME, &deadline);
    deadline.tv_nsec += kLimitNanoseconds;
    deadline.tv_sec += deadline.tv_nsec / kNanosecondsPerSecond;
    deadline.tv_nsec %= kNanosecondsPerSecond;
    const NoCancellation no_cancellation;
    return pthread_timedjoin_np(thread, nullptr, &deadline) != ETIMEDOUT;
}

// Joins the thread of a block that is Leaving or Killed. Then the block is Ended, or at the limit as before.
// Releases the block mutex meanwhile.
// Requires: the calling thread defers kills beyond the block mutex: if it were killed while it joins, no other
// thread could join. A kill of it waits for this call, therefore the limit.
void Join(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    const ThreadState state_before = block->mnState;
    const pthread_t thread = block->moThread;
    block->mnState = ThreadState::Joining;
    goBlockMutex.Release();
    const bool has_ended = JoinWithinLimit(thread);
    goBlockMutex.Acquire();
    has_ended ? MarkEnded(block) : MarkLeft(block, state_before);
}

bool IsJoinable(ThreadState state) noexcept {
    return state == ThreadState::Leaving || state == ThreadState::Killed;
}

// One step of a wait: joins a thread that is leaving, and removes the calling thread as a waiter if the thread
// has ended. Returns the block's state before that, and its generation in `seen`.
ThreadState StepTowardsEnd(HNativeThread* block, unsigned int& seen) noexcept {
    const DeferKill defer_kill;
    ThreadState state{};
    bool has_joined = false;
    {
        const BlockLock lock;
        has_joined = IsJoinable(block->mnState);
        if (has_joined) Join(block);
        seen = block->mnGeneration.load(std::memory_order_relaxed);
        state = block->mnState;
        if (state == ThreadState::Ended) RemoveWaiter(block);
    }
    if (state == ThreadState::Ended) NoteAcquire(block);
    if (has_joined) WakeWaiters(block);
    return state;
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
    for (unsigned int seen = 0;;) {
        const ThreadState state = StepTowardsEnd(block, seen);
        if (state == ThreadState::Ended) return;
        if (!IsJoinable(state)) WaitForNewGeneration(block, seen);
    }
}

void AbandonWait() noexcept {
    HNativeThread* const block = toSelf.mpoAwaited;
    if (block == nullptr) return;
    {
        const BlockLock lock;
        block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
        RemoveWaiter(block);
    }
    WakeWaiters(block);  // one of them has to join the thread if this one was about to
}

void WaitForNewGeneration(HNativeThread* block, unsigned int seen) noexcept {
    const ForwardWakeupIfKilled pending(block->mnGeneration);
    while (block->mnGeneration.load(std::memory_order_relaxed) == seen)
        SleepWhile(block->mnGeneration, seen, nullptr);
}

void JoinKilledThreads() noexcept {
    const DeferKill defer_kill;
    const BlockLock lock;
    while (HNativeThread* const block = TakeUnjoined()) Join(block);
}
