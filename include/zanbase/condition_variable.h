/// @file
/// The condition variable: a thread sleeps until another thread signals that a condition may have changed.
#ifndef ZANBASE_CONDITION_VARIABLE_H
#define ZANBASE_CONDITION_VARIABLE_H

#include "zanbase/export.h"
#include "zanbase/mutex.h"

/// @addtogroup locks
/// @{

struct HNativeCondition;

/// A condition variable that is used with an `HMutex`.
///
///     HMutexLock lock(&mutex);
///     while (jobs.empty()) condition.Wait(mutex);  // the other side: add a job, then Signal()
///
/// Spurious wake-ups are possible, and another thread may consume the condition first: always wait in a loop
/// that tests the condition under the mutex. A wake-up without a waiter is lost; use an `HSemaphore` where it
/// has to be remembered.
///
/// Thread-safe: any number of threads may call any operation at the same time. Which waiter `Signal` wakes is
/// unspecified. On Linux a waiter killed by `HThread::Kill` consumes no wake-up of the others; on Windows it may
/// hold up later waiters. Not async-signal-safe.
class ZANBASE_API HCondVar {
public:
    /// Allocates a small block with `malloc`; throws `std::bad_alloc` if that fails.
    HCondVar();
    /// Requires: no thread waits, and no thread is inside any operation. Not thread-safe.
    ~HCondVar();

    /// Wakes one waiter, if there is any. The caller need not own the mutex. Thread-safe.
    void Signal() const;

    /// Wakes all threads that wait now. The caller need not own the mutex. Thread-safe.
    void Broadcast() const;

    /// Releases `mutex`, sleeps until a wake-up, and acquires `mutex` again before it returns. Releasing and
    /// beginning to wait are one step for threads that acquire the mutex. Thread-safe.
    ///
    /// Requires: the calling thread owns `mutex` exactly once. At a deeper level the mutex stays owned during
    /// the sleep, and a thread that needs it to signal deadlocks with the waiter.
    void Wait(const HMutex& mutex) const;

    /// Does what `Wait` does for at most `seconds`, cut to whole milliseconds. True if it was woken, false on
    /// a timeout; the mutex is owned on return in both cases, and acquiring it may take longer than the
    /// limit. Less than a millisecond, a negative time and a NaN release the mutex and acquire it again
    /// without a sleep, and return false. A limit of 4294967.295 s or more never expires. Requires: as
    /// `Wait`. Thread-safe.
    bool TryWait(const HMutex& mutex, double seconds) const;

private:
    HCondVar(const HCondVar&) {}
    HCondVar& operator=(const HCondVar&) { return *this; }

    HNativeCondition* mpoCondition = nullptr;  // owned; set by the constructor and never changed
};

/// @}

#endif
