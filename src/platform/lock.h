// Contract: the re-entrant lock under HMutex.
#ifndef ZANBASE_PLATFORM_LOCK_H
#define ZANBASE_PLATFORM_LOCK_H

// Storage for one lock. It holds no pointer to itself and needs no alignment beyond this. The back end alone
// knows what lies inside.
struct HNativeLock {
    alignas(8) unsigned char storage[64];
};

// Makes the lock ready and free. Can't fail.
void InitLock(HNativeLock* lock) noexcept;

// Ends a lock that nobody owns.
void DestroyLock(HNativeLock* lock) noexcept;

// Waits until the calling thread owns the lock; a thread that owns it already passes at once and owes one
// more ReleaseLock. A lock whose owner was ended by KillThread stays held for ever. A waiter that was ended may
// hold up later waiters on some systems; where it doesn't, the back end says so.
void AcquireLock(HNativeLock* lock) noexcept;

// The same without waiting; false if another thread owns the lock.
bool TryAcquireLock(HNativeLock* lock) noexcept;

// Gives back one level of the calling thread's ownership; at level zero the lock is free.
void ReleaseLock(HNativeLock* lock) noexcept;

#endif
