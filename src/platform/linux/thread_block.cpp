// Control blocks: the states of a thread's life, and the reuse of blocks.
#include "platform/linux/thread_block.h"

#include <climits>
#include <cstdlib>
#include <new>

#include "platform/linux/kill_deferral.h"
#include "platform/linux/lock_owner.h"
#include "platform/linux/system_lock.h"
#include "platform/race_detector.h"

BlockMutex goBlockMutex;

namespace {

HNativeLock goLock;                                                     // inside goBlockMutex
HNativeThread* gpoNewest ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;    // all blocks, by mpoOlder
HNativeThread* gpoFree ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;      // Ended, no waiter
HNativeThread* gpoUnjoined ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;  // Killed, no waiter
pthread_key_t gnExitKey;  // the value is the thread's block until the thread leaves that

void Push(HNativeThread*& list, HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    block->mpoNext = list;
    list = block;
}

HNativeThread* Pop(HNativeThread*& list) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    HNativeThread* const block = list;
    if (block != nullptr) list = block->mpoNext;
    return block;
}

HNativeThread* NewBlock() noexcept ZANBASE_REQUIRES(goBlockMutex) {
    if (HNativeThread* const block = Pop(gpoFree)) return block;
    void* const signal_stack = std::malloc(kSignalStackBytes);
    auto* const block = signal_stack != nullptr ? new (std::nothrow) HNativeThread{} : nullptr;
    if (block == nullptr) {
        std::free(signal_stack);
        return nullptr;
    }
    block->mpoSignalStack = signal_stack;
    block->mpoOlder = gpoNewest;
    gpoNewest = block;
    return block;
}

// Release, for the load in HasThread: a thread that finds the slot empty sees what the ended thread wrote.
void EmptySlot(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    if (block->mpoSlot == nullptr) return;
    NoteRelease(block->mpoSlot);
    block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

// TLS destructor of gnExitKey: pthread_exit ended the body below a C frame without unwind tables, so it could
// not unwind the frame that leaves the block.
void OnExitKey(void* block) {
    toSelf.mpoFrame = nullptr;
    LeaveBlock(static_cast<HNativeThread*>(block), ThreadState::Leaving);
}

// Requires: the block has no waiter.
void ReleaseUnawaited(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    switch (block->mnState) {
        case ThreadState::Leaving:
            pthread_detach(block->moThread);
            MarkEnded(block);
            break;
        case ThreadState::Killed:
            Push(gpoUnjoined, block);
            break;
        case ThreadState::Ended:
            Push(gpoFree, block);
            break;
        default:
            break;  // the thread continues
    }
}

}  // namespace

void ReleaseBlocksInChild() noexcept {
    toSelf.mnNumber = 0;
    toSelf.mpfnDeferredKill = nullptr;
    gpoFree = gpoUnjoined = nullptr;
    for (HNativeThread* block = gpoNewest; block != nullptr; block = block->mpoOlder) {
        block->mnWaiters = 0;
        if (block == toSelf.mpoBlock) {
            block->mnNumber = CurrentThreadId();
            block->mbKillRequested = false;  // the request was for the thread in the parent
        } else {
            EmptySlot(block);
            MarkEnded(block);
        }
    }
    goBlockMutex.Release();
}

namespace {

__attribute__((constructor)) void Prepare() {
    InitLock(&goLock);
    if (pthread_key_create(&gnExitKey, OnExitKey) != 0) gnExitKey = PTHREAD_KEYS_MAX;  // setting it fails
}

}  // namespace

// The steps of the lock itself, which no race detector is shown. Every start and end of a thread acquires
// this mutex; shown, it would order threads that have nothing else in common and hide their races.
void BlockMutex::Acquire() noexcept ZANBASE_NO_THREAD_SAFETY_ANALYSIS {  // this is the primitive
    DeferKill::Begin();
    In(&goLock).Acquire(ThisLockOwner());
}

bool BlockMutex::TryAcquire() noexcept ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
    DeferKill::Begin();
    const bool acquired = In(&goLock).TryAcquire(ThisLockOwner());
    if (!acquired) DeferKill::End();
    return acquired;
}

void BlockMutex::Release() noexcept ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
    In(&goLock).Release(tnLockOwner);
    DeferKill::End();
}

HNativeThread* OpenBlock(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    HNativeThread* const block = NewBlock();
    if (block == nullptr) return nullptr;
    block->mpoSlot = &slot;
    block->mnState = ThreadState::Starting;
    block->mnPriority = kNormalPriority;
    block->mbKillRequested = false;
    block->moLastPlace = {};
    slot.store(block, std::memory_order_release);  // pairs with the load in HasThread
    return block;
}

void AbandonBlock(HNativeThread* block) noexcept {
    {
        const BlockLock lock;
        EmptySlot(block);
        MarkEnded(block);
    }
    WakeWaiters(block);
}

void EnterBlock(HNativeThread* block) noexcept {
    toSelf.mpoBlock = block;
    block->moThread = pthread_self();
    block->mnNumber = CurrentThreadId();
    block->mnState = ThreadState::Running;
    pthread_setspecific(gnExitKey, block);  // if this fails, a pthread_exit past RunBody is not noticed
}

void LeaveBlock(HNativeThread* block, ThreadState how) noexcept {
    RemoveSignalStack();  // the next thread of the block uses the same memory
    pthread_setspecific(gnExitKey, nullptr);
    {
        const BlockLock lock;
        toSelf.mpoBlock = nullptr;
        toSelf.mpfnDeferredKill = nullptr;
        MarkLeft(block, how);
    }
    WakeWaiters(block);
}

void MarkLeft(HNativeThread* block, ThreadState how) noexcept {
    EmptySlot(block);  // no further waiter can come
    block->mnState = how;
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    if (block->mnWaiters == 0) ReleaseUnawaited(block);
}

void MarkEnded(HNativeThread* block) noexcept {
    NoteRelease(block);
    block->mnState = ThreadState::Ended;
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
    if (block->mnWaiters == 0) ReleaseUnawaited(block);
}

void RemoveWaiter(HNativeThread* block) noexcept {
    toSelf.mpoAwaited = nullptr;
    if (--block->mnWaiters == 0) ReleaseUnawaited(block);
}

HNativeThread* TakeUnjoined() noexcept { return Pop(gpoUnjoined); }

void WakeWaiters(HNativeThread* block) noexcept { WakeSleepers(block->mnGeneration, kEverySleeper); }
