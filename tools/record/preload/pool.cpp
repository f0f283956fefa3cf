// The pool: chunks of pages that are used from front to back.
#include "pool.h"

#include <algorithm>

#include <sys/mman.h>

#include "spin_lock.h"

namespace recorder {
namespace {

constexpr std::size_t kChunkBytes = std::size_t{1} << 18;
constexpr std::size_t kAlignment = 16;

SpinLock gLock;
char* gFree = nullptr;  // guarded by gLock, as is the next
std::size_t gFreeBytes = 0;

}  // namespace

void* MapPages(std::size_t bytes) {
    constexpr std::size_t kHugePage = std::size_t{1} << 21;
    void* const pages = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (pages == MAP_FAILED) return nullptr;
    if (bytes >= 2 * kHugePage) madvise(pages, bytes, MADV_HUGEPAGE);
    return pages;
}

void UnmapPages(void* pages, std::size_t bytes) { munmap(pages, bytes); }

void* TakeFromPool(std::size_t bytes) {
    const std::size_t needed = (bytes + kAlignment - 1) & ~(kAlignment - 1);
    const SpinLockScope lock(gLock);
    if (gFreeBytes < needed) {
        const std::size_t chunk = std::max(needed, kChunkBytes);
        void* const pages = MapPages(chunk);
        if (pages == nullptr) return nullptr;
        gFree = static_cast<char*>(pages);
        gFreeBytes = chunk;
    }
    char* const taken = gFree;
    gFree += needed;
    gFreeBytes -= needed;
    return taken;
}

void ResetPoolLock() { gLock.Release(); }

}  // namespace recorder
