/// @file
/// Allocators that return a block or do not return, and the handler that they call when memory is exhausted.
///
/// All blocks come from the runtime's general heap; release them with `std::free`. A failed attempt calls the
/// installed handler once and is then repeated, without limit. The handler can free memory, end the process,
/// or throw; its exception reaches the caller of the allocator. With no handler installed, a failed attempt
/// is repeated a bounded number of times with growing pauses, about a second in all; then one line with the
/// requested size is written to standard error and the process is aborted.
///
/// None of these functions records anything in the allocation tracker; see `HMemory::Alloc`.
///
/// Thread-safety: all functions are thread-safe and acquire no lock of the library.
#ifndef ZANBASE_ALLOCATION_H
#define ZANBASE_ALLOCATION_H

#include <cstddef>

#include "zanbase/export.h"

/// @addtogroup memory
/// @{

/// Returns a block of `size` bytes, never null. A `size` of 0 is a request like any other: if the runtime
/// answers it with null, that is a failed attempt. Thread-safe.
[[nodiscard]] ZANBASE_API void* HMalloc(std::size_t size);

/// Returns a zero-filled block of `count` elements of `size` bytes each, never null. Thread-safe.
[[nodiscard]] ZANBASE_API void* HCalloc(std::size_t count, std::size_t size);

/// Resizes the block `ptr` to `size` bytes and returns it, possibly moved; a null `ptr` requests a new block.
/// `ptr` stays valid until an attempt succeeds. If `size` is not 0, the result is never null.
///
/// If `size` is 0, exactly one attempt is made, the handler is not called, and the runtime's answer is
/// returned: on most systems the block is released and the result is null. Release blocks with `std::free`
/// instead. Thread-safe for different blocks.
ZANBASE_API void* HRealloc(void* ptr, std::size_t size);

/// Returns a copy of the zero-terminated `text` with its terminator, never null. A null `text` gives a block
/// of 16 bytes that holds an empty text. Each attempt measures `text` anew, so the handler may change it. Requires:
/// `text` is shorter than 2^31 - 1 bytes. Thread-safe.
[[nodiscard]] ZANBASE_API char* HString(const char* text);

/// Calls the installed handler; does nothing if none is installed. Thread-safe.
ZANBASE_API void HHandleOutOfMemory();

/// Installs `handler` for the whole process and replaces the previous one; null removes it. Thread-safe.
/// Requires: `handler` is thread-safe, since threads that run out of memory at once call it at once.
ZANBASE_API void HOutOfMemoryHandler(void (*handler)());

/// @}

#endif
