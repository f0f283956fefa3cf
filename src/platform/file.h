// Contract: the system's files, below the files that the adapters record. Names are UTF-8 and positions have 64 bits.
//
// After a failure the functions return -1, or null, with the reason in errno. A signal may interrupt them (EINTR). All
// are thread-safe for different files. They are cancellation points where the system has these.
#ifndef ZANBASE_PLATFORM_FILE_H
#define ZANBASE_PLATFORM_FILE_H

#include <cstddef>
#include <cstdio>

// Opens a file, always binary. Programs that the process starts get the descriptor only if `is_inherited`.
int OpenDescriptor(const char* name, int flags, int permissions, bool is_inherited);

// Reads or writes at least one byte of `size`, unless that is 0 or the file ends, and returns the count.
long long ReadDescriptor(int file, void* block, std::size_t size);
long long WriteDescriptor(int file, const void* block, std::size_t size);

// Writes two blocks one after the other, in one operation where the system has one, and returns the count of both.
long long WriteDescriptorTwo(int file, const void* first, std::size_t first_size, const void* second,
                             std::size_t second_size);

// Returns the new position; `origin` is SEEK_SET, SEEK_CUR or SEEK_END.
long long SeekDescriptor(int file, long long offset, int origin);

// The descriptor is closed also after a failure.
int CloseDescriptor(int file);

// As std::fopen, and not for the programs that the process starts. Requires: `mode` begins with r, w or a.
std::FILE* OpenStream(const char* name, const char* mode);

// As std::fwrite. If the stream has its error set after the call, the count is only of bytes that the system is known to
// have: what lay in the stream's buffer when a write failed may be lost, although the C library counts it.
std::size_t WriteStream(std::FILE* stream, const void* block, std::size_t size);

// Returns the new position.
long long SeekStream(std::FILE* stream, long long offset, int origin);

#endif
