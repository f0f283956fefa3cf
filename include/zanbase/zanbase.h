/// @file
/// The whole public interface in one include, its subsystems, and the version of the library.
#ifndef ZANBASE_ZANBASE_H
#define ZANBASE_ZANBASE_H

#include "zanbase/allocation.h"
#include "zanbase/clock.h"
#include "zanbase/condition_variable.h"
#include "zanbase/disk_io.h"
#include "zanbase/export.h"
#include "zanbase/field_text.h"
#include "zanbase/global_timer.h"
#include "zanbase/hibernate_thread.h"
#include "zanbase/memory.h"
#include "zanbase/message_catalogue.h"
#include "zanbase/mutex.h"
#include "zanbase/name_ring.h"
#include "zanbase/openmp.h"
#include "zanbase/random.h"
#include "zanbase/read_write_mutex.h"
#include "zanbase/semaphore.h"
#include "zanbase/sleep.h"
#include "zanbase/sort.h"
#include "zanbase/string_makers.h"
#include "zanbase/terminal.h"
#include "zanbase/thread.h"
#include "zanbase/version.h"

/// @defgroup locks Locks
/// Mutex, condition variable, semaphore and read-write locks, with scoped holders.
/// @defgroup threads Threads
/// Thread objects that can be started again, contain faults and can be killed, and a worker that hibernates
/// between passes.
/// @defgroup memory Memory
/// Allocators that retry instead of failing, and the allocation tracker with its reports.
/// @defgroup diskio Disk I/O accounting
/// A ledger of disk operations by file, which the caller's file layer records, with its reports.
/// @defgroup timing Timing
/// Clocks, a stopwatch, process-wide named timers, and a sleep that a caller can replace.
/// @defgroup text Text
/// Numbers, formats and token lists as text, and fixed-width text fields.
/// @defgroup parallel Parallel support
/// OpenMP settings for a block, the thread limit, processor counts, and the sort.
/// @defgroup snapshots Snapshots
/// The accounts of memory, disk and timers as values that can be compared, added up and written.
/// @defgroup adapters Adapters
/// Header-only helpers that feed the accounts and lend the locks to the standard library's holders.
/// @defgroup integrations Integrations
/// Headers that need another library: profiles, a reader of the JSON, and budgets for test frameworks.
/// @defgroup environment Environment
/// Message catalogue, random numbers, terminal codes, and a text console.

#endif
