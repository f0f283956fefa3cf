// Control blocks: the states of a thread's life, and the reuse of blocks.
#include "platform/linux/thread_block.h"

#include <climits>
#include <cstdlib>
#include <new>

#include "platform/linux/system_lock.h"
#include "platform/linux/thread_kill.h"
#include "platform/linux/thread_self.h"
#include "platform/linux/thread_wait.h"
#include "platform/race_detector.h"

BlockMutex goBlockMutex;

namespace {

HNativeLock goLock;                                                     // inside goBlockMutex
HNativeThread* gpoNewest ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;    // all blocks, by mpoOlder
HNativeThread* gpoFree ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;      // Ended, no waiter
HNativeThread* gpoUnreaped ZANBASE_GUARDED_BY(goBlockMutex) = nullptr;  // Killed, no waiter
pthread_key_t gnExitKey;  // the value is the thread's block until that is Ended

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

// Release: a thread that finds the slot empty sees what the ended thread wrote.
void EmptySlot(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex) {
    if (block->mpoSlot == nullptr) return;
    NoteRelease(block->mpoSlot);
    block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

// TLS destructor of gnExitKey. Destructors run in up to four passes while one re-sets its value; re-arming
// twice makes this one run in pass 3, after ordinary destructors. Pass 4 is the sanitizers'.
void OnExitKey(void* value) {
    constexpr unsigned int kPass = 3;
    auto* const block = static_cast<HNativeThread*>(value);
    if (toSelf.mpoBlock == block) {
        // pthread_exit ended the body below a C frame without unwind tables, so it could not unwind RunBody.
        toSelf.mpoFrame = nullptr;
        if (!CloseBlock(block)) return;
    }
    if (++toSelf.mnExitPasses < kPass && pthread_setspecific(gnExitKey, block) == 0) return;
    {
        const BlockLock lock;
        if (block->mState != ThreadState::Exiting) return;  // killed, and returned by RunUntilKilled
        MarkEnded(block);
    }
    WakeWaiters(block);
}

// Clears what leads to the threads that the child of a fork does not have: all but the calling one.
void ReleaseInChild() noexcept ZANBASE_RELEASE(goBlockMutex) {
    toSelf.mnNumber = 0;
    if (toSelf.mpoBlock == nullptr) pthread_setspecific(gnExitKey, nullptr);  // forked by a TLS destructor
    gpoFree = gpoUnreaped = nullptr;
    for (HNativeThread* block = gpoNewest; block != nullptr; block = block->mpoOlder) {
        block->mnWaiters = 0;
        if (block == toSelf.mpoBlock) {
            block->mnNumber = CurrentThreadId();
        } else {
            EmptySlot(block);
            MarkEnded(block);
        }
    }
    goBlockMutex.Release();
}

void AcquireBeforeFork() noexcept ZANBASE_ACQUIRE(goBlockMutex) { goBlockMutex.Acquire(); }
void ReleaseInParent() noexcept ZANBASE_RELEASE(goBlockMutex) { goBlockMutex.Release(); }

__attribute__((constructor)) void Prepare() {
    InitLock(&goLock);
    if (pthread_key_create(&gnExitKey, OnExitKey) != 0) gnExitKey = PTHREAD_KEYS_MAX;  // setting it fails
    pthread_atfork(AcquireBeforeFork, ReleaseInParent, ReleaseInChild);
}

}  // namespace

// The steps of the lock itself, which no race detector is shown. Every start and end of a thread acquires
// this mutex; shown, it would order threads that have nothing else in common and hide their races.
void BlockMutex::Acquire() noexcept ZANBASE_NO_THREAD_SAFETY_ANALYSIS {  // this is the primitive
    DeferKill::Begin();
    In(&goLock).Acquire(LockThread());
}

void BlockMutex::Release() noexcept ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
    In(&goLock).Release(tnLockThread);
    DeferKill::End();
}

HNativeThread* OpenBlock(ThreadSlot& slot) noexcept {
    const BlockLock lock;
    HNativeThread* const block = NewBlock();
    if (block == nullptr) return nullptr;
    block->mpoSlot = &slot;
    block->mState = ThreadState::Starting;
    block->mnPriority = kNormalPriority;
    // A new thread inherits the nice value of the thread that makes it.
    block->mbPriorityPending = toSelf.mpoBlock != nullptr && toSelf.mpoBlock->mnPriority != kNormalPriority;
    block->mbKillRequested = false;
    block->moLastPlace = {};
    slot.store(block, std::memory_order_release);
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
    block->mState = ThreadState::Running;
    pthread_setspecific(gnExitKey, block);  // if this fails, a pthread_exit past RunBody is not noticed
}

bool CloseBlock(HNativeThread* block) noexcept {
    RemoveSignalStack();  // the next thread of the block uses the same memory
    const BlockLock lock;
    toSelf.mpoBlock = nullptr;
    toSelf.mbKillPending = false;
    EmptySlot(block);  // no further waiter can come
    pthread_detach(block->moThread);
    const bool has_waiters = block->mnWaiters != 0;
    if (has_waiters && pthread_setspecific(gnExitKey, block) == 0) {
        block->mState = ThreadState::Exiting;
        return true;
    }
    pthread_setspecific(gnExitKey, nullptr);
    MarkEnded(block);
    if (has_waiters) WakeWaiters(block);
    return false;
}

void MarkKilled(HNativeThread* block) noexcept {
    EmptySlot(block);
    block->mState = ThreadState::Killed;
    if (block->mnWaiters == 0) Push(gpoUnreaped, block);
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
}

void MarkEnded(HNativeThread* block) noexcept {
    NoteRelease(block);
    block->mState = ThreadState::Ended;
    if (block->mnWaiters == 0) Push(gpoFree, block);
    block->mnGeneration.fetch_add(1, std::memory_order_relaxed);
}

void RemoveWaiter(HNativeThread* block) noexcept {
    toSelf.mpoAwaited = nullptr;
    if (--block->mnWaiters != 0) return;
    if (block->mState == ThreadState::Ended) Push(gpoFree, block);
    if (block->mState == ThreadState::Killed) Push(gpoUnreaped, block);
}

HNativeThread* TakeUnreaped() noexcept { return Pop(gpoUnreaped); }
