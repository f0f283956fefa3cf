/// @file
/// The whole public interface in one include, and the version of the library that it belongs to.
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

/// The version of these headers, first part; the same numbers stand in the CMake package and in `zanbase.pc`.
#define ZANBASE_VERSION_MAJOR 0
#define ZANBASE_VERSION_MINOR 1  ///< second part
#define ZANBASE_VERSION_PATCH 0  ///< third part
/// The version as one number that can be compared: 0.1.0 is 100.
#define ZANBASE_VERSION (ZANBASE_VERSION_MAJOR * 10000 + ZANBASE_VERSION_MINOR * 100 + ZANBASE_VERSION_PATCH)

#endif
