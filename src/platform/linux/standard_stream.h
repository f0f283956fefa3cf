// Moving a standard stream to another file while other threads may use it.
#ifndef ZANBASE_PLATFORM_LINUX_STANDARD_STREAM_H
#define ZANBASE_PLATFORM_LINUX_STANDARD_STREAM_H

#include <cstdio>

// Points `stream` at the open file of the descriptor `target` and makes it unbuffered. Pending output is
// written to the file that the stream used before; buffered input is dropped. Does nothing to a closed stream.
//
// Waits a bounded time and raises no SIGPIPE. Output that the old file does not accept within a second is
// lost; so is, if the process has no free descriptor, what it does not accept at once. If another thread holds the stream's lock for a tenth of a second (it reads standard input, or writes
// to a full pipe), only the descriptor moves: the stream stays buffered, and its pending output is written
// to `target`. Not thread-safe: one thread at a time calls this.
void RedirectStream(std::FILE* stream, int target) noexcept;

#endif
