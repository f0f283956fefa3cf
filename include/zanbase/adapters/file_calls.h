/// @file
/// The functions that recorded files call: those of the C library and those of the system.
///
/// `HRecorded` works over any other file layer through a type with the members of `HDescriptorCalls`, of which
/// `WriteTwo` may be missing. After a failure `Open` returns `kClosed` and the other functions -1, with the reason in
/// `errno`; a call that fails with `EINTR` is made again. A layer whose files keep an error of their own, because bytes
/// that they had accepted may be lost, has `HasError`, `ClearError` and `Flush` too, as `HStdioCalls`. The functions are
/// called with an open file only.
///
/// **Names** of files are UTF-8 on every system. **Child programs**: files are not inherited by programs that the process
/// starts, unless `HOpenMode::mbInherited` asks for it.
///
/// examples/adapters/recorded_file.cpp uses both.
#ifndef ZANBASE_ADAPTERS_FILE_CALLS_H
#define ZANBASE_ADAPTERS_FILE_CALLS_H

// The flags of HOpenMode; every compiler for Windows has this header too.
#include <fcntl.h>

#include <cstddef>
#include <cstdio>

#include "zanbase/export.h"

/// @addtogroup adapters
/// @{

/// The functions of the C library below `HRecordedFile`. Thread-safe for different files.
struct HStdioCalls {
    using Native = std::FILE*;                      ///< the open file
    using Mode = const char*;                       ///< of `std::fopen`
    static constexpr std::FILE* kClosed = nullptr;  ///< no file
    /// As `std::fopen`. A mode that is null or begins with none of `r`, `w` and `a` fails with `EINVAL`.
    ZANBASE_API static Native Open(const char* name, Mode mode);
    /// Returns the bytes read; fewer than `size` at the end of the file, or before a failure. Reading lost nothing if a
    /// signal interrupted it or no input was ready: then the stream has no error set.
    ZANBASE_API static long long Read(Native file, void* block, std::size_t size);
    /// Returns the bytes that the stream accepted. If the stream then has its error set, these are only the bytes that
    /// the system is known to have; what lay in the stream's buffer may be lost.
    ZANBASE_API static long long Write(Native file, const void* block, std::size_t size);
    /// Returns the new position; `origin` is `SEEK_SET`, `SEEK_CUR` or `SEEK_END`.
    ZANBASE_API static long long Seek(Native file, long long offset, int origin);
    /// Writes what is in the buffer and returns 0 on success.
    static int Flush(Native file) { return std::fflush(file); }
    /// Returns 0 on success. The file is closed also after a failure.
    static int Close(Native file) { return std::fclose(file); }
    /// True if an operation failed since the file was opened or the error cleared (`std::ferror`).
    static bool HasError(Native file) { return std::ferror(file) != 0; }
    /// Forgets the error (`std::clearerr`).
    static void ClearError(Native file) { std::clearerr(file); }
};

/// How `HRecordedDescriptor` opens a file.
struct HOpenMode {
    int mnFlags = O_RDONLY;    ///< of `open`; files are always binary, also where a system has text files
    int mnPermissions = 0666;  ///< of a new file
    bool mbInherited = false;  ///< true if programs that the process starts get the descriptor
};

/// The system's functions below `HRecordedDescriptor`. Thread-safe for different files.
struct HDescriptorCalls {
    using Native = int;                    ///< the descriptor
    using Mode = HOpenMode;                ///< flags and permissions
    static constexpr Native kClosed = -1;  ///< no file
    /// As `open`.
    ZANBASE_API static Native Open(const char* name, const Mode& mode);
    /// As `read`, also where the system counts in `int`: the result may be less than `size`.
    ZANBASE_API static long long Read(Native file, void* block, std::size_t size);
    /// As `write`; the result may be less than `size`.
    ZANBASE_API static long long Write(Native file, const void* block, std::size_t size);
    /// Writes two blocks one after the other, by one call where the system has it, and returns the count of both.
    ZANBASE_API static long long WriteTwo(Native file, const void* first, std::size_t first_size,
                                          const void* second, std::size_t second_size);
    /// As `lseek`, with 64 bits.
    ZANBASE_API static long long Seek(Native file, long long offset, int origin);
    /// As `close`.
    ZANBASE_API static int Close(Native file);
};

/// Records an open as `HDiskIOOpen` does, of the file with the `length` bytes of `name`. Programs need not share the
/// library's `std::string` to call it. Throws `std::bad_alloc` if memory is exhausted. Thread-safe.
ZANBASE_API void HDiskIOOpenFile(const char* name, std::size_t length, void* handle, double seconds);

/// @}

#endif
