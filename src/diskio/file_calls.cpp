// The file layers below the recorded files, over the platform's files.
#include "zanbase/adapters/file_calls.h"

#include <cerrno>
#include <cstring>

#include "platform/file.h"
#include "zanbase/disk_io.h"

std::FILE* HStdioCalls::Open(const char* name, Mode mode) {
    if (mode == nullptr || *mode == '\0' || std::strchr("rwa", *mode) == nullptr) {
        errno = EINVAL;
        return nullptr;
    }
    return OpenStream(name, mode);
}

long long HStdioCalls::Read(Native file, void* block, std::size_t size) {
    if (!HasError(file)) ClearError(file);  // the mark of the end: the file may have grown since
    const std::size_t moved = std::fread(block, 1, size, file);
    if (!HasError(file)) return static_cast<long long>(moved);
    const int reason = errno;
    if (reason == EINTR || reason == EAGAIN) ClearError(file);
    errno = reason;
    return moved != 0 ? static_cast<long long>(moved) : -1;
}

long long HStdioCalls::Write(Native file, const void* block, std::size_t size) {
    const std::size_t moved = WriteStream(file, block, size);
    return moved == 0 && HasError(file) ? -1 : static_cast<long long>(moved);
}

long long HStdioCalls::Seek(Native file, long long offset, int origin) {
    return SeekStream(file, offset, origin);
}

int HDescriptorCalls::Open(const char* name, const Mode& mode) {
    return OpenDescriptor(name, mode.mnFlags, mode.mnPermissions, mode.mbInherited);
}

long long HDescriptorCalls::Read(Native file, void* block, std::size_t size) {
    return ReadDescriptor(file, block, size);
}

long long HDescriptorCalls::Write(Native file, const void* block, std::size_t size) {
    return WriteDescriptor(file, block, size);
}

long long HDescriptorCalls::WriteTwo(Native file, const void* first, std::size_t first_size,
                                     const void* second, std::size_t second_size) {
    return WriteDescriptorTwo(file, first, first_size, second, second_size);
}

long long HDescriptorCalls::Seek(Native file, long long offset, int origin) {
    return SeekDescriptor(file, offset, origin);
}

int HDescriptorCalls::Close(Native file) { return CloseDescriptor(file); }

void HDiskIOOpenFile(const char* name, std::size_t length, void* handle, double seconds) {
    HDiskIOOpen(std::string(name, length), handle, seconds);
}
