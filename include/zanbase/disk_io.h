/// @file
/// A process-wide account of disk operations, kept by file name, and the reports over it.
///
/// The ledger does no I/O. A file layer does it, measures each operation, and records it here:
///
///     HDiskIOOpen("/data/run.dat", &file, 0.004);  // creates the record; binds the handle to it
///     HDiskIORead(&file, 65536, 0.0002);
///     HDiskIOClose(&file, 0.001);
///     HDiskIOUsageReport(stdout);
///
/// **Handles.** A handle is only compared. Requires: it is unique among the files in use until the close is
/// recorded. Use the address of the caller's own object for the open file. A `FILE*` or a descriptor is not
/// unique: another thread can get the same one after the close and before the close is recorded.
///
/// **Units.** Names are kept as spelled: two spellings of one path are two files. Times are seconds as the
/// caller measured them, of any sign, and are not checked. Counts wrap at 32 bits, byte sums at 64.
///
/// **Threads.** All functions are thread-safe; one mutex makes each of them atomic. They may be called until
/// the process has ended. A fork waits until no other thread is inside the ledger, so the child can use it; after
/// five seconds in one operation, which only a report or a killed thread takes, it waits no longer, and the child
/// must not use the ledger.
///
/// **Errors.** The first call creates the ledger's tables, which live as long as the process;
/// `HDiskIOAccessFileData` and the reports never create them and treat missing tables as no files. No
/// function reports a failure: what can't be credited is dropped. If memory is exhausted, `std::bad_alloc`
/// reaches the caller and the ledger stays sound; `HDiskIOOpen` describes what is kept.
#ifndef ZANBASE_DISK_IO_H
#define ZANBASE_DISK_IO_H

#include <cstdio>
#include <string>

#include "zanbase/export.h"

/// @addtogroup diskio
/// @{

/// Binds `handle` to `name`, replaces any earlier binding, and counts an open in the record of `name`, which
/// is created if there is none. No other function creates a record. If memory is exhausted, the binding may
/// have been made without the open having been counted. Thread-safe.
ZANBASE_API void HDiskIOOpen(const std::string& name, void* handle, double seconds);

/// Counts a close of the file that `handle` is bound to. The handle stays bound, so operations after the
/// close are still credited, until the handle is bound again. Thread-safe.
///
/// This function and the next three do nothing if the name of the handle has no record. A handle that was
/// never bound has the empty name.
ZANBASE_API void HDiskIOClose(void* handle, double seconds);

/// Counts a seek; see `HDiskIOClose`. Thread-safe.
ZANBASE_API void HDiskIOSeek(void* handle, double seconds);

/// Counts a read of `bytes` bytes, which may be 0; see `HDiskIOClose`. Thread-safe.
ZANBASE_API void HDiskIORead(void* handle, unsigned long long bytes, double seconds);

/// Counts a write of `bytes` bytes, which may be 0; see `HDiskIOClose`. Thread-safe.
ZANBASE_API void HDiskIOWrite(void* handle, unsigned long long bytes, double seconds);

/// Binds a further handle to `name` without counting an open and without creating a record. Operations on it
/// are dropped until `HDiskIOOpen` has created the record. Thread-safe.
ZANBASE_API void _HDiskIOMapFD(const std::string& name, void* handle);

/// Returns the name that `handle` is bound to, or an empty text. Thread-safe.
ZANBASE_API std::string HDiskIOGetFilename(void* handle);

/// Returns true if `name` has a record, and stores its read and write sums through those pointers that are
/// not null. Otherwise returns false and stores nothing. Thread-safe.
ZANBASE_API bool HDiskIOAccessFileData(std::string name, double* readTime, unsigned int* readCount,
                                       unsigned long long* readSize, double* writeTime,
                                       unsigned int* writeCount, unsigned long long* writeSize);

/// Saves a copy of all records and bindings and then, as a separate step, empties the ledger. What another
/// thread records between the two steps is lost. Calls nest to any depth. Thread-safe.
ZANBASE_API void HDiskIOPush();

/// Restores what the newest `HDiskIOPush` saved and discards all recorded since. Does nothing if nothing is
/// saved. Thread-safe.
ZANBASE_API void HDiskIOPop();

/// Removes all records and bindings. Saved states stay. Thread-safe.
ZANBASE_API void HDiskIOReset();

/// Prints the counts, times and sizes of one file. Returns true if `name` has a record; otherwise returns
/// false, prints nothing and does not acquire the stream. All is one write; a line longer than 4095 characters is
/// cut. The stream is neither checked nor flushed. Requires: `stream` is open for writing.
///
/// Thread-safe, like the other reports. The calling thread owns the ledger's mutex and the stream's lock
/// (`flockfile`) until the report is written: no other output gets into it, and recording waits. It waits for
/// neither while it owns the other, so a thread that owns the stream may record.
///
/// A write function of the program's own, under the stream, may record, print and report on other streams. It
/// must not wait for a thread that may wait for the ledger, such as a stream whose owner records here.
ZANBASE_API bool HDiskIOReportFile(std::FILE* stream, const std::string& name);

/// Prints a table of sums over all files in one write, or nothing if there is no file. Thread-safe. Requirements
/// and locks are those of `HDiskIOReportFile`.
ZANBASE_API void HDiskIOSummaryReport(std::FILE* stream);

/// Prints every file that moved bytes as `HDiskIOReportFile` does, fewest bytes first, equal numbers in the
/// order of the names; if no file moved bytes, one line says so. Prints nothing if there is no file. The title and
/// each file are one write each.
/// Thread-safe. Requirements and locks are those of `HDiskIOReportFile`.
ZANBASE_API void HDiskIOUsageReport(std::FILE* stream);

/// @}

#endif
