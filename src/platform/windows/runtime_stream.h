// What the C runtime keeps of a stream and of a descriptor, for which it has no calls. It has kept these forms since its
// first release: programs for msvcrt contain macros over the fields of a stream, and calls that acquire its lock.
#ifndef ZANBASE_PLATFORM_WINDOWS_RUNTIME_STREAM_H
#define ZANBASE_PLATFORM_WINDOWS_RUNTIME_STREAM_H

#include <cstddef>
#include <cstdio>

#include "platform/windows/system.h"

struct RuntimeStream {
#ifdef _UCRT
    char fields[48];
#else
    std::FILE fields;  // guarded by the stream's lock
#endif
    CRITICAL_SECTION lock;  // only if HasOwnLock
};

inline RuntimeStream* In(std::FILE* stream) noexcept { return reinterpret_cast<RuntimeStream*>(stream); }

#ifndef _UCRT
// msvcrt's entry for a descriptor. It exports the table, in blocks of 32.
struct RuntimeDescriptor {
    HANDLE handle;
    char flags[4];
    int is_lock_made;
    CRITICAL_SECTION lock;  // owned by a thread that reads or writes
};
extern "C" __declspec(dllimport) RuntimeDescriptor* __pioinfo[];
#endif

// False for the first 20 streams of msvcrt, the standard ones among them: their locks are in a table that it does not
// export. Streams of the UCRT have their locks, but those of Wine's are too small for that.
inline bool HasOwnLock(std::FILE* stream) noexcept {
#ifdef _UCRT
    const auto bytes = reinterpret_cast<char*>(stdout) - reinterpret_cast<char*>(stdin);
    return stream != nullptr && bytes >= static_cast<std::ptrdiff_t>(sizeof(RuntimeStream));
#else
    constexpr int kStreamsInTable = 20;
    return stream < stdin || stream >= stdin + kStreamsInTable;
#endif
}

// Whether a stream that has no lock of its own is marked as locked.
inline bool IsMarkedLocked([[maybe_unused]] std::FILE* stream) noexcept {
#ifdef _UCRT
    return false;
#else
    constexpr int kIsLocked = 0x8000;
    return (In(stream)->fields._flag & kIsLocked) != 0;
#endif
}

// Whether a thread is inside a read or a write of the descriptor, or waits in one. The UCRT does not show it.
inline bool IsInTransfer([[maybe_unused]] int descriptor) noexcept {
#ifdef _UCRT
    return false;
#else
    constexpr int kBlock = 32;
    if (descriptor < 0) return false;
    RuntimeDescriptor& entry = __pioinfo[descriptor / kBlock][descriptor % kBlock];
    if (entry.is_lock_made == 0) return false;
    if (TryEnterCriticalSection(&entry.lock) == 0) return true;
    LeaveCriticalSection(&entry.lock);
    return false;
#endif
}

#endif
