// Pages of the file are mapped by copying the mapping of a page that comes before them and making the copy
// longer: that takes no descriptor, so it works whatever the program does to its descriptors, its root and
// its namespaces, and after a fork as well.
#include "shared_memory.h"

#include <sys/mman.h>

namespace recorder {
namespace {

constexpr std::size_t kChunkBytes = std::size_t{1} << 20;
constexpr std::size_t kAlignment = 64;

Control* gControl = nullptr;
char* gLastPage = nullptr;  // of those that this process has mapped; guarded by gLock, as are all below
Position gLastPosition = 0;
char* gFree = nullptr;
Position gFreePosition = 0;
std::size_t gFreeBytes = 0;
SpinLock gLock;

std::size_t RoundUp(std::size_t bytes, std::size_t unit) { return (bytes + unit - 1) / unit * unit; }

// Takes whole pages at the end of the file.
char* MapFilePages(std::size_t bytes, Position& position) {
    const std::size_t size = RoundUp(bytes, kPageBytes);
    position = gControl->end.fetch_add(size, std::memory_order_relaxed);
    if (position + size > kFileBytes) return nullptr;
    const std::size_t before = position - gLastPosition;
    void* const copy = mremap(gLastPage, 0, before + size, MREMAP_MAYMOVE);
    if (copy == MAP_FAILED) return nullptr;
    auto* const pages = static_cast<char*>(copy) + before;
    if (before > kPageBytes) munmap(copy, before);
    gLastPage = pages + size - kPageBytes;
    gLastPosition = position + size - kPageBytes;
    return pages;
}

}  // namespace

void* MapPages(std::size_t bytes, bool inherited) {
    constexpr std::size_t kHugePage = std::size_t{1} << 21;
    void* const pages = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (pages == MAP_FAILED) return nullptr;
    if (bytes >= 2 * kHugePage) madvise(pages, bytes, MADV_HUGEPAGE);
    if (!inherited) madvise(pages, bytes, MADV_DONTFORK);
    return pages;
}

void UnmapPages(void* pages, std::size_t bytes) { munmap(pages, bytes); }

Control* MapControl(int descriptor) {
    void* const page = mmap(nullptr, RoundUp(sizeof(Control), kPageBytes), PROT_READ | PROT_WRITE, MAP_SHARED,
                            descriptor, 0);
    if (page == MAP_FAILED) return nullptr;
    gControl = static_cast<Control*>(page);
    gLastPage = static_cast<char*>(page);
    return gControl;
}

Account* TakeAccount(Position& position) {
    const SpinLockScope lock(gLock);
    return reinterpret_cast<Account*>(MapFilePages(sizeof(Account), position));
}

void* TakeShared(std::size_t bytes, Position& position) {
    const std::size_t needed = RoundUp(bytes, kAlignment);
    const SpinLockScope lock(gLock);
    if (gFreeBytes < needed) {
        const std::size_t taken = needed > kChunkBytes ? needed : kChunkBytes;
        char* const pages = MapFilePages(taken, gFreePosition);
        if (pages == nullptr) return nullptr;
        gFree = pages;
        gFreeBytes = taken;
    }
    char* const taken = gFree;
    position = gFreePosition;
    gFree += needed;
    gFreePosition += needed;
    gFreeBytes -= needed;
    return taken;
}

void ResetSharedMemory() {
    gLock.Release();
    gFreeBytes = 0;
}

TextPlace KeepText(const char* text, std::size_t bytes) {
    Position position = 0;
    void* const kept = TakeShared(bytes, position);
    if (kept == nullptr) return {};
    std::memcpy(kept, text, bytes);
    return {position, bytes};
}

}  // namespace recorder
