// The life of control blocks: making, waiting, ending and reuse.
#include "platform/linux/thread_block.h"

#include <climits>
#include <cstdlib>
#include <new>

#include "platform/lock.h"

ZANBASE_FAST_THREAD_LOCAL Self toSelf;

namespace {

HNativeLock goLock;                    // the block lock
HNativeThread* gpoNewest = nullptr;    // all blocks ever made, by mpoOlder; guarded by the block lock
HNativeThread* gpoFree = nullptr;      // guarded by the block lock
HNativeThread* gpoUnjoined = nullptr;  // the Dead without a waiter; guarded by the block lock
pthread_key_t gnExitKey;               // its value is the block of a thread that is Leaving

void Put(HNativeThread*& list, HNativeThread* block) noexcept {
    block->mpoNext = list;
    list = block;
}

HNativeThread* TakeFrom(HNativeThread*& list) noexcept {
    HNativeThread* const block = list;
    if (block != nullptr) list = block->mpoNext;
    return block;
}

HNativeThread* NewBlock() noexcept {
    if (HNativeThread* const block = TakeFrom(gpoFree)) return block;
    void* const handler_stack = std::malloc(kHandlerStackBytes);
    auto* const block = handler_stack != nullptr ? new (std::nothrow) HNativeThread{} : nullptr;
    if (block == nullptr) {
        std::free(handler_stack);
        return nullptr;
    }
    block->mpoHandlerStack = handler_stack;
    block->mpoOlder = gpoNewest;
    gpoNewest = block;
    return block;
}

void EmptySlot(HNativeThread* block) noexcept {
    if (block->mpoSlot != nullptr) block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

void MarkGone(HNativeThread* block) noexcept {
    block->mState = ThreadState::Gone;
    if (block->mnWaiters == 0) {
        Put(gpoFree, block);
    } else {
        block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    }
}

// The value of gnExitKey goes through here when the thread runs its exit routines, round after round as long
// as values are set again. The round after the next comes behind every routine that doesn't do the same.
void OnThreadExit(void* value) {
    constexpr unsigned int kRounds = 3;  // the fourth and last is that of the sanitizers
    auto* const block = static_cast<HNativeThread*>(value);
    if (++toSelf.mnExitRounds < kRounds && pthread_setspecific(gnExitKey, block) == 0) return;
    {
        const BlockLock lock;
        MarkGone(block);
    }
    WakeSleepers(block->mnGeneration, kEverySleeper);
}

void RemoveWaiter(HNativeThread* block) noexcept {
    toSelf.mpoAwaited = nullptr;
    if (--block->mnWaiters != 0) return;
    if (block->mState == ThreadState::Gone) Put(gpoFree, block);
    if (block->mState == ThreadState::Dead) Put(gpoUnjoined, block);
}

// Joins a thread that is Dead, under the block lock, which is let go meanwhile. The caller holds one more
// shield: what one thread has begun to join can't be joined by another. For the same reason it isn't to be
// cancelled.
void Join(HNativeThread* block) noexcept {
    block->mState = ThreadState::Joining;
    BlockLock::Give();
    int state = 0;
    pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &state);
    pthread_join(block->moThread, nullptr);
    pthread_setcancelstate(state, nullptr);
    BlockLock::Take();
    MarkGone(block);
}

// True if the calling thread, a waiter of the block, has left because the thread has ended; else `news` is
// what it has heard of so far.
bool RemoveWaiterIfEnded(HNativeThread* block, unsigned int& news) noexcept {
    const Shield shield;
    bool joined = false;
    {
        const BlockLock lock;
        news = block->mnGeneration.load(std::memory_order_relaxed);
        joined = block->mState == ThreadState::Dead;
        if (joined) Join(block);
        if (block->mState != ThreadState::Gone) return false;
        RemoveWaiter(block);
    }
    if (joined) WakeSleepers(block->mnGeneration, kEverySleeper);
    return true;
}

// The child of a fork has one thread. All others are gone without a trace, so what leads to them is cleared.
void StartOverInChild() noexcept {
    toSelf.mnNumber = 0;
    pthread_setspecific(gnExitKey, nullptr);  // in case it forked while Leaving
    gpoFree = gpoUnjoined = nullptr;
    for (HNativeThread* block = gpoNewest; block != nullptr; block = block->mpoOlder) {
        block->mnWaiters = 0;
        if (block == toSelf.mpoBlock) {
            block->mnNumber = CurrentThreadId();
        } else {
            EmptySlot(block);
            MarkGone(block);
        }
    }
    BlockLock::Give();
}

__attribute__((constructor)) void Prepare() {
    InitLock(&goLock);
    if (pthread_key_create(&gnExitKey, OnThreadExit) != 0) gnExitKey = PTHREAD_KEYS_MAX;  // which none has
    pthread_atfork(BlockLock::Take, BlockLock::Give, StartOverInChild);
}

}  // namespace

