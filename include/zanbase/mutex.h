/// @file
/// The re-entrant mutex and its scoped holder, on which every other lock and global table stands.
#ifndef ZANBASE_MUTEX_H
#define ZANBASE_MUTEX_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup locks
/// @{

struct HNativeLock;

/// A re-entrant mutex: the thread that owns it may take it again without blocking, and it becomes free once
/// that thread has given it back as often as it took it.
///
///     HMutex mutex;
///     { HMutexLock lock(&mutex);  /* one thread at a time */ }
///
/// Any number of threads may use one mutex. Nothing is promised about who of several waiters comes next, and
/// there is no form with a time limit; a `HSemaphore` has one. Misuse is not detected: only the owner may
/// unlock, no more often than it locked, and a mutex that is owned must not be destroyed. A thread that was
/// ended by `HThread::Kill` while it owned a mutex owns it for ever. A waiter that was ended does not hold up
/// other waiters on Linux; on Windows it may.
class ZANBASE_API HMutex {
public:
    /// A free mutex. Its lock object lives in a heap block of its own; see `HMalloc` for exhausted memory.
    HMutex();
    ~HMutex();

    /// Blocks until the calling thread owns the mutex; returns at once if it owns it already.
    void Lock() const;

    /// Never blocks. True if the calling thread now owns the mutex, also if it owned it before; it then owes
    /// one `Unlock`. False if another thread owns it.
    [[nodiscard]] bool TryLock() const;

    /// Gives back one level of ownership.
    void Unlock() const;

private:
    HMutex(const HMutex&) {}
    HMutex& operator=(const HMutex&) { return *this; }

    friend class HCondVar;

    HNativeLock* mpoCriticalSection = nullptr;  // owned; set by the constructor and never changed
};

/// Holds one level of ownership of a `HMutex` for a scope, or nothing.
///
/// An object belongs to the thread that made it, and releases on that thread. It can't be made with `new`.
/// Copying or assigning from an object of another thread that holds a mutex waits until that thread lets go.
class ZANBASE_API HMutexLock {
public:
    /// Locks `mutex`, which must outlive the hold; with null, or no argument, holds nothing.
    HMutexLock(const HMutex* mutex = nullptr);

    /// Locks once more the mutex that `other` holds now, if any; each of the two gives its own level back.
    HMutexLock(const HMutexLock& other);

    /// As `Release`.
    virtual ~HMutexLock();

    /// Releases what this object holds, then locks the mutex that `other` held at the start of the call. So
    /// an object assigned to itself lets its mutex go for a moment and takes it again.
    HMutexLock& operator=(const HMutexLock& other);

    /// Unlocks what is held, if anything; a second call does nothing.
    void Release();

    /// Releases what is held, then locks `mutex` if it is not null. Two mutexes are never held at once.
    void Reset(const HMutex* mutex);

    /// The mutex held now, or null.
    [[nodiscard]] const HMutex* GetMutex() const;

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }

    const HMutex* mpoMutex;  // not owned; non-null exactly while this object owes it one Unlock
};

/// @}

#endif
