// Contract: the lock that the C library keeps with each stdio stream.
#ifndef ZANBASE_PLATFORM_STREAM_H
#define ZANBASE_PLATFORM_STREAM_H

#include <cstdio>

// Waits until the calling thread owns the stream's own lock, the one that every output call on the stream
// acquires. Re-entrant: each call requires one UnlockStream on the same thread.
void LockStream(std::FILE* stream) noexcept;

// The same without waiting; false if another thread owns the lock. A system that has no such call always returns
// false, so a caller must be able to continue with LockStream.
bool TryLockStream(std::FILE* stream) noexcept;

void UnlockStream(std::FILE* stream) noexcept;

// Owns a stream's lock for a scope; nothing if the stream is null.
class StreamLock {
public:
    explicit StreamLock(std::FILE* stream) noexcept : mpoStream(stream) {
        if (mpoStream != nullptr) LockStream(mpoStream);
    }
    ~StreamLock() {
        if (mpoStream != nullptr) UnlockStream(mpoStream);
    }
    StreamLock(const StreamLock&) = delete;
    StreamLock& operator=(const StreamLock&) = delete;

private:
    std::FILE* const mpoStream;
};

#endif
