// Moving a standard stream to another file while other threads may use it.
#ifndef ZANBASE_PLATFORM_WINDOWS_STANDARD_STREAM_H
#define ZANBASE_PLATFORM_WINDOWS_STANDARD_STREAM_H

#include <cstdio>

// Whether the stream has no file.
bool IsClosed(std::FILE* stream) noexcept;

// Points `stream` at the open file of the descriptor `target` and makes it unbuffered. Pending output is written to the
// file that the stream used before; buffered input is dropped.
//
// Waits a bounded time. Output that a full pipe does not accept within a second is lost. Returns false if another
// thread holds the stream's lock for a tenth of a second; `stream` stays as it is. A stream that the calling thread
// has locked counts as such if it is among the first 20 of msvcrt. Requires: `stream` is not closed.
bool RedirectStream(std::FILE* stream, int target) noexcept;

#endif
