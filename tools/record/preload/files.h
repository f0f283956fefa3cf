// The disk account: what was done with each regular file, and which file each descriptor stands for.
//
// A descriptor carries a mark of its own: not looked at yet, no regular file, or a file's number. A close
// takes the mark away, so what reuses the number (a socket, a directory) is looked at anew and never credited
// to the old file.
#ifndef ZANBASE_RECORD_FILES_H
#define ZANBASE_RECORD_FILES_H

#include "common/account.h"

namespace recorder {

// The row that `descriptor` stands for, or null if it is not a regular file. A descriptor that was not looked at
// yet was opened where no hook sees it, and that open is counted without time, unless a hook will count it. A
// child of vfork makes no marks, so it counts no such open.
FileRow* FileOf(int descriptor);

void CountOperation(FileRow& file, DiskOperation operation, std::uint64_t bytes, std::uint64_t nanoseconds);

// `descriptor` was opened as `path`, which may be null. Counts it, and marks the descriptor unless a child of
// vfork opened it.
void CountOpen(int descriptor, const char* path, std::uint64_t nanoseconds);

// Takes the mark away; returns the row that it led to, or null. A child of vfork leaves the mark and gets
// null.
FileRow* ForgetDescriptor(int descriptor);

// `copy` now stands for what `descriptor` stands for.
void CopyDescriptor(int descriptor, int copy);

// Descriptors that the program was started with are not opens of its own.
void MarkInheritedDescriptors();

// Nanoseconds of a clock that never goes back; 0 if the program has forbidden it.
std::uint64_t Now();

// Gives a forked child rows of its own for the files that are open. `parent` is its parent's account.
void ResetFiles(const Account& parent);

}  // namespace recorder

#endif
