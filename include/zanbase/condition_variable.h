/// @file
/// The condition variable: sleeping until another thread says that something has changed.
#ifndef ZANBASE_CONDITION_VARIABLE_H
#define ZANBASE_CONDITION_VARIABLE_H

#include "zanbase/export.h"
#include "zanbase/mutex.h"

/// @addtogroup locks
/// @{

struct HNativeCondition;

/// A condition variable that is waited for with a `HMutex`.
///
///     HMutexLock lock(&mutex);
///     while (jobs.empty()) condition.Wait(mutex);  // the other side: add a job, then Signal()
///
/// A waiter sleeps once and does not loop: it may return for no reason, or after another thread has already
/// taken what it was woken for, so the caller tests its condition again under the mutex. A wake-up with
/// nobody waiting is lost; where it must be remembered, use a `HSemaphore`.
///
/// A wait gives back exactly one level of the mutex. A thread that owns the mutex more than once keeps the
/// others out while it sleeps, and with them whoever should wake it.
///
/// Any number of threads may call any of the operations at the same time. Which waiter a `Signal` wakes is
/// open. On Linux a waiter that is ended by `HThread::Kill` takes no wake-up of the others with it; on Windows
/// it may hold up later waiters. Nobody may be
/// inside any of the operations when a condition variable is destroyed.
class ZANBASE_API HCondVar {
public:
    /// Takes a small block from `malloc`; throws `std::bad_alloc` if there is none.
    HCondVar();
    ~HCondVar();

    /// Wakes one waiter, if there is any.
    void Signal() const;

    /// Wakes all threads that wait now.
    void Broadcast() const;

    /// Lets go of `mutex`, sleeps until a wake-up, and owns the mutex again on return. The calling thread
    /// owns `mutex` exactly once.
    void Wait(const HMutex& mutex) const;

    /// The same for at most `seconds`, which are cut to whole milliseconds: true if it was woken, false if
    /// the time ran out. The mutex is owned on return in both cases, which may take longer than the limit.
    /// Less than a millisecond lets the mutex go and takes it again without a sleep, and gives false; so do
    /// negative times and what is no number. A limit of 4294967.295 s or more never runs out.
    bool TryWait(const HMutex& mutex, double seconds) const;

private:
    HCondVar(const HCondVar&) {}
    HCondVar& operator=(const HCondVar&) { return *this; }

    HNativeCondition* mpoCondition = nullptr;  // owned; set by the constructor and never changed
};

/// @}

#endif
