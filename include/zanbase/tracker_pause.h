/// @file
/// Pauses of a thread's tracking, for programs whose `operator new` records in the tracker. The pauses of a thread are
/// counted in the library, so that all parts of a program see them, whatever they export.
#ifndef ZANBASE_TRACKER_PAUSE_H
#define ZANBASE_TRACKER_PAUSE_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup adapters
/// @{

/// The number of pauses of the calling thread. Thread-safe: each thread has a number of its own.
[[nodiscard]] ZANBASE_API int& HTrackerPauses() noexcept;

/// Records the block of `size` bytes at `ptr` as `HMemory::Alloc`, within a pause. Returns false if the tracker has no
/// memory for the record. Thread-safe.
[[nodiscard]] ZANBASE_API bool HTrackBlock(void* ptr, std::size_t size, const char* file, int line) noexcept;

/// Records that the block at `ptr` is given back as `HMemory::Free`, within a pause. If the tracker has no memory for
/// it, the record stays. Thread-safe.
ZANBASE_API void HTrackBlockEnd(void* ptr) noexcept;

/// While one of these exists on a thread, blocks are not recorded on that thread by the adapters, nor by the functions
/// of zanbase/adapters/tracked_block.h. Pauses nest. Reports, snapshots, `Push`, `Pop` and the resets pause the calling
/// thread themselves. Not thread-safe: an object belongs to the thread that made it.
/// Requires: no block that was recorded is freed during the pause; its record would stay.
class HTrackerPause {
public:
    /// Starts a pause.
    HTrackerPause() noexcept : mnPauses(HTrackerPauses()) { ++mnPauses; }
    /// Ends it.
    ~HTrackerPause() { --mnPauses; }
    HTrackerPause(const HTrackerPause&) = delete;
    HTrackerPause& operator=(const HTrackerPause&) = delete;

    /// True if the calling thread has a pause.
    [[nodiscard]] static bool IsActive() noexcept { return HTrackerPauses() != 0; }

private:
    int& mnPauses;  // of the thread
};

/// @}

#endif
