/// @file
/// Scopes that change a setting of the OpenMP runtime for a block, the library's own thread limit, and the
/// processor counts of the machine.
///
///     {
///         OMPThreadCount scope(4);  // parallel regions that start here have 4 threads, if the limit allows
///         …
///     }
///
/// One rule holds for the three scope classes. The constructor records the current setting and the requested
/// one; if they differ and no parallel region is active, it sets the requested one. The destructor compares
/// the two recorded values, not the live setting; if they differ and no parallel region is active, it sets
/// the previous value again. A region is active if its team has more than one thread: a scope inside an
/// active region changes nothing, a scope inside a region of one thread works as outside.
///
/// Copies and assignments copy the recorded values, so the destructor of a copy restores the same setting.
///
/// Two OpenMP runtimes can be in one process (libgomp of g++ and libomp of clang), and this library uses the one
/// that it was linked with. In a team of the other runtime every member has thread number 0 here, and these
/// scopes do not change that runtime's settings. Build all parts with one runtime. If `OMPGetNumThreads()` is 1
/// in a parallel region of the caller that has several threads, there are two runtimes.
///
/// Thread-safety: the settings belong to the calling thread inside the runtime. Scopes on different threads
/// are independent; one scope object belongs to one thread. Requires: a scope ends on the thread that started
/// it, and scopes end in reverse order. The functions are thread-safe, inside parallel regions too.
///
/// Not for the threads of a single region: its `num_threads` clause does that.
#ifndef ZANBASE_OPENMP_H
#define ZANBASE_OPENMP_H

#include <memory>

#include "zanbase/export.h"

/// @addtogroup parallel
/// @{

/// Sets the runtime's dynamic adjustment of team sizes for a block. Not thread-safe: one object belongs to one
/// thread.
class ZANBASE_API OMPDynamic {
public:
    /// Requests dynamic adjustment, or with false none.
    OMPDynamic(bool enable);
    ~OMPDynamic();

    /// Copies the recorded values; calls nothing in the runtime.
    OMPDynamic(const OMPDynamic&) = default;

    /// Copies the recorded values; calls nothing in the runtime.
    OMPDynamic& operator=(const OMPDynamic&);

private:
    bool mbRequested;
    bool mbPrevious;
};

/// Sets the number of threads of later parallel regions for a block. Not thread-safe: one object belongs to one
/// thread.
class ZANBASE_API OMPThreadCount {
public:
    /// Requests `count` threads, clamped to the range from 1 to `OMPGetMaxThreads()`.
    OMPThreadCount(long long count);
    ~OMPThreadCount();

    /// Copies the recorded values; calls nothing in the runtime.
    OMPThreadCount(const OMPThreadCount&) = default;

    /// Copies the recorded values; calls nothing in the runtime.
    OMPThreadCount& operator=(const OMPThreadCount&);

private:
    int mnRequested;
    int mnPrevious;
};

/// Sets nested parallelism for a block and, if `enable` is true, also the thread count to
/// `OMPGetMaxThreads()`. With false it leaves the thread count alone. Not thread-safe: one object belongs to one
/// thread.
///
/// The thread count has an `OMPThreadCount` of its own. Copies and assigned objects share it; the destructor of
/// the last owner ends it. An assignment first releases the target's share of its old one.
class ZANBASE_API OMPNested {
public:
    /// Requests nesting, or with false none. Throws `std::bad_alloc` and changes no setting if there is no
    /// memory.
    OMPNested(bool enable);
    ~OMPNested();

    /// Copies the recorded values and shares the thread count; calls nothing in the runtime. Not with another standard
    /// library than the library's: the share is a `std::shared_ptr`.
#ifndef ZANBASE_FOREIGN_LIBRARY
    OMPNested(const OMPNested&) = default;
#else
    OMPNested(const OMPNested&) = delete;
#endif

    /// Copies the recorded values and shares the thread count.
    OMPNested& operator=(const OMPNested&);

private:
    bool mbRequested;
    bool mbPrevious;
    std::shared_ptr<OMPThreadCount> mpoThreadCount;  // null if nesting was not requested
};

/// Returns the thread limit of the library's scopes, at least 1: the value that `OMPSetMaxThreads` set, else
/// the environment variable `OMP_NUM_THREADS` if it is a positive number, else the number of logical
/// processors. The first call reads the environment; later calls do not. Thread-safe.
[[nodiscard]] ZANBASE_API int OMPGetMaxThreads();

/// Sets that limit, to 1 if `limit` is less. Affects scopes that start later; calls nothing in the runtime.
/// Thread-safe.
ZANBASE_API void OMPSetMaxThreads(int limit);

/// Returns the number of threads in the current team, 1 outside a parallel region. Thread-safe.
[[nodiscard]] ZANBASE_API int OMPGetNumThreads();

/// Returns the number of the calling thread in its team, from 0; 0 outside a parallel region. Thread-safe.
[[nodiscard]] ZANBASE_API int OMPGetThreadNum();

/// Returns the number of logical processors that the system runs on, including those that this process may
/// not use. Asks the system once. Thread-safe.
[[nodiscard]] ZANBASE_API int GetLogicalProcessorCount();

/// Returns the number of processor cores, or the OpenMP runtime's processor count if the system doesn't report them.
/// Asks the system once. Thread-safe.
[[nodiscard]] ZANBASE_API int GetPhysicalProcessorCount();

/// @}

#endif
