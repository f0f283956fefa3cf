// The lock of a stream as the C runtime has it.
#include "platform/stream.h"

void LockStream(std::FILE* stream) noexcept { _lock_file(stream); }

void UnlockStream(std::FILE* stream) noexcept { _unlock_file(stream); }
