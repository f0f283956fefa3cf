// The control block of a thread, to which its slot points.
//
// The users of a block share it: its thread, until that has left the body or was killed, and each thread that waits
// for it. The last user deletes it. A waiter that is killed never removes itself, so its block is never deleted.
#ifndef ZANBASE_PLATFORM_WINDOWS_THREAD_BLOCK_H
#define ZANBASE_PLATFORM_WINDOWS_THREAD_BLOCK_H

#include "platform/thread.h"
#include "platform/windows/spin_lock.h"

// The lock for all blocks and slots. A thread is killed under this lock, so none is killed while it holds the lock.
inline SpinLock goBlockLock;

// Guarded by goBlockLock, but for the fields that say otherwise.
struct HNativeThread {
    ThreadSlot* mpoSlot;         // null once the thread has no owner
    void (*mpfnBody)(void*);     // constant once mnId is set
    void* mpoArgument;           // constant
    HANDLE mpoHandle = nullptr;  // constant once the slot points here
    DWORD mnId = 0;              // 0 until the thread is about to enter its body
    int mnUsers = 1;
};

// Empties the slot if it still points to the block. Requires: goBlockLock is held.
void EmptySlot(HNativeThread* block) noexcept;

// Removes one user, and deletes the block after the last. Requires: goBlockLock is not held.
void RemoveUser(HNativeThread* block) noexcept;

#endif
