/// @file
/// The counting semaphore and its scoped holder.
#ifndef ZANBASE_SEMAPHORE_H
#define ZANBASE_SEMAPHORE_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup locks
/// @{

struct HNativeSemaphore;

/// A counting semaphore: `Lock` takes a unit and waits while there is none, `Unlock` gives one.
///
///     HSemaphore done(0);
///     StartJob([&] { Work(); done.Unlock(); });
///     done.Lock();                                  // returns when the job has given its unit
///
/// It has no owner: any thread may give a unit, also one that never took any, and the count then simply
/// rises. So it is not re-entrant; to keep threads out of each other's way a `HMutex` is the better choice,
/// which also finds its owner's second call. Any number of threads may call any of the operations at the same
/// time, and who of several waiters gets a unit is open. A waiter that is ended by `HThread::Kill` takes no
/// unit of the others with it. A thread that has taken a unit may destroy the semaphore as soon as nobody
/// else waits for one.
class ZANBASE_API HSemaphore {
public:
    /// A semaphore with `count` free units. More than 2147483647, the most it can hold, is a caller's error
    /// and counts as that. Throws `std::bad_alloc` if there is no memory for it.
    HSemaphore(unsigned int count = 1);
    ~HSemaphore();

    /// Takes one unit; blocks as long as there is none.
    void Lock() const;

    /// Takes one unit if there is one within `seconds`, which are cut to whole milliseconds: true if it took
    /// one. Less than a millisecond is a test without a wait; so are negative times and what is no number. A
    /// limit of 4294967.295 s or more never runs out.
    bool TryLock(double seconds) const;

    /// Gives one unit; at 2147483647 free units it does nothing.
    void Unlock() const;

private:
    HSemaphore(const HSemaphore&) {}
    HSemaphore& operator=(const HSemaphore&) { return *this; }

    HNativeSemaphore* mpoHandle = nullptr;  // owned; set by the constructor and never changed
};

/// Holds one unit of a `HSemaphore` for a scope, or nothing.
///
/// An object belongs to one thread at a time; the unit itself has no owner, so another thread may release it
/// later. It can't be made with `new`. A `HSemaphoreLock` that is not copied is enough for most uses: each
/// copy waits for a unit of its own, and where the source holds the last one, for ever.
class ZANBASE_API HSemaphoreLock {
public:
    /// Takes a unit of `semaphore`, which must outlive the hold; with null holds nothing.
    HSemaphoreLock(HSemaphore* semaphore);

    /// Takes a further unit of the semaphore that `other` holds one of, if any; each of the two gives its own
    /// unit back.
    HSemaphoreLock(const HSemaphoreLock& other);

    /// As `Release`.
    virtual ~HSemaphoreLock();

    /// Releases what this object holds, then takes a unit of the semaphore that `other` held one of at the
    /// start of the call. So an object assigned to itself gives its unit back and takes one again.
    HSemaphoreLock& operator=(const HSemaphoreLock& other);

    /// Gives the unit back, if one is held; a second call does nothing.
    void Release();

    /// Releases what is held, then takes a unit of `semaphore` if it is not null.
    void Reset(HSemaphore* semaphore);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }

    HSemaphore* mpoSemaphore;  // not owned; non-null exactly while this object owes it one Unlock
};

/// @}

#endif
