// One recorded disk operation: measured around the real call, credited if that succeeded.
#ifndef ZANBASE_RECORD_DISK_OPERATION_H
#define ZANBASE_RECORD_DISK_OPERATION_H

#include <cstdint>

#include "files.h"
#include "recording.h"

namespace recorder {

// Calls `real` and returns its result; a result of 0 or more counts as `operation` of the file behind
// `descriptor`, with that many bytes if `operation` moves bytes.
template <class Call>
auto Operate(DiskOperation operation, int descriptor, const Call& real) {
    FileRow* const file = Wants(kDisk) ? FileOf(descriptor) : nullptr;
    if (file == nullptr) return real();
    const std::uint64_t start = Now();
    const auto result = real();
    if (result < 0) return result;
    const bool moves = operation == DiskOperation::kRead || operation == DiskOperation::kWrite;
    CountOperation(*file, operation, moves ? static_cast<std::uint64_t>(result) : 0, Now() - start);
    return result;
}

// Calls `real`, which opens `path`, and counts the open of the descriptor that `descriptor_of` finds in its
// result.
template <class Call, class Descriptor>
auto Open(const char* path, const Call& real, const Descriptor& descriptor_of) {
    if (!Wants(kDisk)) return real();
    const std::uint64_t start = Now();
    gThread.opening = true;
    const auto result = real();
    gThread.opening = false;
    const std::uint64_t end = Now();
    const int descriptor = descriptor_of(result);
    if (descriptor >= 0) CountOpen(descriptor, path, end - start);
    return result;
}

inline bool IsOwnDescriptor(int descriptor) { return descriptor >= 0 && descriptor == gOwnDescriptor; }

// Counts what the C library's streams do from now on; further calls do nothing. False if its tables are not
// as expected: then only opens of streams are counted.
bool HookStreams();

}  // namespace recorder

#endif
