// The disk account: what was done with each regular file, and which file each descriptor stands for.
//
// A descriptor carries a mark of its own: not looked at yet, no regular file, or a file's record. A close
// takes the mark away, so what reuses the number (a socket, a directory) is looked at anew and never credited
// to the old file.
#ifndef ZANBASE_RECORD_FILES_H
#define ZANBASE_RECORD_FILES_H

#include <array>
#include <atomic>
#include <cstdint>
#include <string>
#include <vector>

namespace recorder {

enum class DiskOperation { kOpen, kClose, kSeek, kRead, kWrite };
constexpr std::size_t kDiskOperations = 5;

struct OperationSum {
    std::uint64_t count;
    std::uint64_t nanoseconds;
    std::uint64_t bytes;
};
using FileSums = std::array<OperationSum, kDiskOperations>;

// Each addition is atomic, also in a process with one thread: programs may read and write in a signal
// handler.
struct OperationCounters {
    std::atomic<std::uint64_t> count;
    std::atomic<std::uint64_t> nanoseconds;
    std::atomic<std::uint64_t> bytes;
};

// Lives as long as the process.
struct FileRecord {
    std::array<OperationCounters, kDiskOperations> counters;
    const char* name;
    std::uint64_t device;  // these tell files apart without reading their names; constant, as is `name`
    std::uint64_t inode;
    std::uint64_t spelling;
    FileRecord* next;
};

// The record that `descriptor` stands for, or null if it is no regular file. A descriptor that was not looked
// at yet was opened where no hook sees it, and that open is counted without time, unless a hook will count
// it. A child of vfork makes no marks, so it counts no such open.
FileRecord* FileOf(int descriptor);

void CountOperation(FileRecord& file, DiskOperation operation, std::uint64_t bytes,
                    std::uint64_t nanoseconds);

// `descriptor` was opened as `path`, which may be null. Counts it, and marks the descriptor unless a child of
// vfork opened it.
void CountOpen(int descriptor, const char* path, std::uint64_t nanoseconds);

// Takes the mark away; returns the record that it led to, or null. A child of vfork leaves the mark and gets
// null.
FileRecord* ForgetDescriptor(int descriptor);

// `copy` now stands for what `descriptor` stands for.
void CopyDescriptor(int descriptor, int copy);

// Descriptors that the program was started with are not opens of its own.
void MarkInheritedDescriptors();

// Nanoseconds of a clock that never goes back.
std::uint64_t Now();

struct NamedSums {
    std::string name;
    FileSums sums;
};
std::vector<NamedSums> ListFiles();

// Sets all sums to zero in a forked child, and resets the locks; the descriptors keep their marks.
void ResetFilesInChild();

}  // namespace recorder

#endif
