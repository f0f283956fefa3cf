/// @file
/// Snapshots as text for other programs: JSON, CSV, OpenMetrics, folded stacks and Chrome trace events. For a profile
/// that `pprof` reads, and to read JSON back, see zanbase/integrations.
///
/// Every writer flushes the stream and returns true if the stream took the whole text. It returns false if the
/// stream failed, unless the stream is set to throw; then that exception reaches the caller. Writers use neither
/// the stream's number format nor its locale, and write rows in the order of the snapshot. If memory runs
/// out, `std::bad_alloc` reaches the caller before the first byte is written. Open files as binary, so that
/// line ends stay a single "\n" on every system.
///
///     std::ofstream file("memory.json", std::ios::binary);
///     if (!HWriteJson(file, HMemorySnapshot::Take())) std::perror("memory.json");
#ifndef ZANBASE_SNAPSHOT_TEXT_H
#define ZANBASE_SNAPSHOT_TEXT_H

#include <ostream>
#include <vector>

#include "zanbase/account_data.h"
#include "zanbase/export.h"
#include "zanbase/snapshot.h"
#include "zanbase/tracker_pause.h"

/// @addtogroup snapshots
/// @{

ZANBASE_MODE_BEGIN

/// @cond
// Snapshots as plain data. Valid as long as the snapshots are.
class HSnapshotView {
public:
    HSnapshotView() = default;
    template <class Snapshot>
    explicit HSnapshotView(const Snapshot& snapshot) {
        Add(snapshot);
    }
    HSnapshotView(const HSnapshotView&) = delete;
    HSnapshotView& operator=(const HSnapshotView&) = delete;

    void Add(const HMemorySnapshot& memory) {
        maSites.reserve(memory.maRows.size());
        for (const auto& row : memory.maRows)
            maSites.push_back({TextOf(row.moFile), row.mnLine, row.mnLiveBlocks, row.mnLiveBytes,
                               row.mnAllocated, row.mnFreed, row.mnAllocCount, row.mnFreeCount});
        moMemory = {maSites.data(), maSites.size(), memory.mnTotal,
                    memory.mnPeak,  memory.mdTime,  memory.mnProcess};
    }
    void Add(const HDiskIOSnapshot& disk_io) {
        for (const auto& row : disk_io.maRows)
            maFiles.push_back(
                {TextOf(row.moName), row.moOpen, row.moClose, row.moSeek, row.moRead, row.moWrite});
        moDiskIO = {maFiles.data(), maFiles.size(), disk_io.mdTime, disk_io.mnProcess};
    }
    void Add(const GlobalTimerSnapshot& timers) {
        for (const auto& row : timers.maRows)
            maTimers.push_back({TextOf(row.moName), row.mdSeconds, row.maThreadSeconds.data(),
                                row.maThreadSeconds.size(), row.mdOpenSeconds});
        moTimers = {maTimers.data(), maTimers.size(), timers.mdTime, timers.mnProcess};
    }

    HMemoryData moMemory{};
    HDiskIOData moDiskIO{};
    HTimerData moTimers{};

private:
    static HTextData TextOf(const std::string& text) { return {text.data(), text.size()}; }

    std::vector<HMemorySiteData> maSites;
    std::vector<HDiskIOFileData> maFiles;
    std::vector<HTimerRowData> maTimers;
};

// Calls `write` with the stream as its output, and flushes the stream.
template <class Write>
bool HWriteTo(std::ostream& stream, Write write) {
    const auto put = [](void* context, const char* bytes, std::size_t count) {
        return static_cast<std::ostream*>(context)->write(bytes, static_cast<std::streamsize>(count)).good();
    };
    const HTextOutput output{put, &stream};
    const bool is_written = write(output);
    return stream.flush().good() && is_written;
}

// The plain data of up to three accounts, of which any may be null.
template <class Write>
bool HWriteAccounts(std::ostream& stream, const HMemorySnapshot* memory, const HDiskIOSnapshot* diskIO,
                    const GlobalTimerSnapshot* timers, Write write) {
    const HTrackerPause pause;
    HSnapshotView view;
    if (memory != nullptr) view.Add(*memory);
    if (diskIO != nullptr) view.Add(*diskIO);
    if (timers != nullptr) view.Add(*timers);
    return HWriteTo(stream, [&](const HTextOutput& output) {
        return write(output, memory != nullptr ? &view.moMemory : nullptr,
                     diskIO != nullptr ? &view.moDiskIO : nullptr,
                     timers != nullptr ? &view.moTimers : nullptr);
    });
}
/// @endcond

