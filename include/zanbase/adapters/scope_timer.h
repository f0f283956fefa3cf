/// @file
/// Scopes that add their time to a `GlobalTimer`.
///
///     void Load() {
///         HTimedRegion("load");     // until the end of the scope
///         …
///     }
///
/// A region has the limits of `GlobalTimer::Toggle`. Threads with the same OpenMP number, such as all threads
/// outside of parallel regions, must not be in the same region at the same time. Regions of one name do not
/// nest: entering one again on the same thread stops the timer.
///
/// examples/adapters/scope_timer.cpp shows both forms.
#ifndef ZANBASE_ADAPTERS_SCOPE_TIMER_H
#define ZANBASE_ADAPTERS_SCOPE_TIMER_H

#include <map>
#include <string>

#include "zanbase/global_timer.h"
#include "zanbase/mutex.h"

/// @addtogroup adapters
/// @{

/// Starts a timer on the calling thread and stops it at the end of the scope. Thread-safe, with the limits of
/// `GlobalTimer::Toggle`.
class HTimerScope {
public:
    /// Starts timer `id` of `GlobalTimer::RegisterNewTimer`. Requires: it is stopped on this thread.
    explicit HTimerScope(unsigned long long id) : moTimers(GlobalTimer::GetInstance()), mnId(id) {
        moTimers.Toggle(mnId);
    }
    /// Stops it, on the thread that started it.
    ~HTimerScope() { moTimers.Toggle(mnId); }
    HTimerScope(const HTimerScope&) = delete;
    HTimerScope& operator=(const HTimerScope&) = delete;

private:
    GlobalTimer& moTimers;
    unsigned long long mnId;
};

/// The identifier of the timer called `name`, which is registered at the first call with this name. Names that
/// were registered directly are not looked up. Thread-safe, also while other threads toggle.
inline unsigned long long HTimerNamed(const std::string& name) {
    // Never destroyed, so that regions work while the process ends.
    static const HMutex& mutex = *new HMutex;
    static auto& ids = *new std::map<std::string, unsigned long long>;  // guarded by mutex
    const HMutexLock lock(&mutex);
    const auto known = ids.find(name);
    if (known != ids.end()) return known->second;
    const auto entry = ids.emplace(name, 0).first;
    try {
        entry->second = GlobalTimer::GetInstance().RegisterNewTimer(name);
    } catch (...) {
        ids.erase(entry);
        throw;
    }
    return entry->second;
}

/// @cond
#define ZANBASE_JOIN_NAMES(left, right) left##right
#define ZANBASE_JOIN(left, right) ZANBASE_JOIN_NAMES(left, right)
/// @endcond

/// Times the rest of the enclosing scope as `name`, as `HTimerScope`. The same name anywhere in the program is
/// the same timer. A macro, because each use has a static variable of its own for the timer's identifier.
/// It evaluates `name` at the first pass only, and can be used once on a line.
#define HTimedRegion(name)                                                                      \
    static const unsigned long long ZANBASE_JOIN(knZanbaseTimer, __LINE__) = HTimerNamed(name); \
    const HTimerScope ZANBASE_JOIN(zanbase_timer_scope_, __LINE__)(ZANBASE_JOIN(knZanbaseTimer, __LINE__))

/// @}

#endif
