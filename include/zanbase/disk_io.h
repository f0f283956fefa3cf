/// @file
/// A process-wide account of disk operations, kept by file name, and the reports over it.
#ifndef ZANBASE_DISK_IO_H
#define ZANBASE_DISK_IO_H

#include <cstdio>
#include <string>

#include "zanbase/export.h"

/// @addtogroup diskio
/// @{

// The ledger does no I/O. A file layer does it, measures each operation, and tells the ledger:
//
//     HDiskIOOpen("/data/run.dat", file, 0.004);   // the file's record; binds the handle to it
//     HDiskIORead(file, 65536, 0.0002);
//     HDiskIOClose(file, 0.001);
//     HDiskIOUsageReport(stdout);
//
// A handle is any value that is unique among the open files, such as a `FILE*` or a descriptor cast to a
// pointer; it is only compared. Names are kept as spelled: two spellings of one path are two files. Times are
// seconds as the caller measured them, of any sign; nothing is checked. Counts wrap at 32 bits, byte sums at
// 64.
//
// Any thread may call any of these functions; one mutex makes each of them one step for the others. The first
// call makes the ledger, and it lives as long as the process; `HDiskIOAccessFileData` and the reports never
// make it, and take a missing one for one without files. Nothing reports a failure: what can't be credited is
// dropped. If memory runs out, `std::bad_alloc` goes to the caller and the ledger stays sound; for what is
// then kept see `HDiskIOOpen`.

/// Binds `handle` to `name`, in place of any name it was bound to, and counts an open in the record of
/// `name`, which is made if there is none. No other function makes a record. If memory runs out, the binding
/// may have been made without the open having been counted.
ZANBASE_API void HDiskIOOpen(const std::string& name, void* handle, double seconds);

/// Counts a close of the file that `handle` is bound to. The handle stays bound, so operations after the
/// close are still credited, until the handle is bound anew.
///
/// This and the next three do nothing if the handle's name has no record. A handle that was never bound
/// stands for the empty name.
ZANBASE_API void HDiskIOClose(void* handle, double seconds);

/// Counts a seek; see `HDiskIOClose`.
ZANBASE_API void HDiskIOSeek(void* handle, double seconds);

/// Counts a read of `bytes` bytes, which may be 0; see `HDiskIOClose`.
ZANBASE_API void HDiskIORead(void* handle, unsigned long long bytes, double seconds);

/// Counts a write of `bytes` bytes, which may be 0; see `HDiskIOClose`.
ZANBASE_API void HDiskIOWrite(void* handle, unsigned long long bytes, double seconds);

/// Binds a further handle to `name` without counting an open and without making a record. Operations on it
/// are dropped until `HDiskIOOpen` has made the record.
ZANBASE_API void _HDiskIOMapFD(const std::string& name, void* handle);

/// The name that `handle` is bound to, or an empty text.
ZANBASE_API std::string HDiskIOGetFilename(void* handle);

/// True if `name` has a record; then its read and write sums go to those of the pointers that are not null.
/// Otherwise false, and nothing is written.
ZANBASE_API bool HDiskIOAccessFileData(std::string name, double* readTime, unsigned int* readCount,
                                       unsigned long long* readSize, double* writeTime,
                                       unsigned int* writeCount, unsigned long long* writeSize);

/// Saves a copy of all records and bindings and then, as a step of its own, empties the ledger. What another
/// thread records between the two steps is lost. Calls nest to any depth.
ZANBASE_API void HDiskIOPush();

/// Brings back what the newest `HDiskIOPush` saved, in place of all recorded since. Does nothing if nothing
/// is saved.
ZANBASE_API void HDiskIOPop();

/// Removes all records and bindings. What was saved stays.
ZANBASE_API void HDiskIOReset();

// The reports write to `stream`, which must be open for writing and is neither checked nor flushed. Recording
// waits until a report is written, so that what it shows is one state of the ledger.

/// Prints the counts, times and sizes of one file. True if `name` has a record; otherwise false, and nothing
/// is printed. Lines longer than 4095 characters are cut.
ZANBASE_API bool HDiskIOReportFile(std::FILE* stream, const std::string& name);

/// Prints a table of sums over all files, or nothing if there is no file.
ZANBASE_API void HDiskIOSummaryReport(std::FILE* stream);

/// Prints every file that moved bytes as `HDiskIOReportFile` does, fewest bytes first, and files that moved
/// equally many in the order of their names; or that there is none. Prints nothing if there is no file.
ZANBASE_API void HDiskIOUsageReport(std::FILE* stream);

/// @}

#endif
