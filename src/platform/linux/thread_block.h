// The control block of a thread. Its owner, its waiters and the thread itself share it.
//
//   state     meaning                                                            next state
//   Starting  made by StartThread                                                Running, or Ended if the
//                                                                                system made no thread
//   Running   the thread has made its first step                                 Leaving or Killed
//   Leaving   the body has ended; the thread exits, with its TLS destructors     Joining, or Ended when
//                                                                                no thread waits
//   Killed    the thread exits, and may still use its signal stack               Joining
//   Joining   a waiter, or the next StartThread, is joining the thread           Ended, or as before
//   Ended     only waiters use the block                                         Starting, when reused
//
// A slot points to a block only while the block is Starting or Running, and no longer after DetachThread. The
// thread itself does not access a block that is Leaving or Killed.
// A thread that is Leaving is detached when it has no waiter, or no longer one.
//
// A block that is Ended and has no waiter is put on the free list. Blocks are never deleted, so a late
// wake-up finds valid memory.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_BLOCK_H
#define ZANBASE_PLATFORM_LINUX_THREAD_BLOCK_H

#include <cstdint>

#include <pthread.h>

#include "platform/linux/futex.h"
#include "platform/thread.h"
#include "zanbase/thread_annotations.h"

// The lock for all blocks and lists. It is held for a few instructions and only while kills are deferred, so
// no thread is killed while it holds the lock or waits for it.
class ZANBASE_CAPABILITY("mutex") BlockMutex {
public:
    void Acquire() noexcept ZANBASE_ACQUIRE();
    bool TryAcquire() noexcept
        ZANBASE_TRY_ACQUIRE(true);  // for a fork, which waits for no lock while it owns another
    void Release() noexcept ZANBASE_RELEASE();
};
extern BlockMutex goBlockMutex;

// Holds the block mutex for a scope.
class ZANBASE_SCOPED_CAPABILITY BlockLock {
public:
    BlockLock() noexcept ZANBASE_ACQUIRE(goBlockMutex) { goBlockMutex.Acquire(); }
    ~BlockLock() ZANBASE_RELEASE() { goBlockMutex.Release(); }
    BlockLock(const BlockLock&) = delete;
    BlockLock& operator=(const BlockLock&) = delete;
};

enum class ThreadState { Starting, Running, Leaving, Killed, Joining, Ended };

// Where a thread is: its instruction and the top of its stack.
struct ThreadPlace {
    std::uintptr_t mnCode;
    std::uintptr_t mnStack;
};

constexpr int kNormalPriority = 3;  // the level of the process itself

struct HNativeThread {
    // Constant while the thread lives.
    void (*mpfnBody)(void*);
    void* mpoArgument;
    HNativeThread* mpoOlder;  // the block made before this one
    void* mpoSignalStack;     // owned; kSignalStackBytes

    HNativeThread* mpoNext ZANBASE_GUARDED_BY(goBlockMutex);  // on the list of free or of unjoined blocks
    ThreadSlot* mpoSlot ZANBASE_GUARDED_BY(goBlockMutex);     // the slot that points here, or null
    ThreadState mnState ZANBASE_GUARDED_BY(goBlockMutex);
    unsigned int mnWaiters ZANBASE_GUARDED_BY(goBlockMutex);  // threads inside JoinThread or KillThread
    pthread_t moThread ZANBASE_GUARDED_BY(goBlockMutex);      // valid from Running on
    unsigned int mnNumber ZANBASE_GUARDED_BY(goBlockMutex);   // valid from Running on
    int mnPriority ZANBASE_GUARDED_BY(goBlockMutex);          // the level wanted

    // Counts the events after which waiters must look at the block again. They sleep on it. Its accesses are
    // relaxed, because a waiter reads the rest of the block under the block mutex. What the thread itself has
    // written passes to the waiter by that mutex, or by pthread_join.
    FutexWord mnGeneration;

    // Written under the block mutex before the kill signal is sent, read by its handler.
    std::atomic<bool> mbKillRequested;  // stays true
    std::atomic<bool> mbOutputIsHeld;   // StandardOutputIsHeld at the last request
    unsigned int mnKillRequestedAt;     // the tick of the first request

    // Accessed only by the thread's signal handler.
    ThreadPlace moLastPlace;        // where the handler found the thread last
    unsigned int mnLastPlaceSince;  // the tick at which it found the thread there first
};

// In the child of a fork: ends the blocks of the threads that the child does not have, all but the calling one, and
// releases the block mutex.
void ReleaseBlocksInChild() noexcept ZANBASE_RELEASE(goBlockMutex);

// Makes `slot` point to a block in state Starting and returns it; null if there is no memory.
HNativeThread* OpenBlock(ThreadSlot& slot) noexcept;

// Ends a block for which the system made no thread.
void AbandonBlock(HNativeThread* block) noexcept;

// Makes `block` the calling thread's own and Running.
void EnterBlock(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex);

// Ends the calling thread's ownership of its block, which becomes Leaving or Killed, and wakes the waiters. A
// kill that was deferred is dropped.
void LeaveBlock(HNativeThread* block, ThreadState how) noexcept;

// Empties the slot and makes the block Leaving or Killed. The caller wakes the waiters after it has released
// the block mutex.
void MarkLeft(HNativeThread* block, ThreadState how) noexcept ZANBASE_REQUIRES(goBlockMutex);

// Makes the block Ended. The caller wakes the waiters, as above.
void MarkEnded(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex);

// Ends the calling thread's wait for the block.
void RemoveWaiter(HNativeThread* block) noexcept ZANBASE_REQUIRES(goBlockMutex);

// Takes a Killed block without waiters off its list; null if there is none.
HNativeThread* TakeUnjoined() noexcept ZANBASE_REQUIRES(goBlockMutex);

// Wakes the waiters of `block` after a change of its generation. The block may have been reused by then.
void WakeWaiters(HNativeThread* block) noexcept;

#endif
