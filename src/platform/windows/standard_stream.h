// Moving a standard stream to another file while other threads may use it.
#ifndef ZANBASE_PLATFORM_WINDOWS_STANDARD_STREAM_H
#define ZANBASE_PLATFORM_WINDOWS_STANDARD_STREAM_H

#include <cstdio>

// Whether the stream has no file.
bool IsClosed(std::FILE* stream) noexcept;

// Copies `target` over `stream`, so that both have one file, or connects `stream` to the null device if `target` is
// null. Makes `stream` unbuffered. Pending output is written to the file that it used before; buffered input is
// dropped.
//
// Waits a bounded time. Output that the old file does not accept within a second is lost. If another thread holds
// the stream's lock for that long, `stream` stays as it is. Requires: `stream` is not closed.
void RedirectStream(std::FILE* stream, const std::FILE* target) noexcept;

#endif
