// The hooks of calls that make descriptors, copy them and close them.
#include <cerrno>
#include <cstdarg>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

#include "disk_operation.h"
#include "next_function.h"
#include "report_output.h"

namespace recorder {
namespace {

NextFunction<int(const char*, int, ...)> gOpen{"open"};
NextFunction<int(const char*, int, ...)> gOpen64{"open64"};
NextFunction<int(int, const char*, int, ...)> gOpenAt{"openat"};
NextFunction<int(int, const char*, int, ...)> gOpenAt64{"openat64"};
NextFunction<int(const char*, int)> gOpen2{"__open_2"};
NextFunction<int(const char*, int)> gOpen642{"__open64_2"};
NextFunction<int(int, const char*, int)> gOpenAt2{"__openat_2"};
NextFunction<int(int, const char*, int)> gOpenAt642{"__openat64_2"};
NextFunction<int(const char*, mode_t)> gCreat{"creat"};
NextFunction<int(const char*, mode_t)> gCreat64{"creat64"};
NextFunction<int(char*)> gMkstemp{"mkstemp"};
NextFunction<int(char*)> gMkstemp64{"mkstemp64"};
NextFunction<int(char*, int)> gMkostemp{"mkostemp"};
NextFunction<int(char*, int)> gMkostemp64{"mkostemp64"};
NextFunction<int(char*, int)> gMkstemps{"mkstemps"};
NextFunction<int(char*, int)> gMkstemps64{"mkstemps64"};
NextFunction<int(char*, int, int)> gMkostemps{"mkostemps"};
NextFunction<int(char*, int, int)> gMkostemps64{"mkostemps64"};
NextFunction<int(int)> gClose{"close"};
NextFunction<int(unsigned int, unsigned int, int)> gCloseRange{"close_range"};
NextFunction<int(int)> gDup{"dup"};
NextFunction<int(int, int)> gDup2{"dup2"};
NextFunction<int(int, int, int)> gDup3{"dup3"};
NextFunction<int(int, int, ...)> gFcntl{"fcntl"};
NextFunction<int(int, int, ...)> gFcntl64{"fcntl64"};

template <class Function, class... Arguments>
int OpenFile(NextFunction<Function>& next, const char* path, Arguments... arguments) {
    return Open(
        path, [&] { return next(arguments...); }, [](int descriptor) { return descriptor; });
}

int Copied(int descriptor, int copy) {
    if (copy >= 0 && copy != descriptor && Wants(kDisk)) CopyDescriptor(descriptor, copy);
    return copy;
}

void MakeRoomFor(int copy) {
    if (IsOwnDescriptor(copy) && !IsVforkChild()) VacateDescriptor(copy);
}

// A mode is there only where a file may be made.
bool HasMode(int flags) { return (flags & O_CREAT) != 0 || (flags & O_TMPFILE) == O_TMPFILE; }

// The mark goes first: after the real close another thread may get the number.
int Close(int descriptor) {
    FileRecord* const file = Wants(kDisk) ? ForgetDescriptor(descriptor) : nullptr;
    if (file == nullptr) return gClose(descriptor);
    const std::uint64_t start = Now();
    const int result = gClose(descriptor);
    CountOperation(*file, DiskOperation::kClose, 0, Now() - start);
    return result;
}

int CloseRange(unsigned int first, unsigned int last, int flags) {
    constexpr unsigned int kLooked = 4096;
    const bool closes = (static_cast<unsigned int>(flags) & CLOSE_RANGE_CLOEXEC) == 0;
    for (unsigned int number = first; closes && number <= last && number < kLooked; ++number) {
        FileRecord* const file = Wants(kDisk) ? ForgetDescriptor(static_cast<int>(number)) : nullptr;
        if (file != nullptr) CountOperation(*file, DiskOperation::kClose, 0, 0);
    }
    return gCloseRange(first, last, flags);
}

template <class Function>
int Fcntl(NextFunction<Function>& next, int descriptor, int command, void* argument) {
    const int result = next(descriptor, command, argument);
    return command == F_DUPFD || command == F_DUPFD_CLOEXEC ? Copied(descriptor, result) : result;
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

// Reads the argument that follows `last`, as `type`.
#define ZANBASE_OPTIONAL_ARGUMENT(value, last, type, is_there) \
    type value{};                                              \
    if (is_there) {                                            \
        va_list arguments;                                     \
        va_start(arguments, last);                             \
        (value) = va_arg(arguments, type);                     \
        va_end(arguments);                                     \
    }

extern "C" {

int open(const char* path, int flags, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(mode, flags, mode_t, HasMode(flags))
    return OpenFile(gOpen, path, path, flags, mode);
}

int open64(const char* path, int flags, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(mode, flags, mode_t, HasMode(flags))
    return OpenFile(gOpen64, path, path, flags, mode);
}

int openat(int folder, const char* path, int flags, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(mode, flags, mode_t, HasMode(flags))
    return OpenFile(gOpenAt, path, folder, path, flags, mode);
}

int openat64(int folder, const char* path, int flags, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(mode, flags, mode_t, HasMode(flags))
    return OpenFile(gOpenAt64, path, folder, path, flags, mode);
}

int __open_2(const char* path, int flags) { return OpenFile(gOpen2, path, path, flags); }
int __open64_2(const char* path, int flags) { return OpenFile(gOpen642, path, path, flags); }
int __openat_2(int folder, const char* path, int flags) {
    return OpenFile(gOpenAt2, path, folder, path, flags);
}
int __openat64_2(int folder, const char* path, int flags) {
    return OpenFile(gOpenAt642, path, folder, path, flags);
}
int creat(const char* path, mode_t mode) { return OpenFile(gCreat, path, path, mode); }
int creat64(const char* path, mode_t mode) { return OpenFile(gCreat64, path, path, mode); }
int mkstemp(char* path) { return OpenFile(gMkstemp, path, path); }
int mkstemp64(char* path) { return OpenFile(gMkstemp64, path, path); }
int mkostemp(char* path, int flags) { return OpenFile(gMkostemp, path, path, flags); }
int mkostemp64(char* path, int flags) { return OpenFile(gMkostemp64, path, path, flags); }
int mkstemps(char* path, int suffix) { return OpenFile(gMkstemps, path, path, suffix); }
int mkstemps64(char* path, int suffix) { return OpenFile(gMkstemps64, path, path, suffix); }
int mkostemps(char* path, int suffix, int flags) { return OpenFile(gMkostemps, path, path, suffix, flags); }
int mkostemps64(char* path, int suffix, int flags) {
    return OpenFile(gMkostemps64, path, path, suffix, flags);
}

int close(int descriptor) {
    if (IsOwnDescriptor(descriptor)) {
        errno = EBADF;
        return -1;
    }
    return Close(descriptor);
}

// Leaves out the recorder's own descriptors, each of which may split the range.
int close_range(unsigned int first, unsigned int last, int flags) noexcept {
    int result = 0;
    for (const unsigned int own : OwnDescriptors()) {
        if (own < first || own > last) continue;
        if (own > first) result |= CloseRange(first, own - 1, flags);
        if (own == last) return result;
        first = own + 1;
    }
    return result | CloseRange(first, last, flags);
}

void closefrom(int first) noexcept { close_range(first < 0 ? 0U : static_cast<unsigned int>(first), ~0U, 0); }

int dup(int descriptor) noexcept { return Copied(descriptor, gDup(descriptor)); }

int dup2(int descriptor, int copy) noexcept {
    MakeRoomFor(copy);
    return Copied(descriptor, gDup2(descriptor, copy));
}

int dup3(int descriptor, int copy, int flags) noexcept {
    MakeRoomFor(copy);
    return Copied(descriptor, gDup3(descriptor, copy, flags));
}

int fcntl(int descriptor, int command, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(argument, command, void*, true)
    return Fcntl(gFcntl, descriptor, command, argument);
}

int fcntl64(int descriptor, int command, ...) {
    ZANBASE_OPTIONAL_ARGUMENT(argument, command, void*, true)
    return Fcntl(gFcntl64, descriptor, command, argument);
}

}  // extern "C"
