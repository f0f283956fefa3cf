/// @file
/// The wall clock as a double, and a stopwatch over it.
///
/// All times come from the system's wall clock at a resolution of one millisecond, counted from 1970-01-01
/// 00:00:00 UTC. The clock moves when the system time is set, so the difference of two readings can be wrong
/// or negative. Where that matters, or where a millisecond is too coarse, use `std::chrono::steady_clock`.
///
/// Thread-safety: the functions are thread-safe. Nothing here fails.
#ifndef ZANBASE_CLOCK_H
#define ZANBASE_CLOCK_H

#include <string>

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

/// The wall clock in microseconds; always a multiple of 1000. Thread-safe.
[[nodiscard]] ZANBASE_API double GetMicroSeconds();

/// The wall clock in milliseconds. Thread-safe.
[[nodiscard]] ZANBASE_API double GetMilliSeconds();

/// The wall clock in seconds, with milliseconds as its fraction. Thread-safe.
[[nodiscard]] ZANBASE_API double GetTimeInSeconds();

/// A stopwatch: it runs from its construction or the last `Reset` and can't be paused.
///
///     HTimer timer;
///     Work();
///     std::puts(timer.GetTimeAsString().c_str());   // "12.250 seconds", or "1h01m01s"
///
/// Not for intervals near a millisecond, nor for work that is spread over threads: `GlobalTimer` adds that
/// up.
///
/// Thread-safety: the const operations on one timer may run on several threads at once. `Reset` requires that
/// no other call on the same timer is in progress.
class ZANBASE_API HTimer {
public:
    /// Starts the stopwatch.
    HTimer();
    virtual ~HTimer();

    /// Restarts the stopwatch.
    void Reset();

    /// The time since the start; negative if the system time was set back meanwhile.
    [[nodiscard]] double GetTimeInSeconds() const;
    [[nodiscard]] double GetTimeInMinutes() const;  ///< The same in minutes.
    [[nodiscard]] double GetTimeInHours() const;    ///< The same in hours.

    /// The time since the start as text. From a minute on it has weeks, days, hours, minutes and seconds,
    /// without leading units that are zero and without a fraction: "1m00s", "10w00d00h00m00s". From a second
    /// on it is "1.000 seconds", below that, and if negative, "250.000 milliseconds". From 2^31 seconds on it
    /// is in seconds again.
    [[nodiscard]] std::string GetTimeAsString() const;

protected:
    /// For derived classes that are copied: the copy starts now, whatever its source.
    HTimer(const HTimer&);

    /// Leaves this timer as it is.
    HTimer& operator=(const HTimer&);

private:
    double mdStartTime;  // seconds since the epoch
};

/// @}

#endif
