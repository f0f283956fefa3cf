/// @file
/// Snapshots as text for other programs: JSON, CSV, folded stacks and Chrome trace events.
///
/// Every writer flushes the stream and returns true if the stream took the whole text. It returns false if the
/// stream failed, unless the stream is set to throw; then that exception reaches the caller. Writers use neither
/// the stream's number format nor its locale, and write rows in the order of the snapshot. If memory runs
/// out, `std::bad_alloc` reaches the caller, possibly after a part of the text. Open files as binary, so that
/// line ends stay a single "\n" on every system.
///
///     std::ofstream file("memory.json", std::ios::binary);
///     if (!HWriteJson(file, HMemorySnapshot::Take())) std::perror("memory.json");
#ifndef ZANBASE_SNAPSHOT_TEXT_H
#define ZANBASE_SNAPSHOT_TEXT_H

#include <iosfwd>

#include "zanbase/export.h"
#include "zanbase/snapshot.h"

/// @addtogroup snapshots
/// @{

/// The version of the JSON documents. It grows when a member changes its meaning or is removed; new members
/// can come without it, so readers ignore members that they don't know.
constexpr int kSnapshotJsonVersion = 1;

/// Writes one JSON document with those accounts that are not null. docs/snapshot.schema.json is its schema:
///
///     {"schema": "zanbase-snapshot", "version": 1,
///      "memory": {"total": 64, "peak": 64, "rows": [
///       {"file": "a.cpp", "line": 7, "live_blocks": 1, "live_bytes": 64, "allocated": 64, "freed": 0,
///        "alloc_count": 1, "free_count": 0}]},
///      "disk_io": {"rows": [
///       {"name": "run.dat", "open": {"count": 1, "seconds": 0.5}, "close": …, "seek": …,
///        "read": {"count": 2, "seconds": 0.25, "bytes": 8192}, "write": …}]},
///      "timers": {"rows": [{"name": "load", "seconds": 1.5, "threads": [1.0, 0.5]}]}}
///
/// The document is UTF-8. A file or name that is not well-formed UTF-8 has U+FFFD in place of each byte that
/// is wrong, and beside it a member `file_hex` or `name_hex` with all bytes in hexadecimal. Times that are
/// not finite are `null`. Thread-safe for different streams.
ZANBASE_API bool HWriteJson(std::ostream& stream, const HMemorySnapshot* memory,
                            const HDiskIOSnapshot* diskIO, const GlobalTimerSnapshot* timers);
/// A document with the tracker's account alone. Thread-safe for different streams.
ZANBASE_API bool HWriteJson(std::ostream& stream, const HMemorySnapshot& memory);
/// A document with the disk ledger's account alone. Thread-safe for different streams.
ZANBASE_API bool HWriteJson(std::ostream& stream, const HDiskIOSnapshot& diskIO);
/// A document with the timers' account alone. Thread-safe for different streams.
ZANBASE_API bool HWriteJson(std::ostream& stream, const GlobalTimerSnapshot& timers);

/// Writes a heading and a line for each row, separated by commas. Texts are in double quotes, quotes in them
/// doubled and all other bytes as they are, so a reader of RFC 4180 gets the recorded bytes back. Columns:
/// file, line, live_blocks, live_bytes, allocated, freed, alloc_count, free_count. Thread-safe for different
/// streams.
ZANBASE_API bool HWriteCsv(std::ostream& stream, const HMemorySnapshot& memory);
/// The same with the columns name, open_count, open_seconds, close_count, close_seconds, seek_count,
/// seek_seconds, read_count, read_seconds, read_bytes, write_count, write_seconds, write_bytes. Thread-safe for
/// different streams.
ZANBASE_API bool HWriteCsv(std::ostream& stream, const HDiskIOSnapshot& diskIO);
/// The same with the columns name, thread, seconds: a line for each thread of each timer. Thread-safe for
/// different streams.
ZANBASE_API bool HWriteCsv(std::ostream& stream, const GlobalTimerSnapshot& timers);

/// Which figure of a call site is the width of its frame.
enum class HMemoryFigure { kLiveBytes, kLiveBlocks, kAllocated, kAllocCount };

/// Writes the call sites as folded stacks, which flame-graph viewers read: "src;core;table.cpp:57 1536". The
/// frames are the parts of the path, split at both kinds of slash. The last frame has the line if that is above
/// 0. Rows whose figure is 0 or less are left out. Semicolons and control bytes become "_", bytes that are not
/// UTF-8 become U+FFFD. Thread-safe for different streams.
ZANBASE_API bool HWriteFoldedStacks(std::ostream& stream, const HMemorySnapshot& memory,
                                    HMemoryFigure figure = HMemoryFigure::kLiveBytes);

/// Writes the timers as a JSON document of Chrome trace events, which trace viewers read. A timer has a sum and
/// no start time, so each thread shows its timers one after the other, from 0, each as long as its sum. Sums of
/// 0, below 0 or not finite are left out. Names are as in `HWriteJson`, `name_hex` is in `args`. Thread-safe for
/// different streams.
ZANBASE_API bool HWriteChromeTrace(std::ostream& stream, const GlobalTimerSnapshot& timers);

/// @}

#endif
