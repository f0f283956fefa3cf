// Contract: locks that are held while the process is copied.
#ifndef ZANBASE_PLATFORM_FORK_H
#define ZANBASE_PLATFORM_FORK_H

// Locks, numbered from 0.
struct ForkLocks {
    static constexpr unsigned int kMost = 8;

    unsigned int count;                        // at most kMost
    bool (*try_acquire)(unsigned int number);  // false if another thread owns the lock; never waits
    void (*release)(unsigned int number);
};

// From now on each fork() owns all of `locks` on its thread while it copies the process, so that no other thread is
// inside what they guard; it releases them in the parent and in the child.
//
// fork() waits for none of them, nor for a lock of the C library, while it owns another. So a thread that owns one
// may wait for the others, open or write streams, and allocate.
//
// fork() gives up a lock that it has found owned by another thread at every attempt for five seconds: that thread
// may have been killed. It then copies the process without that lock, which stays owned in the child. A later fork()
// gives up the same lock at once, unless it finds it free.
//
// Does nothing on a system that can't copy a process. Requires: called once, while the library is loaded.
void HoldAroundFork(const ForkLocks& locks) noexcept;

#endif
