/// @file
/// The pieces of tracked memory: the call site, and functions that record one block unless the thread has an
/// `HTrackerPause`. They are for
/// code that has an allocator of its own, or that replaces the global `operator new`.
///
///     void* Allocate(std::size_t size, const HCallSite& site = HCallSite::Here()) {
///         return HTrackedAllocation(
///             size, site, [&] { return pool.Take(size); }, [](void* block) { pool.Give(block); });
///     }
///     void Deallocate(void* block) {
///         HTrackedDeallocation(block, [](void* given) { pool.Give(given); });
///     }
///
/// Record a block after it was allocated, and its end before it is given back, so that no other thread can
/// record the same address in between. If the tracker has no memory for a record, `std::bad_alloc` reaches the
/// caller. If a free can't be recorded, the record stays.
///
/// examples/adapters/operator_new.cpp replaces the global operators.
#ifndef ZANBASE_ADAPTERS_TRACKED_BLOCK_H
#define ZANBASE_ADAPTERS_TRACKED_BLOCK_H

#include <cstddef>
#include <cstdlib>
#include <new>

#include "zanbase/memory.h"
#include "zanbase/tracker_pause.h"

#if __cplusplus >= 202002L
#include <version>
#endif
#ifdef __cpp_lib_source_location
#include <source_location>
#endif

/// @addtogroup adapters
/// @{

/// A call site for the tracker. The text must stay readable as long as the tracker holds it; texts of
/// `__builtin_FILE` and of `std::source_location` do. Thread-safe, as any plain value.
struct HCallSite {
    const char* mpcFile;  ///< not owned, not null
    int mnLine;           ///< line in that file

    /// The place of the call; as a default argument, the place of the call that uses it.
    static constexpr HCallSite Here(const char* file = __builtin_FILE(), int line = __builtin_LINE()) {
        return {file, line};
    }

#ifdef __cpp_lib_source_location
    /// The place that `where` names.
    static constexpr HCallSite At(const std::source_location& where) {
        return {where.file_name(), static_cast<int>(where.line())};
    }
#endif
};

/// Records the block at `ptr`, unless the thread has a pause. What the tracker allocates for its record is
/// not recorded, so a replaced `operator new` may call this. Thread-safe.
inline void HTrackAlloc(void* ptr, std::size_t size, const HCallSite& site) {
    if (HTrackerPause::IsActive()) return;
    if (!HTrackBlock(ptr, size, site.mpcFile, site.mnLine)) ZANBASE_THROW_BAD_ALLOC();
}

/// Records that the block at `ptr` is given back, unless the thread has a pause. Call it before the block is
/// given back. If the tracker has no memory for it, the record stays. Thread-safe.
inline void HTrackFree(void* ptr) noexcept {
    if (!HTrackerPause::IsActive()) HTrackBlockEnd(ptr);
}

/// Calls `allocate`, records its block of `size` bytes and returns it. If that can't be recorded, calls
/// `deallocate` with the block and passes the exception on. Both are called within a pause, so they may use an
/// `operator new` that records. Thread-safe if both are.
template <class Allocate, class Deallocate>
auto HTrackedAllocation(std::size_t size, const HCallSite& site, Allocate allocate, Deallocate deallocate) {
    const bool is_recorded = !HTrackerPause::IsActive();
    const HTrackerPause pause;
    const auto block = allocate();
    if (is_recorded && !HTrackBlock(block, size, site.mpcFile, site.mnLine)) {
        deallocate(block);
        ZANBASE_THROW_BAD_ALLOC();
    }
    return block;
}

/// Records that `block` is given back, then calls `deallocate` with it within a pause. Thread-safe if that is.
template <class Block, class Deallocate>
void HTrackedDeallocation(Block block, Deallocate deallocate) {
    HTrackFree(block);
    const HTrackerPause pause;
    deallocate(block);
}

/// @}

#endif
