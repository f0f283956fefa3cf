/// @file
/// A sleep in microseconds whose routine a program can replace.
#ifndef ZANBASE_SLEEP_H
#define ZANBASE_SLEEP_H

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

/// Calls the current sleep routine with `microseconds` on the calling thread. 0 and negative values return at
/// once without a call. Thread-safe: routines run concurrently.
///
/// The default routine sleeps for whole milliseconds, `microseconds` / 1000, and repeats that until a tenth
/// of the requested time, and at least one tick of a millisecond clock, has passed. Below 1000 microseconds
/// it yields the processor until the clock ticks, which keeps a processor busy when no other thread is ready.
/// It is not a cancellation point: a request of `pthread_cancel` stays pending. A signal does not end it.
/// Don't use it where an event can be waited for: `HSemaphore` and `HCondVar` wake at once.
ZANBASE_API void USleep(int microseconds);

/// Makes `hook` the sleep routine of the whole process, for the library's own polling too (the destructor of
/// `HHibernateThread`). It receives the positive count of microseconds and should wait about that long.
///
/// The previous routine is neither returned nor called, and the default routine can't be restored. Calls of
/// `USleep` in progress finish in the routine that they started. Thread-safe. Requires: `hook` is not null
/// and is thread-safe.
ZANBASE_API void InstallUSleepHook(void (*hook)(int));

/// @}

#endif
