/// @file
/// Scopes that change a setting of the OpenMP runtime for a block, the library's own thread limit, and the
/// counts of the machine's processors.
#ifndef ZANBASE_OPENMP_H
#define ZANBASE_OPENMP_H

#include <memory>

#include "zanbase/export.h"

// One rule holds for the three scope classes. The constructor notes the setting in force and the one asked
// for; if they differ and no parallel region is active, it sets the one asked for. The destructor compares
// the same two notes, not the live setting; if they differ and no parallel region is active, it sets the
// noted one back. So a scope inside a parallel region changes nothing, at either end.
//
//     { OMPThreadCount scope(4);  /* parallel regions begun here have 4 threads, if the limit allows */ }
//
// The settings are the runtime's and belong to the calling thread there; a scope must end on the thread that
// began it. Scopes end in reverse order of their beginning. To set the threads of a single region, its
// `num_threads` clause is enough and no scope is needed. Copying and assigning hand on the notes, so the
// destructor sets back what that of the source would; of these only an assignment to an `OMPNested` may call
// the runtime, as told there.

/// Sets the runtime's dynamic adjustment of team sizes for a scope. Not for use inside a parallel region,
/// where it has no effect.
class ZANBASE_API OMPDynamic {
public:
    /// Asks for dynamic adjustment, or with false for none.
    OMPDynamic(bool enable);
    ~OMPDynamic();

    /// Copies the notes of the other scope.
    OMPDynamic(const OMPDynamic&) = default;

    /// Takes over the notes of the other scope.
    OMPDynamic& operator=(const OMPDynamic&);

private:
    bool mbRequested;
    bool mbPrevious;
};

/// Sets the number of threads of coming parallel regions for a scope. Not for use inside a parallel region,
/// where it has no effect.
class ZANBASE_API OMPThreadCount {
public:
    /// `count` is clamped to the range from 1 to `OMPGetMaxThreads()`.
    OMPThreadCount(long long count);
    ~OMPThreadCount();

    /// Copies the notes of the other scope.
    OMPThreadCount(const OMPThreadCount&) = default;

    /// Takes over the notes of the other scope.
    OMPThreadCount& operator=(const OMPThreadCount&);

private:
    int mnRequested;
    int mnPrevious;
};

/// Sets nested parallelism for a scope and, if `enable` is true, the thread count to `OMPGetMaxThreads()`;
/// with false the thread count is left alone. Not for use inside a parallel region, where it has no effect.
///
/// The thread count is a scope of its own. Objects that are copied or assigned share it, and the last of them
/// ends it; an object that is assigned to first lets go of the one it had, which ends there if nobody shares
/// it. `std::bad_alloc` out of the constructor leaves the settings as they were.
class ZANBASE_API OMPNested {
public:
    /// Asks for nesting, or with false for none.
    OMPNested(bool enable);
    ~OMPNested();

    /// Copies the notes of the other scope.
    OMPNested(const OMPNested&) = default;

    /// Takes over the notes of the other scope.
    OMPNested& operator=(const OMPNested&);

private:
    bool mbRequested;
    bool mbPrevious;
    std::shared_ptr<OMPThreadCount> mpoThreadCount;  // null if nesting was not asked for
};

// The functions below may be called by any thread at any time, in parallel regions too.

/// How many threads a scope of this library may ask for, 1 or more: what `OMPSetMaxThreads` set, else
/// `OMP_NUM_THREADS` of the environment if that is a positive number, else the count of logical processors.
/// It is settled at the first call, and the environment is not read again.
[[nodiscard]] ZANBASE_API int OMPGetMaxThreads();

/// Sets that limit, to 1 if `limit` is less. The runtime's own settings stay; scopes that begin later go by
/// it.
ZANBASE_API void OMPSetMaxThreads(int limit);

/// The number of threads in the current team, 1 outside a parallel region.
[[nodiscard]] ZANBASE_API int OMPGetNumThreads();

/// The number of the calling thread in its team, from 0; 0 outside a parallel region.
[[nodiscard]] ZANBASE_API int OMPGetThreadNum();

/// The number of logical processors that the system runs on, also those that this process may not use. Asked
/// of the system once.
[[nodiscard]] ZANBASE_API int GetLogicalProcessorCount();

/// The number of processor cores, or what the OpenMP runtime counts where the system does not tell. Asked of
/// the system once.
[[nodiscard]] ZANBASE_API int GetPhysicalProcessorCount();

#endif
