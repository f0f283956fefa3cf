/// @file
/// What crosses the library's boundary when an account is read or written: plain C data and functions. The types of
/// zanbase/snapshot.h, zanbase/snapshot_text.h and zanbase/budget.h are made of it in headers alone, so that one
/// binary of the library serves every mode of every C++ standard library. Programs use those; this header is for
/// bindings to other languages.
///
/// Texts are any bytes, with a length and no NUL at the end. Figures are signed and wrap at 64 bits.
#ifndef ZANBASE_ACCOUNT_DATA_H
#define ZANBASE_ACCOUNT_DATA_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup snapshots
/// @{

/// A text of any bytes.
struct HTextData {
    const char* mpcBytes;  ///< not owned; no NUL at the end
    std::size_t mnBytes;   ///< their number
};

/// What one call site did; see `HMemorySnapshot::Row`.
struct HMemorySiteData {
    HTextData moFile;        ///< the file as it was recorded
    int mnLine;              ///< line in that file
    long long mnLiveBlocks;  ///< blocks that are recorded and not yet freed
    long long mnLiveBytes;   ///< their bytes
    long long mnAllocated;   ///< bytes of all `HMemory::Alloc`
    long long mnFreed;       ///< bytes of all `HMemory::Free`
    long long mnAllocCount;  ///< calls of `HMemory::Alloc`
    long long mnFreeCount;   ///< calls of `HMemory::Free` that found a block of this site
};

/// The tracker's account.
struct HMemoryData {
    const HMemorySiteData* mpoRows;  ///< an array
    std::size_t mnRows;              ///< its length
    long long mnTotal;               ///< bytes recorded and not yet freed
    long long mnPeak;                ///< the highest total
    double mdTime;                   ///< when it was taken, in seconds since 1970-01-01 UTC; 0 if unknown
    long long mnProcess;             ///< the number of the process; 0 if unknown
};

/// One kind of operation on a file.
struct HDiskIOOperation {
    long long mnCount = 0;  ///< calls
    double mdSeconds = 0;   ///< time, as the callers measured it
    long long mnBytes = 0;  ///< bytes moved; always 0 for opens, closes and seeks
};

/// What was done with one file.
struct HDiskIOFileData {
    HTextData moName;          ///< the name as it was recorded
    HDiskIOOperation moOpen;   ///< opens
    HDiskIOOperation moClose;  ///< closes
    HDiskIOOperation moSeek;   ///< seeks
    HDiskIOOperation moRead;   ///< reads
    HDiskIOOperation moWrite;  ///< writes
};

/// The disk ledger's account.
struct HDiskIOData {
    const HDiskIOFileData* mpoRows;  ///< an array
    std::size_t mnRows;              ///< its length
    double mdTime;                   ///< as in `HMemoryData`
    long long mnProcess;             ///< as in `HMemoryData`
};

/// What one timer has added up; see `GlobalTimerSnapshot::Row`.
struct HTimerRowData {
    HTextData moName;                ///< the name as it was registered
    double mdSeconds;                ///< finished intervals, summed over all threads
    const double* mpdThreadSeconds;  ///< an array: the same by OpenMP thread number
    std::size_t mnThreads;           ///< its length
    double mdOpenSeconds;            ///< intervals that were open, up to the time of the snapshot
};

/// The timers' account.
struct HTimerData {
    const HTimerRowData* mpoRows;  ///< an array
    std::size_t mnRows;            ///< its length
    double mdTime;                 ///< as in `HMemoryData`
    long long mnProcess;           ///< as in `HMemoryData`
};

/// The tracker's state, copied under its mutex; rows are in the order of file, line and figures. Null if there is no
/// memory for it. The caller passes it to `HReleaseData`. Thread-safe.
[[nodiscard]] ZANBASE_API const HMemoryData* HTakeMemoryData() noexcept;
/// The ledger's state, copied under its mutex; rows are in the order of the names, byte by byte. Null and the release
/// as for `HTakeMemoryData`. Thread-safe.
[[nodiscard]] ZANBASE_API const HDiskIOData* HTakeDiskIOData() noexcept;
/// The timers' state; rows are in order of registration. Creates the `GlobalTimer` instance if there is none. Null and
/// the release as for `HTakeMemoryData`. Thread-safe, also while other threads register, toggle and are in regions.
[[nodiscard]] ZANBASE_API const HTimerData* HTakeTimerData() noexcept;

/// Releases what `HTakeMemoryData` returned; null is allowed. Thread-safe.
ZANBASE_API void HReleaseData(const HMemoryData* data) noexcept;
/// The same for `HTakeDiskIOData`. Thread-safe.
ZANBASE_API void HReleaseData(const HDiskIOData* data) noexcept;
/// The same for `HTakeTimerData`. Thread-safe.
ZANBASE_API void HReleaseData(const HTimerData* data) noexcept;

/// Sets the tracker's peak to its current total; returns the old peak, and the total in `*total`. Thread-safe.
ZANBASE_API long long HRestartMemoryPeak(long long* total) noexcept;
/// Sets the tracker's peak to `peak` if it is lower. Thread-safe.
ZANBASE_API void HRaiseMemoryPeak(long long peak) noexcept;

/// The length of the well-formed UTF-8 character that the `count` bytes at `bytes` begin with, or 0 if there is none.
/// Thread-safe.
[[nodiscard]] ZANBASE_API std::size_t HUtf8CharacterLength(const char* bytes, std::size_t count) noexcept;

/// Where a writer puts its text: called in order with each piece, until it returns false or all is written. What it
/// throws reaches the writer's caller.
struct HTextOutput {
    bool (*mpfnWrite)(void* context, const char* bytes, std::size_t count);  ///< not null; false is a failure
    void* mpContext;                                                         ///< passed on; may be null
};

/// The version of the JSON documents. It grows when a member changes its meaning or is removed; new members
/// can come without it, so readers ignore members that they don't know.
constexpr int kSnapshotJsonVersion = 1;

/// Which figure of a call site is the width of its frame.
enum class HMemoryFigure { kLiveBytes, kLiveBlocks, kAllocated, kAllocCount };

// The writers of zanbase/snapshot_text.h. They allocate nothing, and return true if the output took everything.

/// `HWriteJson`; accounts may be null. Thread-safe for different outputs.
ZANBASE_API bool HWriteJsonData(const HTextOutput& output, const HMemoryData* memory,
                                const HDiskIOData* diskIO, const HTimerData* timers);
/// `HWriteOpenMetrics`; accounts may be null. Thread-safe for different outputs.
ZANBASE_API bool HWriteOpenMetricsData(const HTextOutput& output, const HMemoryData* memory,
                                       const HDiskIOData* diskIO, const HTimerData* timers);
/// `HWriteCsv`. Thread-safe for different outputs.
ZANBASE_API bool HWriteCsvData(const HTextOutput& output, const HMemoryData& memory);
/// `HWriteCsv`. Thread-safe for different outputs.
ZANBASE_API bool HWriteCsvData(const HTextOutput& output, const HDiskIOData& diskIO);
/// `HWriteCsv`. Thread-safe for different outputs.
ZANBASE_API bool HWriteCsvData(const HTextOutput& output, const HTimerData& timers);
/// `HWriteFoldedStacks`. Thread-safe for different outputs.
ZANBASE_API bool HWriteFoldedStacksData(const HTextOutput& output, const HMemoryData& memory,
                                        HMemoryFigure figure);
/// `HWriteChromeTrace`. Thread-safe for different outputs.
ZANBASE_API bool HWriteChromeTraceData(const HTextOutput& output, const HTimerData& timers);

/// @}

#endif
