/// @file
/// Scopes that add their time to a `GlobalTimer`.
///
///     void Load() {
///         HTimedRegion("load");     // until the end of the scope
///         …
///     }
///
/// Regions of one timer nest on a thread: the time runs from the outermost one's begin to its end. Any number of threads
/// may be in one region, whether OpenMP knows them or not; the report and the snapshots of the timers add them up. So
/// a region is right where `GlobalTimer::Toggle` would share a slot between threads.
///
/// examples/adapters/scope_timer.cpp shows both forms.
#ifndef ZANBASE_ADAPTERS_SCOPE_TIMER_H
#define ZANBASE_ADAPTERS_SCOPE_TIMER_H

#include <cstdlib>
#include <new>
#include <string_view>

#include "zanbase/global_timer.h"
#include "zanbase/timed_region.h"

/// @addtogroup adapters
/// @{

/// A region: runs a timer on the calling thread until the end of the scope. Thread-safe for different objects.
/// If there is no memory for a region, `std::bad_alloc` reaches the caller.
class HTimerScope {
public:
    /// Enters a region of timer `id`, of `HTimerNamed` or `GlobalTimer::RegisterNewTimer`. Requires: the object is
    /// destroyed on this thread.
    explicit HTimerScope(unsigned long long id) : HTimerScope(id, true) {}
    /// The same if `isTimed`; otherwise does nothing.
    HTimerScope(unsigned long long id, bool isTimed) : mnId(id), mbTimed(isTimed) {
        if (mbTimed && !HEnterTimedRegion(mnId)) ZANBASE_THROW_BAD_ALLOC();
    }
    /// Leaves the region, on the thread that entered it.
    ~HTimerScope() {
        if (mbTimed) HLeaveTimedRegion(mnId);
    }
    HTimerScope(const HTimerScope&) = delete;
    HTimerScope& operator=(const HTimerScope&) = delete;

private:
    unsigned long long mnId;
    bool mbTimed;
};

/// The identifier of the timer called `name`, which is registered at the first call with this name, in whichever
/// library or plug-in of the program. Names that were registered directly are not looked up. Thread-safe, also while
/// other threads toggle.
inline unsigned long long HTimerNamed(std::string_view name) {
    unsigned long long id = 0;
    if (!HTimerIdOf(name.data(), name.size(), &id)) ZANBASE_THROW_BAD_ALLOC();
    return id;
}

/// @cond
#define ZANBASE_JOIN_NAMES(left, right) left##right
#define ZANBASE_JOIN(left, right) ZANBASE_JOIN_NAMES(left, right)
/// @endcond

/// Times the rest of the enclosing scope as `name` if `condition` is true at this place, as `HTimerScope`. `name` is
/// evaluated at the first pass only, and then in any case.
#define HTimedRegionIf(condition, name)                                           \
    const HTimerScope ZANBASE_JOIN(zanbase_timed_region_, __COUNTER__)(           \
        [&]() -> unsigned long long {                                             \
            static const unsigned long long zanbase_timer_id = HTimerNamed(name); \
            return zanbase_timer_id;                                              \
        }(),                                                                      \
        (condition))

/// Times the rest of the enclosing scope as `name`, as `HTimerScope`. The same name anywhere in the program is
/// the same timer. A macro, because each use has a static variable of its own for the timer's identifier. It evaluates
/// `name` at the first pass only. It is one declaration: as the branch of an `if` it times nothing but itself; for a
/// scope that is timed on a condition there is `HTimedRegionIf`.
#define HTimedRegion(name) HTimedRegionIf(true, name)

/// @}

#endif