void BlockLock::Take() noexcept {
    Shield::Raise();
    AcquireLock(&goLock);
}

void BlockLock::Give() noexcept {
    ReleaseLock(&goLock);
    Shield::Drop();
}

HNativeThread* OpenBlock(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    HNativeThread* const block = NewBlock();
    if (block == nullptr) return nullptr;
    block->mpoSlot = &slot;
    block->mState = ThreadState::Starting;
    block->mnPriority = kNormalPriority;
    // A new thread inherits the priority of the one that made it; if that was changed, it has to be set back.
    block->mbPriorityPending = toSelf.mpoBlock != nullptr && toSelf.mpoBlock->mnPriority != kNormalPriority;
    block->mbEndRequested = false;
    block->moLastPlace = {};
    slot.store(block, std::memory_order_release);
    return block;
}

void AbandonBlock(HNativeThread* block) noexcept {
    {
        const BlockLock lock;
        EmptySlot(block);
        MarkGone(block);
    }
    WakeSleepers(block->mnGeneration, kEverySleeper);
}

void CloseBlock(HNativeThread* block) noexcept {
    const BlockLock lock;
    toSelf.mpoBlock = nullptr;
    toSelf.mbEndPending = false;
    EmptySlot(block);
    pthread_detach(block->moThread);
    block->mState = ThreadState::Leaving;
    // Nobody can come to wait any more.
    if (block->mnWaiters == 0) {
        MarkGone(block);
    } else if (pthread_setspecific(gnExitKey, block) != 0) {
        MarkGone(block);
        WakeSleepers(block->mnGeneration, kEverySleeper);
    }
}

void MarkBlockDead(HNativeThread* block) noexcept {
    {
        const BlockLock lock;
        toSelf.mpoBlock = nullptr;
        if (toSelf.mpoAwaited != nullptr) RemoveWaiter(toSelf.mpoAwaited);
        EmptySlot(block);
        block->mState = ThreadState::Dead;
        if (block->mnWaiters == 0) Put(gpoUnjoined, block);
        block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    }
    WakeSleepers(block->mnGeneration, kEverySleeper);
}

HNativeThread* AddWaiter(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    HNativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr || block == toSelf.mpoBlock) return block;
    ++block->mnWaiters;
    toSelf.mpoAwaited = block;
    return block;
}

void WaitForThreadEnd(HNativeThread* block) noexcept {
    for (unsigned int seen = 0; !RemoveWaiterIfEnded(block, seen);) WaitForNewGeneration(block, seen);
}

void WaitForNewGeneration(HNativeThread* block, unsigned int seen) noexcept {
    const PendingWakeup sleeping(block->mnGeneration);
    while (block->mnGeneration.load(std::memory_order_relaxed) == seen)
        SleepWhile(block->mnGeneration, seen, nullptr);
}

void NotifyWaiters(HNativeThread* block) noexcept {
    block->mnGeneration.fetch_add(1, std::memory_order_release);
    WakeSleepers(block->mnGeneration, kEverySleeper);
}

void JoinTheUnjoined() noexcept {
    const Shield shield;
    const BlockLock lock;
    while (HNativeThread* const block = TakeFrom(gpoUnjoined)) Join(block);
}
