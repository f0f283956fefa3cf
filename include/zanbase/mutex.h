/// @file
/// The re-entrant mutex and its scoped holder. All other locks and the library's global tables use them.
///
/// Lock order: no operation of the library waits for the mutex of one of its tables while it holds that of
/// another. A program that holds several mutexes at once must acquire them in one order everywhere; otherwise its
/// threads can deadlock. While its own code runs under the mutex of a table, as `operator new` or in a class
/// derived from `HMemory`, that mutex is one of them.
#ifndef ZANBASE_MUTEX_H
#define ZANBASE_MUTEX_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup locks
/// @{

struct HNativeLock;

/// A re-entrant mutex: the thread that owns it can acquire it again without blocking, up to 2^32 levels deep on
/// Linux and 2^31 - 1 on Windows. It is free again once that thread has released it as often as it acquired it.
///
///     HMutex mutex;
///     {
///         HMutexLock lock(&mutex);
///         // one thread at a time
///     }
///
/// Thread-safe: any number of threads may call any operation of one mutex at the same time. Releasing
/// happens-before the next acquisition. There is no fairness: a thread that releases and acquires again can
/// overtake waiting threads. There is no acquisition with a timeout; `HSemaphore` has one.
///
/// The lock itself is in a block of its own, to which the object points. If the object shares a cache line with
/// data that threads write, each hand-over between processors moves two lines and takes about twice as long as
/// with an object that has its line to itself (`alignas(64)`).
///
/// Misuse is not detected: releasing by a thread that does not own the mutex, releasing too often, and
/// destroying an owned mutex have undefined behaviour. A thread killed by `HThread::Kill` while it owns a
/// mutex owns it for ever; a killed waiter does not hold up other waiters on Linux; on Windows it may. After
/// `fork` the child's thread owns what the forking thread owned; mutexes of other threads stay owned for ever
/// there. Not async-signal-safe.
class ZANBASE_API HMutex {
public:
    /// Makes a free mutex. Allocates its lock with `HMalloc`, which states what happens if memory is exhausted.
    HMutex();
    /// Requires: no thread owns the mutex or waits for it. Not thread-safe.
    ~HMutex();

    /// Acquires one level of ownership. Blocks while another thread owns the mutex; returns at once if the
    /// calling thread owns it already. Thread-safe.
    void Lock() const;

    /// Acquires one level of ownership if no other thread owns the mutex, and never blocks. Returns true if it
    /// did; then one `Unlock` must follow, also if the calling thread owned the mutex before. Thread-safe.
    [[nodiscard]] bool TryLock() const;

    /// Releases one level of ownership. Requires: the calling thread owns the mutex. Thread-safe.
    void Unlock() const;

private:
    HMutex(const HMutex&) {}
    HMutex& operator=(const HMutex&) { return *this; }

    friend class HCondVar;
    friend struct HLockOwner;

    HNativeLock* mpoCriticalSection = nullptr;  // owned; set by the constructor and never changed
};

/// Holds one level of ownership of an `HMutex` for a scope, or nothing.
///
/// Not thread-safe: an object belongs to the thread that made it, and must be released on that thread. It
/// can't be made with `new`. Copying or assigning from an object of another thread that holds a mutex blocks
/// until that thread has released it.
class ZANBASE_API HMutexLock {
public:
    /// Acquires `mutex`; with null, or no argument, holds nothing. Requires: `mutex` outlives the hold.
    HMutexLock(const HMutex* mutex = nullptr);

    /// Acquires one more level of the mutex that `other` holds, if any. Each object releases its own level.
    HMutexLock(const HMutexLock& other);

    /// Does what `Release` does.
    virtual ~HMutexLock();

    /// Releases what this object holds, then acquires the mutex that `other` held at the start of the call.
    /// An object assigned to itself releases its mutex for a moment and acquires it again.
    HMutexLock& operator=(const HMutexLock& other);

    /// Releases what this object holds; does nothing if it holds nothing.
    void Release();

    /// Releases what this object holds, then acquires `mutex` if it is not null. Never holds both at once.
    void Reset(const HMutex* mutex);

    /// The mutex held now, or null.
    [[nodiscard]] const HMutex* GetMutex() const;

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }
    static void* operator new[](std::size_t) noexcept { return nullptr; }

    const HMutex* mpoMutex;  // not owned; null while nothing is held
};

/// @}

#endif
