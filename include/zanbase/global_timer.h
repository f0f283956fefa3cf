/// @file
/// Named timers of the whole process, which add up over OpenMP threads.
#ifndef ZANBASE_GLOBAL_TIMER_H
#define ZANBASE_GLOBAL_TIMER_H

#include <string>

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

/// The process's flat list of cumulative timers. There is one instance.
///
///     const auto load = GlobalTimer::GetInstance().RegisterNewTimer("load");
///     #pragma omp parallel
///     {
///         GlobalTimer::GetInstance().Toggle(load);   // starts it on this thread
///         Load();
///         GlobalTimer::GetInstance().Toggle(load);   // stops it
///     }
///
/// Each timer has a slot for each OpenMP thread number, stopped or running, and a report adds the slots up.
/// Timers overlap freely. The clock is that of `GetMicroSeconds`: intervals within one millisecond add 0, and
/// setting the system time changes the totals.
///
/// **Exit.** When the process returns from `main` or calls `exit`, the report is printed once more on
/// `std::cout`, even if `Report` was called before; a process that never asked for the instance prints
/// nothing. A child made by `fork` that calls `exit` prints it too, with the totals of its parent: end such a
/// child with `_exit`. The instance is destroyed with that report. Requires: no thread toggles by then.
/// Destructors of static objects and `atexit` handlers may use the timers only if they were constructed or
/// registered after the first `GetInstance`. On Windows the report comes when the system detaches the DLL from the
/// ending process: after the exit handlers and static objects of the program, with no other thread left. The DLL stays
/// loaded until then, also after `FreeLibrary`.
/// The report acquires no lock of this library: a thread that was killed inside `RegisterNewTimer` or `Toggle` does
/// not block the exit.
///
/// **Thread numbers.** Threads with the same OpenMP number share slots and must toggle one after the other.
/// Outside parallel regions every thread has number 0, and nested teams number theirs from 0 again. In a process
/// with two OpenMP runtimes all members of a team of the other runtime have number 0, too; zanbase/openmp.h shows
/// how to detect that.
///
/// Not for short code: a pair of toggles costs about two clock readings.
///
/// Thread-safety: `GetInstance`, `RegisterNewTimer` and `Toggle` are thread-safe, with the limits stated there;
/// `Report` and `ResetAll` are not.
class ZANBASE_API GlobalTimer {
public:
    /// The one instance, created by the first call. Thread-safe. After a `std::bad_alloc` the next call tries
    /// again. Requires: no other thread is in the first call while the process forks.
    static GlobalTimer& GetInstance();

    /// Adds a timer and returns its identifier; identifiers count up from 0. Names need not differ: each
    /// registration is a timer of its own. `std::bad_alloc` leaves the timers as they were. Thread-safe, also
    /// while other threads register and toggle; acquires no lock. Requires: no `Report` and no `ResetAll` is in
    /// progress.
    unsigned long long RegisterNewTimer(std::string name);

    /// Starts timer `id` on the calling thread's number if it is stopped there; otherwise stops it and adds
    /// the interval. Slots of other threads are not changed. Requires: `id` comes from `RegisterNewTimer`; it
    /// is not checked.
    ///
    /// Thread-safe for threads with different OpenMP numbers. No lock is acquired, no memory allocated and no
    /// shared word written, except once for a number at or above `OMPGetMaxThreads()` as it was when the
    /// instance was created. There a mutex is acquired, and `std::bad_alloc` leaves the timers as they were.
    void Toggle(unsigned long long id);

    /// Prints a line "name: seconds" for each timer on `std::cout`, in the number format of the stream, from
    /// the smallest total to the largest, and flushes it. Open intervals count for nothing and continue.
    /// Prints nothing if no timer is registered. Not thread-safe. Requires: no other call is in progress.
    void Report() const;

    /// Stops every timer on every thread, drops open intervals and sets all totals to 0. Names and
    /// identifiers stay. Not thread-safe. Requires: no other call is in progress.
    void ResetAll();

    /// Prints the report.
    ~GlobalTimer();

    /// With one instance this can only assign it to itself.
    GlobalTimer& operator=(const GlobalTimer&);

private:
    friend struct GlobalTimerAccess;  // reads the rows for snapshots
    struct TimerSlot;
    struct Impl;

    GlobalTimer();
    GlobalTimer(const GlobalTimer&) {}

    Impl* mpoImpl = nullptr;  // owned
};

/// @}

#endif
