// The control block of a thread: what its owner, those who wait for it and the thread itself share.
//
//   state      entered by                                     left by
//   Starting   StartThread                                    the thread's first step; to Gone if none was made
//   Live       the thread's first step                        the end of its body, or its death
//   Leaving    the end of the body, somebody waiting          the last of the thread's exit routines
//   Dead       the thread, where it was ended                 a waiter, or the next StartThread, who joins it
//   Joining    who joins it                                   the same, when the system's thread is gone
//   Gone       the end of the body, nobody waiting; above     a new StartThread
//
// A slot leads to a block only while it is Starting or Live, and not even then once the thread was forgotten.
// A thread that comes to its end detaches itself. One that died can't: the C library has not seen it go, and
// reclaims its stack when somebody joins it.
//
// A block goes on the free list when it is Gone and nobody waits any more. It never goes back to the heap, so
// a wake-up that comes late finds memory.
//
// One lock guards all blocks and lists. It is held for a few instructions, always under a shield, so no
// thread is ended while it holds the lock or waits for it.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_BLOCK_H
#define ZANBASE_PLATFORM_LINUX_THREAD_BLOCK_H

#include <atomic>
#include <cstddef>
#include <cstdint>

#include <pthread.h>

#include "platform/linux/thread_self.h"

enum class ThreadState { Starting, Live, Leaving, Dead, Joining, Gone };

// Where a thread stands: the instruction and the end of its stack.
struct ThreadPlace {
    std::uintptr_t mnCode;
    std::uintptr_t mnStack;
};

// Room for the signal handlers of a thread that has used up its stack, a program's own crash handler
// included.
constexpr std::size_t kHandlerStackBytes = 32768;

constexpr int kNormalPriority = 3;  // the level of the process itself

struct HNativeThread {
    // Constant while the thread lives.
    void (*mpfnBody)(void*);
    void* mpoArgument;
    HNativeThread* mpoOlder;  // the block made before this one
    void* mpoHandlerStack;    // owned; kHandlerStackBytes

    // Guarded by the block lock.
    HNativeThread* mpoNext;  // on the free list or the list of the unjoined
    ThreadSlot* mpoSlot;     // the slot that leads here, or null
    ThreadState mState;
    unsigned int mnWaiters;  // threads inside JoinThread or KillThread
    pthread_t moThread;      // from Live on
    unsigned int mnNumber;   // from Live on
    int mnPriority;          // the one wanted
    bool mbPriorityPending;  // left to the first step to apply

    FutexWord mnGeneration;  // goes up, under the block lock, whenever waiters have to look again

    std::atomic<bool> mbEndRequested;  // never taken back
    unsigned int mnAskedAt;            // the tick when it was requested first

    // Used by the thread's own signal handler alone: where it was found last, and since which tick.
    ThreadPlace moLastPlace;
    unsigned int mnLastPlaceSince;
};

// Holds the block lock for a scope.
class BlockLock {
public:
    BlockLock() noexcept { Take(); }
    ~BlockLock() { Give(); }
    BlockLock(const BlockLock&) = delete;
    BlockLock& operator=(const BlockLock&) = delete;

    static void Take() noexcept;
    static void Give() noexcept;
};

// A block in state Starting for `slot`, which leads to it from now on; null if there is no memory.
HNativeThread* OpenBlock(ThreadSlot& slot) noexcept;

// No thread came of the block.
void AbandonBlock(HNativeThread* block) noexcept;

// The calling thread, that of the block, has come to the end of its body.
void CloseBlock(HNativeThread* block) noexcept;

// The calling thread, that of the block, dies, and waits for nobody any more.
void MarkBlockDead(HNativeThread* block) noexcept;

// Makes the calling thread a waiter of the block in `slot`, unless it is its own, and gives the block; null
// if the slot is empty.
HNativeThread* AddWaiter(ThreadSlot& slot) noexcept;

// Waits, as a waiter of the block, until its thread has ended, and leaves.
void WaitForThreadEnd(HNativeThread* block) noexcept;

// Sleeps, as a waiter of the block and not under the block lock, until there is more news than `seen`.
void WaitForNewGeneration(HNativeThread* block, unsigned int seen) noexcept;

// Tells the waiters to look again.
void NotifyWaiters(HNativeThread* block) noexcept;

// Joins the threads that died with nobody waiting.
void JoinTheUnjoined() noexcept;

#endif
