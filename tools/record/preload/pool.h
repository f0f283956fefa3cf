// Memory of the recorder's own, taken from the system rather than from the program's heap: many small blocks
// between those of the program would cost it more than the recording itself.
#ifndef ZANBASE_RECORD_POOL_H
#define ZANBASE_RECORD_POOL_H

#include <cstddef>

namespace recorder {

// Whole pages, filled with zeros, or null.
void* MapPages(std::size_t bytes);
void UnmapPages(void* pages, std::size_t bytes);

// `bytes` zero bytes that are never given back, aligned for any type, or null.
void* TakeFromPool(std::size_t bytes);

// A child after fork has one thread: no other can hold the pool's lock.
void ResetPoolLock();

}  // namespace recorder

#endif
