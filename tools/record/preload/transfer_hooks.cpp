// The hooks of calls that read, write and seek by descriptor.
#include <sys/sendfile.h>
#include <sys/types.h>
#include <sys/uio.h>
#include <unistd.h>

#include "disk_operation.h"
#include "next_function.h"

// What a program that was compiled with checks calls.
extern "C" {
ssize_t __read_chk(int file, void* to, size_t bytes, size_t room);
ssize_t __pread_chk(int file, void* to, size_t bytes, off_t place, size_t room);
ssize_t __pread64_chk(int file, void* to, size_t bytes, off64_t place, size_t room);
}

namespace recorder {
namespace {

constexpr DiskOperation kRead = DiskOperation::kRead;
constexpr DiskOperation kWrite = DiskOperation::kWrite;
constexpr DiskOperation kSeek = DiskOperation::kSeek;

// A copy inside the kernel is a read of one file and a write of the other, each with the whole time.
template <class Call>
ssize_t Copy(int from, int to, const Call& real) {
    return Operate(DiskOperation::kWrite, to, [&] { return Operate(DiskOperation::kRead, from, real); });
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

// A function that does `operation` with the descriptor `file`.
#define ZANBASE_TRANSFER(operation, result, name, parameters, exceptions, ...)    \
    ZANBASE_HOOK(result, name, parameters, exceptions) {                          \
        return Operate(operation, file, [&] { return next::name(__VA_ARGS__); }); \
    }

ZANBASE_TRANSFER(kRead, ssize_t, read, (int file, void* to, size_t bytes), , file, to, bytes)
ZANBASE_TRANSFER(kRead, ssize_t, __read_chk, (int file, void* to, size_t bytes, size_t room), , file, to,
                 bytes, room)
ZANBASE_TRANSFER(kRead, ssize_t, pread, (int file, void* to, size_t bytes, off_t place), , file, to, bytes,
                 place)
ZANBASE_TRANSFER(kRead, ssize_t, pread64, (int file, void* to, size_t bytes, off64_t place), , file, to,
                 bytes, place)
ZANBASE_TRANSFER(kRead, ssize_t, __pread_chk, (int file, void* to, size_t bytes, off_t place, size_t room), ,
                 file, to, bytes, place, room)
ZANBASE_TRANSFER(kRead, ssize_t, __pread64_chk,
                 (int file, void* to, size_t bytes, off64_t place, size_t room), , file, to, bytes, place,
                 room)
ZANBASE_TRANSFER(kRead, ssize_t, readv, (int file, const iovec* parts, int count), , file, parts, count)
ZANBASE_TRANSFER(kRead, ssize_t, preadv, (int file, const iovec* parts, int count, off_t place), , file,
                 parts, count, place)
ZANBASE_TRANSFER(kRead, ssize_t, preadv64, (int file, const iovec* parts, int count, off64_t place), , file,
                 parts, count, place)
ZANBASE_TRANSFER(kRead, ssize_t, preadv2, (int file, const iovec* parts, int count, off_t place, int flags), ,
                 file, parts, count, place, flags)
ZANBASE_TRANSFER(kRead, ssize_t, preadv64v2,
                 (int file, const iovec* parts, int count, off64_t place, int flags), , file, parts, count,
                 place, flags)
ZANBASE_TRANSFER(kWrite, ssize_t, write, (int file, const void* from, size_t bytes), , file, from, bytes)
ZANBASE_TRANSFER(kWrite, ssize_t, pwrite, (int file, const void* from, size_t bytes, off_t place), , file,
                 from, bytes, place)
ZANBASE_TRANSFER(kWrite, ssize_t, pwrite64, (int file, const void* from, size_t bytes, off64_t place), , file,
                 from, bytes, place)
ZANBASE_TRANSFER(kWrite, ssize_t, writev, (int file, const iovec* parts, int count), , file, parts, count)
ZANBASE_TRANSFER(kWrite, ssize_t, pwritev, (int file, const iovec* parts, int count, off_t place), , file,
                 parts, count, place)
ZANBASE_TRANSFER(kWrite, ssize_t, pwritev64, (int file, const iovec* parts, int count, off64_t place), , file,
                 parts, count, place)
ZANBASE_TRANSFER(kWrite, ssize_t, pwritev2, (int file, const iovec* parts, int count, off_t place, int flags),
                 , file, parts, count, place, flags)
ZANBASE_TRANSFER(kWrite, ssize_t, pwritev64v2,
                 (int file, const iovec* parts, int count, off64_t place, int flags), , file, parts, count,
                 place, flags)
ZANBASE_TRANSFER(kSeek, off_t, lseek, (int file, off_t place, int from), noexcept, file, place, from)
ZANBASE_TRANSFER(kSeek, off64_t, lseek64, (int file, off64_t place, int from), noexcept, file, place, from)

ZANBASE_HOOK(ssize_t, copy_file_range,
             (int from, off64_t* from_place, int to, off64_t* to_place, size_t bytes, unsigned int flags), ) {
    return Copy(from, to,
                [&] { return next::copy_file_range(from, from_place, to, to_place, bytes, flags); });
}

ZANBASE_HOOK(ssize_t, sendfile, (int to, int from, off_t* place, size_t bytes), noexcept) {
    return Copy(from, to, [&] { return next::sendfile(to, from, place, bytes); });
}

ZANBASE_HOOK(ssize_t, sendfile64, (int to, int from, off64_t* place, size_t bytes), noexcept) {
    return Copy(from, to, [&] { return next::sendfile64(to, from, place, bytes); });
}
