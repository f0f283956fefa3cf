// The lock of a stream as POSIX has it.
#include "platform/stream.h"

void LockStream(std::FILE* stream) noexcept { flockfile(stream); }

bool TryLockStream(std::FILE* stream) noexcept { return ftrylockfile(stream) == 0; }

void UnlockStream(std::FILE* stream) noexcept { funlockfile(stream); }