/// Writes one JSON document with those accounts that are not null. docs/snapshot.schema.json is its schema:
///
///     {"schema": "zanbase-snapshot", "version": 1,
///      "memory": {"time": 1750000000.5, "process": 4711, "total": 64, "peak": 64, "rows": [
///       {"file": "a.cpp", "line": 7, "live_blocks": 1, "live_bytes": 64, "allocated": 64, "freed": 0,
///        "alloc_count": 1, "free_count": 0}]},
///      "disk_io": {"rows": [
///       {"name": "run.dat", "open": {"count": 1, "seconds": 0.5}, "close": …, "seek": …,
///        "read": {"count": 2, "seconds": 0.25, "bytes": 8192}, "write": …}]},
///      "timers": {"rows": [{"name": "load", "seconds": 1.5, "threads": [1.0, 0.5], "open_seconds": 0}]}}
///
/// The document is UTF-8. A file or name that is not well-formed UTF-8 has U+FFFD in place of each byte that
/// is wrong, and beside it a member `file_hex` or `name_hex` with all bytes in hexadecimal. Times that are
/// not finite are `null`. Time and process number of an account are left out if they are unknown. Thread-safe for
/// different streams.
inline bool HWriteJson(std::ostream& stream, const HMemorySnapshot* memory, const HDiskIOSnapshot* diskIO,
                       const GlobalTimerSnapshot* timers) {
    return HWriteAccounts(stream, memory, diskIO, timers, HWriteJsonData);
}
/// A document with the tracker's account alone. Thread-safe for different streams.
inline bool HWriteJson(std::ostream& stream, const HMemorySnapshot& memory) {
    return HWriteJson(stream, &memory, nullptr, nullptr);
}
/// A document with the disk ledger's account alone. Thread-safe for different streams.
inline bool HWriteJson(std::ostream& stream, const HDiskIOSnapshot& diskIO) {
    return HWriteJson(stream, nullptr, &diskIO, nullptr);
}
/// A document with the timers' account alone. Thread-safe for different streams.
inline bool HWriteJson(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    return HWriteJson(stream, nullptr, nullptr, &timers);
}

/// Writes those accounts that are not null as OpenMetrics text, which Prometheus and other monitoring systems scrape
/// (serve it as `application/openmetrics-text; version=1.0.0; charset=utf-8`):
///
///     # TYPE zanbase_memory_site_live_bytes gauge
///     # UNIT zanbase_memory_site_live_bytes bytes
///     # HELP zanbase_memory_site_live_bytes Live bytes of a call site.
///     zanbase_memory_site_live_bytes{file="a.cpp",line="7"} 64
///
/// Metrics are `zanbase_memory_live_bytes`, `…_peak_bytes`, `…_site_live_bytes`, `…_site_live_blocks`,
/// `…_site_allocated_bytes`, `…_site_allocations`; `zanbase_disk_io_operations`, `…_operation_seconds` and
/// `…_moved_bytes` of each file and operation; `zanbase_timer_seconds` and `…_open_seconds`. Bytes that are not UTF-8
/// become U+FFFD. Rows of one call site that follow each other are added up, as monitoring systems refuse the same
/// series twice. Requires: the snapshots are of `Take` or `Merge`; a difference is not a counter. Thread-safe for
/// different streams.
inline bool HWriteOpenMetrics(std::ostream& stream, const HMemorySnapshot* memory,
                              const HDiskIOSnapshot* diskIO, const GlobalTimerSnapshot* timers) {
    return HWriteAccounts(stream, memory, diskIO, timers, HWriteOpenMetricsData);
}

/// Writes a heading and a line for each row, separated by commas. Texts are in double quotes, quotes in them
/// doubled and all other bytes as they are, so a reader of RFC 4180 gets the recorded bytes back. Columns:
/// file, line, live_blocks, live_bytes, allocated, freed, alloc_count, free_count. Thread-safe for different
/// streams.
inline bool HWriteCsv(std::ostream& stream, const HMemorySnapshot& memory) {
    const HTrackerPause pause;
    const HSnapshotView view(memory);
    return HWriteTo(stream, [&](const HTextOutput& output) { return HWriteCsvData(output, view.moMemory); });
}
/// The same with the columns name, open_count, open_seconds, close_count, close_seconds, seek_count,
/// seek_seconds, read_count, read_seconds, read_bytes, write_count, write_seconds, write_bytes. Thread-safe for
/// different streams.
inline bool HWriteCsv(std::ostream& stream, const HDiskIOSnapshot& diskIO) {
    const HTrackerPause pause;
    const HSnapshotView view(diskIO);
    return HWriteTo(stream, [&](const HTextOutput& output) { return HWriteCsvData(output, view.moDiskIO); });
}
/// The same with the columns name, thread, seconds: a line for each thread of each timer. Thread-safe for
/// different streams.
inline bool HWriteCsv(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    const HTrackerPause pause;
    const HSnapshotView view(timers);
    return HWriteTo(stream, [&](const HTextOutput& output) { return HWriteCsvData(output, view.moTimers); });
}

/// Writes the call sites as folded stacks, which flame-graph viewers read: "src;core;table.cpp:57 1536". The
/// frames are the parts of the path, split at both kinds of slash. The last frame has the line if that is above
/// 0. Rows whose figure is 0 or less are left out. Semicolons and control bytes become "_", bytes that are not
/// UTF-8 become U+FFFD. Thread-safe for different streams.
inline bool HWriteFoldedStacks(std::ostream& stream, const HMemorySnapshot& memory,
                               HMemoryFigure figure = HMemoryFigure::kLiveBytes) {
    const HTrackerPause pause;
    const HSnapshotView view(memory);
    return HWriteTo(stream, [&](const HTextOutput& output) {
        return HWriteFoldedStacksData(output, view.moMemory, figure);
    });
}

/// Writes the timers as a JSON document of Chrome trace events, which trace viewers read. A timer has a sum and
/// no start time, so each thread shows its timers one after the other, from 0, each as long as its sum. Sums of
/// 0, below 0 or not finite are left out. `args` has the sum and that of all threads. Names are as in `HWriteJson`.
/// Thread-safe for different streams.
inline bool HWriteChromeTrace(std::ostream& stream, const GlobalTimerSnapshot& timers) {
    const HTrackerPause pause;
    const HSnapshotView view(timers);
    return HWriteTo(stream,
                    [&](const HTextOutput& output) { return HWriteChromeTraceData(output, view.moTimers); });
}

ZANBASE_MODE_END

/// @}

#endif
