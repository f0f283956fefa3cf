// The life of control blocks: making, waiting, ending and reuse.
#include "platform/posix/thread_block.h"

#include <climits>
#include <cstdlib>
#include <new>

#include "platform/lock.h"

ZANBASE_FAST_THREAD_LOCAL Self toSelf;

namespace {

NativeLock goLock;                    // the block lock
NativeThread* gpoNewest = nullptr;    // all blocks ever made, by mpoOlder; guarded by the block lock
NativeThread* gpoFree = nullptr;      // guarded by the block lock
NativeThread* gpoUnjoined = nullptr;  // the Dead without a waiter; guarded by the block lock
pthread_key_t gnExitKey;              // its value is the block of a thread that is Leaving

void Put(NativeThread*& list, NativeThread* block) noexcept {
    block->mpoNext = list;
    list = block;
}

NativeThread* TakeFrom(NativeThread*& list) noexcept {
    NativeThread* const block = list;
    if (block != nullptr) list = block->mpoNext;
    return block;
}

NativeThread* NewBlock() noexcept {
    if (NativeThread* const block = TakeFrom(gpoFree)) return block;
    void* const handler_stack = std::malloc(kHandlerStackBytes);
    auto* const block = handler_stack != nullptr ? new (std::nothrow) NativeThread{} : nullptr;
    if (block == nullptr) {
        std::free(handler_stack);
        return nullptr;
    }
    block->mpoHandlerStack = handler_stack;
    block->mpoOlder = gpoNewest;
    gpoNewest = block;
    return block;
}

void EmptySlot(NativeThread* block) noexcept {
    if (block->mpoSlot != nullptr) block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

void MarkGone(NativeThread* block) noexcept {
    block->mState = ThreadState::Gone;
    if (block->mnWaiters == 0) {
        Put(gpoFree, block);
    } else {
        block->mnNews.fetch_add(1, std::memory_order_relaxed);
    }
}

// The value of gnExitKey goes through here when the thread runs its exit routines, round after round as long
// as values are set again. The round after the next comes behind every routine that doesn't do the same.
void OnThreadExit(void* value) {
    constexpr unsigned int kRounds = 3;  // the fourth and last is that of the sanitizers
    auto* const block = static_cast<NativeThread*>(value);
    if (++toSelf.mnExitRounds < kRounds && pthread_setspecific(gnExitKey, block) == 0) return;
    {
        const BlockLock lock;
        MarkGone(block);
    }
    WakeSleepers(block->mnNews, kEverySleeper);
}

void LoseWaiter(NativeThread* block) noexcept {
    toSelf.mpoAwaited = nullptr;
    if (--block->mnWaiters != 0) return;
    if (block->mState == ThreadState::Gone) Put(gpoFree, block);
    if (block->mState == ThreadState::Dead) Put(gpoUnjoined, block);
}

// Joins a thread that is Dead, under the block lock, which is let go meanwhile. The caller holds one more
// shield: what one thread has begun to join can't be joined by another. For the same reason it isn't to be
// cancelled.
void Join(NativeThread* block) noexcept {
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
bool LeftAtEnd(NativeThread* block, unsigned int& news) noexcept {
    const Shield shield;
    bool joined = false;
    {
        const BlockLock lock;
        news = block->mnNews.load(std::memory_order_relaxed);
        joined = block->mState == ThreadState::Dead;
        if (joined) Join(block);
        if (block->mState != ThreadState::Gone) return false;
        LoseWaiter(block);
    }
    if (joined) WakeSleepers(block->mnNews, kEverySleeper);
    return true;
}

// The child of a fork has one thread. All others are gone without a trace, so what leads to them is cleared.
void StartOverInChild() noexcept {
    toSelf.mnNumber = 0;
    pthread_setspecific(gnExitKey, nullptr);  // in case it forked while Leaving
    gpoFree = gpoUnjoined = nullptr;
    for (NativeThread* block = gpoNewest; block != nullptr; block = block->mpoOlder) {
        block->mnWaiters = 0;
        if (block == toSelf.mpoBlock) {
            block->mnNumber = CurrentThreadNumber();
        } else {
            EmptySlot(block);
            MarkGone(block);
        }
    }
    BlockLock::Give();
}

__attribute__((constructor)) void Prepare() {
    OpenLock(&goLock);
    if (pthread_key_create(&gnExitKey, OnThreadExit) != 0) gnExitKey = PTHREAD_KEYS_MAX;  // which none has
    pthread_atfork(BlockLock::Take, BlockLock::Give, StartOverInChild);
}

}  // namespace

void BlockLock::Take() noexcept {
    Shield::Raise();
    TakeLock(&goLock);
}

void BlockLock::Give() noexcept {
    GiveLock(&goLock);
    Shield::Drop();
}

NativeThread* OpenBlock(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    NativeThread* const block = NewBlock();
    if (block == nullptr) return nullptr;
    block->mpoSlot = &slot;
    block->mState = ThreadState::Starting;
    block->mnImportance = 0;
    // A new thread has the importance of the one that made it; if that was changed, it has to be set back.
    block->mbImportanceDue = toSelf.mpoBlock != nullptr && toSelf.mpoBlock->mnImportance != 0;
    block->mbEndRequested = false;
    block->moLastPlace = {};
    slot.store(block, std::memory_order_release);
    return block;
}

void DropBlock(NativeThread* block) noexcept {
    {
        const BlockLock lock;
        EmptySlot(block);
        MarkGone(block);
    }
    WakeSleepers(block->mnNews, kEverySleeper);
}

void LeaveBlock(NativeThread* block) noexcept {
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
        WakeSleepers(block->mnNews, kEverySleeper);
    }
}

void DieInBlock(NativeThread* block) noexcept {
    {
        const BlockLock lock;
        toSelf.mpoBlock = nullptr;
        if (toSelf.mpoAwaited != nullptr) LoseWaiter(toSelf.mpoAwaited);
        EmptySlot(block);
        block->mState = ThreadState::Dead;
        if (block->mnWaiters == 0) Put(gpoUnjoined, block);
        block->mnNews.fetch_add(1, std::memory_order_relaxed);
    }
    WakeSleepers(block->mnNews, kEverySleeper);
}

NativeThread* JoinWaiters(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    NativeThread* const block = slot.load(std::memory_order_relaxed);
    if (block == nullptr || block == toSelf.mpoBlock) return block;
    ++block->mnWaiters;
    toSelf.mpoAwaited = block;
    return block;
}

void SeeThreadOut(NativeThread* block) noexcept {
    for (unsigned int seen = 0; !LeftAtEnd(block, seen);) SleepUntilNews(block, seen);
}

void SleepUntilNews(NativeThread* block, unsigned int seen) noexcept {
    const WakeDebt sleeping(block->mnNews);
    while (block->mnNews.load(std::memory_order_relaxed) == seen) SleepWhile(block->mnNews, seen, nullptr);
}

void Announce(NativeThread* block) noexcept {
    block->mnNews.fetch_add(1, std::memory_order_release);
    WakeSleepers(block->mnNews, kEverySleeper);
}

void JoinTheUnjoined() noexcept {
    const Shield shield;
    const BlockLock lock;
    while (NativeThread* const block = TakeFrom(gpoUnjoined)) Join(block);
}
