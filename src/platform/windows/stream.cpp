// The lock of a stream as the C runtime has it.
#include "platform/stream.h"

#include "platform/windows/runtime_stream.h"

void LockStream(std::FILE* stream) noexcept { _lock_file(stream); }

bool TryLockStream(std::FILE* stream) noexcept {
    return HasOwnLock(stream) && TryEnterCriticalSection(&In(stream)->lock) != 0;
}

void UnlockStream(std::FILE* stream) noexcept { _unlock_file(stream); }
