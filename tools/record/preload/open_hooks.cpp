// The hooks of calls that make descriptors, copy them and close them.
#include <cerrno>
#include <cstdarg>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

#include "disk_operation.h"
#include "next_function.h"

// What a program that was compiled with checks calls.
extern "C" {
int __open_2(const char* path, int flags);
int __open64_2(const char* path, int flags);
int __openat_2(int folder, const char* path, int flags);
int __openat64_2(int folder, const char* path, int flags);
}

namespace recorder {
namespace {

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
    if (IsOwnDescriptor(copy) && !gThread.in_vfork) VacateDescriptor();
}

// A mode is there only where a file may be made.
bool HasMode(int flags) { return (flags & O_CREAT) != 0 || (flags & O_TMPFILE) == O_TMPFILE; }

// The mark goes first: after the real close another thread may get the number.
template <class Function>
int Close(NextFunction<Function>& real, int descriptor) {
    FileRow* const file = Wants(kDisk) ? ForgetDescriptor(descriptor) : nullptr;
    if (file == nullptr) return real(descriptor);
    const std::uint64_t start = Now();
    const int result = real(descriptor);
    CountOperation(*file, DiskOperation::kClose, 0, Now() - start);
    return result;
}

template <class Function>
int CloseRange(NextFunction<Function>& real, unsigned int first, unsigned int last, int flags) {
    constexpr unsigned int kLooked = 4096;
    const bool closes = (static_cast<unsigned int>(flags) & CLOSE_RANGE_CLOEXEC) == 0;
    for (unsigned int number = first; closes && number <= last && number < kLooked; ++number) {
        FileRow* const file = Wants(kDisk) ? ForgetDescriptor(static_cast<int>(number)) : nullptr;
        if (file != nullptr) CountOperation(*file, DiskOperation::kClose, 0, 0);
    }
    return real(first, last, flags);
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

// Hooks of functions that open `path`; those that end in CREATES have a mode where a file may be made.
#define ZANBASE_OPEN(name, parameters, ...) \
    ZANBASE_HOOK(int, name, parameters, ) { return OpenFile(next::name, path, __VA_ARGS__); }
#define ZANBASE_OPEN_CREATES(name, parameters, ...)                    \
    ZANBASE_HOOK(int, name, parameters, ) {                            \
        ZANBASE_OPTIONAL_ARGUMENT(mode, flags, mode_t, HasMode(flags)) \
        return OpenFile(next::name, path, __VA_ARGS__, flags, mode);   \
    }

ZANBASE_OPEN_CREATES(open, (const char* path, int flags, ...), path)
ZANBASE_OPEN_CREATES(open64, (const char* path, int flags, ...), path)
ZANBASE_OPEN_CREATES(openat, (int folder, const char* path, int flags, ...), folder, path)
ZANBASE_OPEN_CREATES(openat64, (int folder, const char* path, int flags, ...), folder, path)
ZANBASE_OPEN(__open_2, (const char* path, int flags), path, flags)
ZANBASE_OPEN(__open64_2, (const char* path, int flags), path, flags)
ZANBASE_OPEN(__openat_2, (int folder, const char* path, int flags), folder, path, flags)
ZANBASE_OPEN(__openat64_2, (int folder, const char* path, int flags), folder, path, flags)
ZANBASE_OPEN(creat, (const char* path, mode_t mode), path, mode)
ZANBASE_OPEN(creat64, (const char* path, mode_t mode), path, mode)
ZANBASE_OPEN(mkstemp, (char* path), path)
ZANBASE_OPEN(mkstemp64, (char* path), path)
ZANBASE_OPEN(mkostemp, (char* path, int flags), path, flags)
ZANBASE_OPEN(mkostemp64, (char* path, int flags), path, flags)
ZANBASE_OPEN(mkstemps, (char* path, int suffix), path, suffix)
ZANBASE_OPEN(mkstemps64, (char* path, int suffix), path, suffix)
ZANBASE_OPEN(mkostemps, (char* path, int suffix, int flags), path, suffix, flags)
ZANBASE_OPEN(mkostemps64, (char* path, int suffix, int flags), path, suffix, flags)

ZANBASE_HOOK(int, close, (int descriptor), ) {
    if (IsOwnDescriptor(descriptor)) {
        errno = EBADF;
        return -1;
    }
    return Close(next::close, descriptor);
}

// Leaves out the recorder's own descriptor, which may split the range.
ZANBASE_HOOK(int, close_range, (unsigned int first, unsigned int last, int flags), noexcept) {
    const auto own = static_cast<unsigned int>(gOwnDescriptor);
    if (own < first || own > last) return CloseRange(next::close_range, first, last, flags);
    const int below = own > first ? CloseRange(next::close_range, first, own - 1, flags) : 0;
    const int above = own < last ? CloseRange(next::close_range, own + 1, last, flags) : 0;
    return below | above;
}

ZANBASE_HOOK(void, closefrom, (int first), noexcept) {
    close_range(first < 0 ? 0U : static_cast<unsigned int>(first), ~0U, 0);
}

ZANBASE_HOOK(int, dup, (int descriptor), noexcept) { return Copied(descriptor, next::dup(descriptor)); }

ZANBASE_HOOK(int, dup2, (int descriptor, int copy), noexcept) {
    MakeRoomFor(copy);
    return Copied(descriptor, next::dup2(descriptor, copy));
}

ZANBASE_HOOK(int, dup3, (int descriptor, int copy, int flags), noexcept) {
    MakeRoomFor(copy);
    return Copied(descriptor, next::dup3(descriptor, copy, flags));
}

ZANBASE_HOOK(int, fcntl, (int descriptor, int command, ...), ) {
    ZANBASE_OPTIONAL_ARGUMENT(argument, command, void*, true)
    return Fcntl(next::fcntl, descriptor, command, argument);
}

ZANBASE_HOOK(int, fcntl64, (int descriptor, int command, ...), ) {
    ZANBASE_OPTIONAL_ARGUMENT(argument, command, void*, true)
    return Fcntl(next::fcntl64, descriptor, command, argument);
}
