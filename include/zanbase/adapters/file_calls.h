/// @file
/// The functions that recorded files call: those of the C library and those of the system.
///
/// `HRecorded` works over any other file layer through a type with the same members. After a failure `Open` returns
/// `kClosed` and the other functions -1, with the reason in `errno`. They are called with an open file only.
///
/// examples/adapters/recorded_file.cpp uses both.
#ifndef ZANBASE_ADAPTERS_FILE_CALLS_H
#define ZANBASE_ADAPTERS_FILE_CALLS_H

// These two are POSIX; MinGW has them on Windows, with the same names.
#include <fcntl.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>

/// @addtogroup adapters
/// @{

/// The functions of the C library below `HRecordedFile`. Thread-safe for different files.
struct HStdioCalls {
    using Native = std::FILE*;                  ///< the open file
    using Mode = const char*;                   ///< of `std::fopen`
    static constexpr Native kClosed = nullptr;  ///< no file
    /// As `std::fopen`.
    static Native Open(const char* name, Mode mode) { return std::fopen(name, mode); }
    /// Returns the bytes read; fewer than `size` at the end of the file.
    static long long Read(Native file, void* block, std::size_t size) {
        std::clearerr(file);
        return Result(file, std::fread(block, 1, size, file));
    }
    /// Returns the bytes that the stream's buffer or the system accepted.
    static long long Write(Native file, const void* block, std::size_t size) {
        std::clearerr(file);
        return Result(file, std::fwrite(block, 1, size, file));
    }
    /// Returns the new position; `origin` is `SEEK_SET`, `SEEK_CUR` or `SEEK_END`.
    static long long Seek(Native file, long long offset, int origin) {
        return fseeko64(file, offset, origin) == 0 ? ftello64(file) : -1;
    }
    /// Returns 0 on success. The file is closed also after a failure.
    static int Close(Native file) { return std::fclose(file); }

private:
    static long long Result(Native file, std::size_t moved) {
        return moved == 0 && std::ferror(file) != 0 ? -1 : static_cast<long long>(moved);
    }
};

/// How `HRecordedDescriptor` opens a file.
struct HOpenMode {
    int mnFlags = O_RDONLY;    ///< of `open`; files are always binary, also where a system has text files
    int mnPermissions = 0666;  ///< of a new file
};

/// The system's functions below `HRecordedDescriptor`. Thread-safe for different files.
struct HDescriptorCalls {
    using Native = int;                    ///< the descriptor
    using Mode = HOpenMode;                ///< flags and permissions
    static constexpr Native kClosed = -1;  ///< no file
    /// As `open`.
    static Native Open(const char* name, const Mode& mode) {
#ifdef O_BINARY
        return ::open(name, mode.mnFlags | O_BINARY, mode.mnPermissions);
#else
        return ::open(name, mode.mnFlags, mode.mnPermissions);
#endif
    }
    /// As `read`, in pieces of at most 1 GiB, which every system takes.
    static long long Read(Native file, void* block, std::size_t size) {
        return ::read(file, block, Piece(size));
    }
    /// As `write`, in the same pieces.
    static long long Write(Native file, const void* block, std::size_t size) {
        return ::write(file, block, Piece(size));
    }
    /// As `lseek`, with 64 bits.
    static long long Seek(Native file, long long offset, int origin) {
        return ::lseek64(file, offset, origin);
    }
    /// As `close`.
    static int Close(Native file) { return ::close(file); }

private:
    static constexpr unsigned int Piece(std::size_t size) {
        constexpr unsigned int kLargest = 1U << 30;
        return size < kLargest ? static_cast<unsigned int>(size) : kLargest;
    }
};

/// @}

#endif
