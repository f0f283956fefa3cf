// Contract: the re-entrant lock under HMutex, and the numbers that identify owners of locks.
#ifndef ZANBASE_PLATFORM_LOCK_H
#define ZANBASE_PLATFORM_LOCK_H

// Storage for one lock. Its content, which only the back end knows, holds no pointer to itself and needs no
// alignment beyond 8.
struct HNativeLock {
    alignas(8) unsigned char storage[64];
};

// Makes the lock ready and free. Can't fail.
void InitLock(HNativeLock* lock) noexcept;

// Destroys a lock. Requires: no thread owns it.
void DestroyLock(HNativeLock* lock) noexcept;

// Acquires one level of ownership; waits while another thread owns the lock. A lock whose owner was killed by
// KillThread stays held for ever. A waiter must not be killed, unless the back end says that it may: the lock may refer
// to its stack. Thread-safe, as the next two.
void AcquireLock(HNativeLock* lock) noexcept;

// The same without waiting; false if another thread owns the lock.
bool TryAcquireLock(HNativeLock* lock) noexcept;

// Releases one level; at level zero the lock is free. Requires: the calling thread owns the lock.
void ReleaseLock(HNativeLock* lock) noexcept;

// True if the calling thread owns the lock. Thread-safe.
bool OwnsLock(const HNativeLock* lock) noexcept;

// A number for the calling thread, constant for its life and below 2^64 - 1; no other living thread of the
// process has it. Where the system can fork, the child's thread has the number of the forking thread.
unsigned long long LockOwner() noexcept;

#endif
