/// @file
/// Allocators that give a block or do not come back, and the handler that they call when memory runs out.
#ifndef ZANBASE_ALLOCATION_H
#define ZANBASE_ALLOCATION_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup memory
/// @{

// All blocks come from the runtime's general heap and go back through `std::free`. An attempt that fails
// calls the installed handler once and is made again, without end; the handler can make memory available, end
// the process, or throw, and what it throws reaches the allocator's caller. With no handler installed a
// failed attempt is made again a bounded number of times with growing pauses (about a second in all); then
// one line goes to standard error and the process aborts. Any thread may call any of these functions at any
// time. None of them tells the allocation tracker anything: a caller that wants a block tracked calls
// `HMemory::Alloc`.

/// A block of `size` bytes, never null. A `size` of 0 is a request like any other: should the runtime answer
/// it with null, that counts as a failed attempt.
[[nodiscard]] ZANBASE_API void* HMalloc(std::size_t size);

/// A zero-filled block of `count` elements of `size` bytes each, never null.
[[nodiscard]] ZANBASE_API void* HCalloc(std::size_t count, std::size_t size);

/// `ptr` resized to `size` bytes, possibly moved; a null `ptr` asks for a fresh block. `ptr` stays valid
/// until an attempt succeeds. With a `size` of 0 exactly one attempt is made, its answer is returned, which
/// may be null, and the handler is not called; otherwise the result is never null.
[[nodiscard]] ZANBASE_API void* HRealloc(void* ptr, std::size_t size);

/// A copy of the zero-terminated `text`, terminator included, never null. `text` is shorter than 2^31 - 1
/// bytes. A null `text` gives a block of 16 bytes that holds an empty text.
[[nodiscard]] ZANBASE_API char* HString(const char* text);

/// Calls the installed handler and returns when it returns; does nothing if none is installed.
ZANBASE_API void HHandleOutOfMemory();

/// Installs `handler` for the whole process in place of the one before; null takes it away. Threads that run
/// out of memory at the same time call the handler at the same time, so it has to be safe for that.
ZANBASE_API void HOutOfMemoryHandler(void (*handler)());

/// @}

#endif
