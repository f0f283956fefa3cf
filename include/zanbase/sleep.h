/// @file
/// A sleep in microseconds whose routine a program can replace.
#ifndef ZANBASE_SLEEP_H
#define ZANBASE_SLEEP_H

#include "zanbase/export.h"

/// @addtogroup timing
/// @{

/// Calls the current sleep routine with `microseconds` on the calling thread; 0 and negative values return at
/// once and never reach it. Any thread may call it, and the routine runs concurrently with other calls.
///
/// The default routine sleeps for whole milliseconds, `microseconds` / 1000, and sleeps again until a tenth
/// of the requested time, and at least one tick of a millisecond clock, has passed. So below 1000
/// microseconds it gives up the processor again and again until that clock ticks: it keeps a processor busy
/// when no other thread is ready. Don't use it where an event can be waited for; a `HSemaphore` or `HCondVar`
/// wakes at once.
ZANBASE_API void USleep(int microseconds);

/// Makes `hook` the sleep routine of the whole process, for the library's own polling too (the destructor of
/// `HHibernateThread`). It receives the positive count of microseconds and should wait about that long.
///
/// `hook` must not be null: null does not restore the default routine, which can't be had back. The previous
/// routine is neither returned nor called. May be called at any time, on any thread; calls of `USleep` that
/// are under way finish in the routine that they started.
ZANBASE_API void InstallUSleepHook(void (*hook)(int));

/// @}

#endif
