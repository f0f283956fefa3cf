/// @file
/// Regions of code that add their time to a `GlobalTimer`, as plain functions. Programs use the scopes of
/// zanbase/adapters/scope_timer.h, which are made of them.
#ifndef ZANBASE_TIMED_REGION_H
#define ZANBASE_TIMED_REGION_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

/// The identifier of the timer called by the `length` bytes at `name`, in `*id`. The first call with a name registers
/// the timer, whichever library or plug-in makes it; names that were registered directly are not looked up. Returns
/// false if there is no memory for it. Thread-safe, also while other threads toggle.
[[nodiscard]] ZANBASE_API bool HTimerIdOf(const char* name, std::size_t length,
                                          unsigned long long* id) noexcept;

/// Enters a region of timer `id` on the calling thread. The time runs from the first enter to the last leave: regions
/// of one timer nest. Each thread adds into a slot of its own, whether OpenMP knows it or not. Returns false if there
/// is no memory for the slot; the region is then not entered. Thread-safe. Requires: `id` comes from `HTimerIdOf` or
/// `GlobalTimer::RegisterNewTimer`.
[[nodiscard]] ZANBASE_API bool HEnterTimedRegion(unsigned long long id) noexcept;

/// Leaves a region of timer `id` that the calling thread has entered. Thread-safe.
ZANBASE_API void HLeaveTimedRegion(unsigned long long id) noexcept;

/// Whether the timers print their report when the process ends; they do so if this was never called. `Report` is not
/// affected. Thread-safe.
ZANBASE_API void HReportTimersAtExit(bool wanted) noexcept;

/// @}

#endif
