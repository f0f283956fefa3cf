/// @file
/// Named timers of the whole process, which add up over OpenMP threads.
#ifndef ZANBASE_GLOBAL_TIMER_H
#define ZANBASE_GLOBAL_TIMER_H

#include <string>

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

struct GlobalTimerSnapshot;

/// The process's flat list of cumulative timers. There is one instance.
///
///     static const auto load = GlobalTimer::GetInstance().RegisterNewTimer("load");
///     GlobalTimer::GetInstance().Toggle(load);   // starts it on this thread
///     Load();
///     GlobalTimer::GetInstance().Toggle(load);   // stops it
///
/// Each timer has a slot for each OpenMP thread number, stopped or running, and a report adds the slots up.
/// Timers overlap freely. The clock is that of `GetMicroSeconds`: intervals within one millisecond add 0, and
/// setting the system time shows in the totals.
///
/// When the process exits, or calls `exit`, the report is printed once more on `std::cout`, also if `Report`
/// was called before; a process that never asked for the instance prints nothing. The timers are gone then:
/// threads that toggle have to be through by that time, and an object with static storage that uses the
/// timers in its destructor asks for the instance in its constructor, so that they outlive it.
///
/// Not for threads that OpenMP gives the same number: outside parallel regions that is 0 for every thread,
/// and nested teams number theirs from 0 again. Such threads have to toggle one after the other. Not for
/// short code either: a pair of toggles costs about two clock readings.
class ZANBASE_API GlobalTimer {
public:
    /// The one instance, built at the first call; any thread may make that. `std::bad_alloc` leaves it to the
    /// next call.
    static GlobalTimer& GetInstance();

    /// Adds a timer and returns its identifier; identifiers count up from 0. Names need not differ;
    /// each registration is a timer of its own. No other call may be in progress, so as a rule it is made
    /// outside parallel regions. `std::bad_alloc` leaves the timers as they were.
    unsigned long long RegisterNewTimer(std::string name);

    /// Starts timer `id` on the calling thread's number if it is stopped there, else stops it and adds the
    /// interval. What other threads started is not touched. `id` must come from `RegisterNewTimer`; it is not
    /// tested.
    ///
    /// Threads that OpenMP numbers differently may toggle at the same time: no lock is taken, no memory
    /// allocated and no shared word written, except once for a number at or above `OMPGetMaxThreads()` as it
    /// was when the instance was built. There `std::bad_alloc` leaves the timers as they were.
    void Toggle(unsigned long long id);

    /// Prints a line "name: seconds" for each timer on `std::cout`, in the number format that the stream is
    /// set to, from the smallest total to the largest, and flushes it. Open intervals count for nothing and
    /// go on. Prints nothing if no timer is registered. No other call may be in progress.
    void Report() const;

    /// Stops every timer on every thread, drops open intervals and sets all totals to 0. Names and
    /// identifiers stay. No other call may be in progress.
    void ResetAll();

    /// Prints the report.
    ~GlobalTimer();

    /// With one instance this can only assign it to itself.
    GlobalTimer& operator=(const GlobalTimer&);

private:
    friend struct GlobalTimerSnapshot;  // reads the rows
    struct TimerSlot;
    struct Impl;

    GlobalTimer();
    GlobalTimer(const GlobalTimer&) {}

    Impl* mpoImpl = nullptr;  // owned
};

/// @}

#endif
