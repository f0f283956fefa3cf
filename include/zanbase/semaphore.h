/// @file
/// The counting semaphore and its scoped holder.
#ifndef ZANBASE_SEMAPHORE_H
#define ZANBASE_SEMAPHORE_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup locks
/// @{

struct HNativeSemaphore;

/// A counting semaphore: `Lock` acquires a unit and waits while there is none, `Unlock` releases one.
///
///     HSemaphore done(0);
///     StartJob([&] { Work(); done.Unlock(); });
///     done.Lock();                                  // returns when the job has released its unit
///
/// A unit has no owner: any thread may release one, also a thread that acquired none; the count then rises.
/// So a semaphore is not re-entrant. Prefer an `HMutex` for mutual exclusion.
///
/// Thread-safe: any number of threads may call any operation at the same time. Releasing a unit
/// happens-before its acquisition. Which waiter gets a unit is unspecified. A waiter killed by
/// `HThread::Kill` consumes no unit of the others. Not async-signal-safe.
class ZANBASE_API HSemaphore {
public:
    /// Makes a semaphore with `count` free units, at most 2147483647; a larger count is cut to that. Throws
    /// `std::bad_alloc` if memory is exhausted.
    HSemaphore(unsigned int count = 1);
    /// Requires: no thread waits. A thread that has acquired a unit may destroy the semaphore although the
    /// thread that released the unit is still inside `Unlock`.
    ~HSemaphore();

    /// Acquires one unit; blocks while there is none. Thread-safe.
    void Lock() const;

    /// Acquires one unit if there is one within `seconds`, cut to whole milliseconds. True if it did, false
    /// on a timeout. Less than a millisecond, a negative time and a NaN are a test without a wait. A limit of
    /// 4294967.295 s or more never expires. Thread-safe.
    bool TryLock(double seconds) const;

    /// Releases one unit; does nothing at 2147483647 free units. Thread-safe.
    void Unlock() const;

private:
    HSemaphore(const HSemaphore&) {}
    HSemaphore& operator=(const HSemaphore&) { return *this; }

    HNativeSemaphore* mpoHandle = nullptr;  // owned; set by the constructor and never changed
};

/// Holds one unit of an `HSemaphore` for a scope, or nothing.
///
/// Not thread-safe: an object belongs to one thread at a time; another thread may release it later. It can't
/// be made with `new`. A copy acquires a unit of its own: if its source holds the last unit and no other
/// thread releases one, the copy deadlocks.
class ZANBASE_API HSemaphoreLock {
public:
    /// Acquires a unit of `semaphore`; with null holds nothing. Requires: `semaphore` outlives the hold.
    HSemaphoreLock(HSemaphore* semaphore);

    /// Acquires one more unit of the semaphore that `other` holds a unit of, if any. Each object releases its
    /// own unit.
    HSemaphoreLock(const HSemaphoreLock& other);

    /// Does what `Release` does.
    virtual ~HSemaphoreLock();

    /// Releases what this object holds, then acquires a unit of the semaphore that `other` held one of at the
    /// start of the call. An object assigned to itself releases its unit and acquires one again.
    HSemaphoreLock& operator=(const HSemaphoreLock& other);

    /// Releases the unit; does nothing if the object holds none.
    void Release();

    /// Releases what this object holds, then acquires a unit of `semaphore` if it is not null.
    void Reset(HSemaphore* semaphore);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }
    static void* operator new[](std::size_t) noexcept { return nullptr; }

    HSemaphore* mpoSemaphore;  // not owned; null while nothing is held
};

/// @}

#endif
