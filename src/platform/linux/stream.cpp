// The lock of a stream as POSIX has it.
#include "platform/stream.h"

void LockStream(std::FILE* stream) noexcept { flockfile(stream); }

void UnlockStream(std::FILE* stream) noexcept { funlockfile(stream); }
