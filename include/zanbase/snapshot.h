/// @file
/// The three accounts (tracker, disk ledger, timers) as values that can be compared, added up and written.
/// Not part of zanbase/zanbase.h: a program that only records does not need it.
///
/// A snapshot is a plain value: it owns its texts, shares nothing with the account, and any code may fill one.
///
///     const HMemorySnapshot before = HMemorySnapshot::Take();
///     Work();
///     for (const auto& row : HMemorySnapshot::Take().Since(before).maRows)
///         std::printf("%s:%d %+lld bytes\n", row.moFile.c_str(), row.mnLine, row.mnLiveBytes);
///
/// `Take` copies one state of the account and changes nothing. `Since` gives the difference of two snapshots:
/// every figure is that of this snapshot less that of `earlier`, and rows without a difference are left out.
/// `Merge` adds every figure of `other`. Both match rows by the text of their key (call site, file or timer
/// name), so rows of one snapshot with equal keys become one; the rows of the result are in the order of their
/// keys. So `earlier.Merge(later.Since(earlier))` gives the figures of `later`.
///
/// Figures are signed, because differences can be negative, and wrap at 64 bits; a byte count of 2^63 or more
/// shows as a negative number. If memory runs out, `std::bad_alloc` reaches the caller, no lock stays held, and
/// the snapshots are unchanged.
///
/// A program whose `operator new` records in the tracker pauses that while it takes a snapshot; see
/// `HTrackerPause` in zanbase/adapters/tracked_block.h.
#ifndef ZANBASE_SNAPSHOT_H
#define ZANBASE_SNAPSHOT_H

#include <string>
#include <vector>

#include "zanbase/export.h"

/// @addtogroup snapshots
/// @{

/// What the allocation tracker holds. Thread-safe for different objects, and for reading one object.
struct HMemorySnapshot {
    /// One call site. Two rows of one `Take` can have the same text and line, because a site in the tracker is
    /// the address of the text.
    struct Row {
        std::string moFile;          ///< the file as it was recorded; any bytes
        int mnLine = 0;              ///< line in that file
        long long mnLiveBlocks = 0;  ///< blocks that are recorded and not yet freed
        long long mnLiveBytes = 0;   ///< their bytes
        long long mnAllocated = 0;   ///< bytes of all `HMemory::Alloc`
        long long mnFreed = 0;       ///< bytes of all `HMemory::Free`
        long long mnAllocCount = 0;  ///< calls of `HMemory::Alloc`
        long long mnFreeCount = 0;   ///< calls of `HMemory::Free` that found a block of this site
    };

    std::vector<Row> maRows;  ///< in no order after `Take`
    long long mnTotal = 0;    ///< bytes recorded and not yet freed
    long long mnPeak = 0;     ///< the highest total; of merged snapshots an upper bound

    /// The tracker's state, copied under its mutex; empty before the first `HMemory::Alloc`. Thread-safe.
    [[nodiscard]] ZANBASE_API static HMemorySnapshot Take();
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] ZANBASE_API HMemorySnapshot Since(const HMemorySnapshot& earlier) const;
    /// Adds `other` to this snapshot; see above.
    ZANBASE_API void Merge(const HMemorySnapshot& other);
};

/// What the disk ledger holds. Thread-safe for different objects, and for reading one object.
struct HDiskIOSnapshot {
    /// One kind of operation.
    struct Operation {
        long long mnCount = 0;  ///< calls
        double mdSeconds = 0;   ///< time, as the callers measured it
        long long mnBytes = 0;  ///< bytes moved; always 0 for opens, closes and seeks
    };

    /// One file.
    struct Row {
        std::string moName;  ///< the name as it was recorded; any bytes
        Operation moOpen;    ///< opens
        Operation moClose;   ///< closes
        Operation moSeek;    ///< seeks
        Operation moRead;    ///< reads
        Operation moWrite;   ///< writes
    };

    std::vector<Row> maRows;  ///< in the order of the names, byte by byte

    /// The ledger's state, copied under its mutex; empty before the first recording. Thread-safe.
    [[nodiscard]] ZANBASE_API static HDiskIOSnapshot Take();
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] ZANBASE_API HDiskIOSnapshot Since(const HDiskIOSnapshot& earlier) const;
    /// Adds `other` to this snapshot; see above.
    ZANBASE_API void Merge(const HDiskIOSnapshot& other);
};

/// What the timers have added up, without open intervals. Thread-safe for different objects, and for reading one
/// object.
struct GlobalTimerSnapshot {
    /// One timer.
    struct Row {
        std::string moName;                   ///< the name as it was registered; any bytes
        double mdSeconds = 0;                 ///< sum over all threads
        std::vector<double> maThreadSeconds;  ///< by OpenMP thread number
    };

    std::vector<Row> maRows;  ///< in order of registration after `Take`

    /// The timers' state. Creates the instance if there is none. Not thread-safe. Requires: no other call of
    /// `GlobalTimer` is in progress.
    [[nodiscard]] ZANBASE_API static GlobalTimerSnapshot Take();
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] ZANBASE_API GlobalTimerSnapshot Since(const GlobalTimerSnapshot& earlier) const;
    /// Adds `other` to this snapshot; see above.
    ZANBASE_API void Merge(const GlobalTimerSnapshot& other);
};

/// @}

#endif
