// The hooks of calls that read, write and seek by descriptor.
#include <sys/sendfile.h>
#include <sys/types.h>
#include <sys/uio.h>
#include <unistd.h>

#include "disk_operation.h"
#include "next_function.h"

namespace recorder {
namespace {

NextFunction<ssize_t(int, void*, size_t)> gRead{"read"};
NextFunction<ssize_t(int, void*, size_t, size_t)> gReadChk{"__read_chk"};
NextFunction<ssize_t(int, void*, size_t, off_t)> gPread{"pread"};
NextFunction<ssize_t(int, void*, size_t, off_t)> gPread64{"pread64"};
NextFunction<ssize_t(int, void*, size_t, off_t, size_t)> gPreadChk{"__pread_chk"};
NextFunction<ssize_t(int, void*, size_t, off_t, size_t)> gPread64Chk{"__pread64_chk"};
NextFunction<ssize_t(int, const iovec*, int)> gReadv{"readv"};
NextFunction<ssize_t(int, const iovec*, int, off_t)> gPreadv{"preadv"};
NextFunction<ssize_t(int, const iovec*, int, off_t)> gPreadv64{"preadv64"};
NextFunction<ssize_t(int, const iovec*, int, off_t, int)> gPreadv2{"preadv2"};
NextFunction<ssize_t(int, const iovec*, int, off_t, int)> gPreadv64v2{"preadv64v2"};
NextFunction<ssize_t(int, const void*, size_t)> gWrite{"write"};
NextFunction<ssize_t(int, const void*, size_t, off_t)> gPwrite{"pwrite"};
NextFunction<ssize_t(int, const void*, size_t, off_t)> gPwrite64{"pwrite64"};
NextFunction<ssize_t(int, const iovec*, int)> gWritev{"writev"};
NextFunction<ssize_t(int, const iovec*, int, off_t)> gPwritev{"pwritev"};
NextFunction<ssize_t(int, const iovec*, int, off_t)> gPwritev64{"pwritev64"};
NextFunction<ssize_t(int, const iovec*, int, off_t, int)> gPwritev2{"pwritev2"};
NextFunction<ssize_t(int, const iovec*, int, off_t, int)> gPwritev64v2{"pwritev64v2"};
NextFunction<off_t(int, off_t, int)> gLseek{"lseek"};
NextFunction<off_t(int, off_t, int)> gLseek64{"lseek64"};
NextFunction<ssize_t(int, off_t*, int, off_t*, size_t, unsigned int)> gCopyFileRange{"copy_file_range"};
NextFunction<ssize_t(int, int, off_t*, size_t)> gSendfile{"sendfile"};
NextFunction<ssize_t(int, int, off_t*, size_t)> gSendfile64{"sendfile64"};

template <class Function, class... Arguments>
auto Do(DiskOperation operation, NextFunction<Function>& next, int descriptor, Arguments... arguments) {
    return Operate(operation, descriptor, [&] { return next(descriptor, arguments...); });
}

// A copy inside the kernel is a read of one file and a write of the other, each with the whole time.
template <class Call>
ssize_t Copy(int from, int to, const Call& real) {
    return Operate(DiskOperation::kWrite, to, [&] { return Operate(DiskOperation::kRead, from, real); });
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

constexpr DiskOperation kRead = DiskOperation::kRead;
constexpr DiskOperation kWrite = DiskOperation::kWrite;
constexpr DiskOperation kSeek = DiskOperation::kSeek;

extern "C" {

ssize_t read(int file, void* to, size_t bytes) { return Do(kRead, gRead, file, to, bytes); }

ssize_t __read_chk(int file, void* to, size_t bytes, size_t room) {
    return Do(kRead, gReadChk, file, to, bytes, room);
}

ssize_t pread(int file, void* to, size_t bytes, off_t place) {
    return Do(kRead, gPread, file, to, bytes, place);
}

ssize_t pread64(int file, void* to, size_t bytes, off64_t place) {
    return Do(kRead, gPread64, file, to, bytes, place);
}

ssize_t __pread_chk(int file, void* to, size_t bytes, off_t place, size_t room) {
    return Do(kRead, gPreadChk, file, to, bytes, place, room);
}

ssize_t __pread64_chk(int file, void* to, size_t bytes, off64_t place, size_t room) {
    return Do(kRead, gPread64Chk, file, to, bytes, place, room);
}

ssize_t readv(int file, const iovec* parts, int count) { return Do(kRead, gReadv, file, parts, count); }

ssize_t preadv(int file, const iovec* parts, int count, off_t place) {
    return Do(kRead, gPreadv, file, parts, count, place);
}

ssize_t preadv64(int file, const iovec* parts, int count, off64_t place) {
    return Do(kRead, gPreadv64, file, parts, count, place);
}

ssize_t preadv2(int file, const iovec* parts, int count, off_t place, int flags) {
    return Do(kRead, gPreadv2, file, parts, count, place, flags);
}

ssize_t preadv64v2(int file, const iovec* parts, int count, off64_t place, int flags) {
    return Do(kRead, gPreadv64v2, file, parts, count, place, flags);
}

ssize_t write(int file, const void* from, size_t bytes) { return Do(kWrite, gWrite, file, from, bytes); }

ssize_t pwrite(int file, const void* from, size_t bytes, off_t place) {
    return Do(kWrite, gPwrite, file, from, bytes, place);
}

ssize_t pwrite64(int file, const void* from, size_t bytes, off64_t place) {
    return Do(kWrite, gPwrite64, file, from, bytes, place);
}

ssize_t writev(int file, const iovec* parts, int count) { return Do(kWrite, gWritev, file, parts, count); }

ssize_t pwritev(int file, const iovec* parts, int count, off_t place) {
    return Do(kWrite, gPwritev, file, parts, count, place);
}

ssize_t pwritev64(int file, const iovec* parts, int count, off64_t place) {
    return Do(kWrite, gPwritev64, file, parts, count, place);
}

ssize_t pwritev2(int file, const iovec* parts, int count, off_t place, int flags) {
    return Do(kWrite, gPwritev2, file, parts, count, place, flags);
}

ssize_t pwritev64v2(int file, const iovec* parts, int count, off64_t place, int flags) {
    return Do(kWrite, gPwritev64v2, file, parts, count, place, flags);
}

off_t lseek(int file, off_t place, int from) noexcept { return Do(kSeek, gLseek, file, place, from); }

off64_t lseek64(int file, off64_t place, int from) noexcept { return Do(kSeek, gLseek64, file, place, from); }

ssize_t copy_file_range(int from, off64_t* from_place, int to, off64_t* to_place, size_t bytes,
                        unsigned int flags) {
    return Copy(from, to, [&] { return gCopyFileRange(from, from_place, to, to_place, bytes, flags); });
}

ssize_t sendfile(int to, int from, off_t* place, size_t bytes) noexcept {
    return Copy(from, to, [&] { return gSendfile(to, from, place, bytes); });
}

ssize_t sendfile64(int to, int from, off64_t* place, size_t bytes) noexcept {
    return Copy(from, to, [&] { return gSendfile64(to, from, place, bytes); });
}

}  // extern "C"
