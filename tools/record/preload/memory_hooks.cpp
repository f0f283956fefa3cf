// The hooks of the C allocators. A block is recorded after it was taken and dropped before it is freed:
// between the two no other thread can get a block at its address.
#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>

#include <malloc.h>

#include "next_function.h"
#include "recording.h"

namespace recorder {
namespace {

NextFunction<void*(std::size_t)> gMalloc{"malloc"};
NextFunction<void*(std::size_t, std::size_t)> gCalloc{"calloc"};
NextFunction<void*(void*, std::size_t)> gRealloc{"realloc"};
NextFunction<void*(void*, std::size_t, std::size_t)> gReallocArray{"reallocarray"};
NextFunction<void(void*)> gFree{"free"};
NextFunction<void*(std::size_t, std::size_t)> gMemalign{"memalign"};
NextFunction<void*(std::size_t, std::size_t)> gAlignedAlloc{"aligned_alloc"};
NextFunction<int(void**, std::size_t, std::size_t)> gPosixMemalign{"posix_memalign"};
NextFunction<void*(std::size_t)> gValloc{"valloc"};
NextFunction<void*(std::size_t)> gPvalloc{"pvalloc"};

// What the loader allocates while the allocators themselves are looked up. Never freed.
alignas(std::max_align_t) char gLookUpMemory[16384];
std::size_t gLookUpUsed = 0;

void* TakeForLookUp(std::size_t size) {
    const std::size_t rounded =
        (size + alignof(std::max_align_t) - 1) / alignof(std::max_align_t) * alignof(std::max_align_t);
    if (rounded > sizeof gLookUpMemory - gLookUpUsed) return nullptr;
    gLookUpUsed += rounded;
    return gLookUpMemory + gLookUpUsed - rounded;
}

bool IsForLookUp(const void* block) {
    const auto address = reinterpret_cast<std::uintptr_t>(block);
    const auto first = reinterpret_cast<std::uintptr_t>(gLookUpMemory);
    return address >= first && address < first + sizeof gLookUpMemory;
}

template <class Function, class... Arguments>
[[gnu::always_inline]] inline auto Call(NextFunction<Function>& next, Arguments... arguments) {
    const AllocatorScope scope;
    return next(arguments...);
}

[[gnu::always_inline]] inline void* Recorded(void* block, std::size_t size) {
    if (block != nullptr && Wants(kMemory)) RecordBlock(block, size, CallerOfHook());
    return block;
}

// A signal handler that allocates meanwhile must not find the table halfway through a change.
[[gnu::always_inline]] inline DroppedBlock Dropped(const void* block) {
    gThread.inside = true;
    const DroppedBlock dropped = DropBlock(block);
    gThread.inside = false;
    return dropped;
}

// A reallocation that fails leaves the block as it was; with a size of 0 it freed it.
[[gnu::always_inline]] inline void* Reallocate(void* old, std::size_t size) {
    if (old == nullptr || !Wants(kMemory)) return Recorded(Call(gRealloc, old, size), size);
    const DroppedBlock dropped = Dropped(old);
    void* const block = Call(gRealloc, old, size);
    if (block == nullptr && size != 0 && dropped.found) {
        const InsideScope scope;
        RestoreBlock(old, dropped);
    }
    return Recorded(block, size);
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

extern "C" {

void* malloc(std::size_t size) noexcept {
    if (IsLookingUp() && gMalloc.Known() == nullptr) return TakeForLookUp(size);
    return Recorded(Call(gMalloc, size), size);
}

void* calloc(std::size_t count, std::size_t size) noexcept {
    if (IsLookingUp() && gCalloc.Known() == nullptr) return TakeForLookUp(count * size);
    return Recorded(Call(gCalloc, count, size), count * size);
}

void* realloc(void* old, std::size_t size) noexcept { return Reallocate(old, size); }

void* reallocarray(void* old, std::size_t count, std::size_t size) noexcept {
    std::size_t bytes = 0;
    if (__builtin_mul_overflow(count, size, &bytes))
        return Call(gReallocArray, old, count, size);  // refuses it
    return Reallocate(old, bytes);
}

void free(void* block) noexcept {
    if (block == nullptr || IsForLookUp(block)) return;
    if (Wants(kMemory)) Dropped(block);
    Call(gFree, block);
}

void* memalign(std::size_t alignment, std::size_t size) noexcept {
    return Recorded(Call(gMemalign, alignment, size), size);
}

void* aligned_alloc(std::size_t alignment, std::size_t size) noexcept {
    return Recorded(Call(gAlignedAlloc, alignment, size), size);
}

int posix_memalign(void** block, std::size_t alignment, std::size_t size) noexcept {
    const int error = Call(gPosixMemalign, block, alignment, size);
    if (error == 0) Recorded(*block, size);
    return error;
}

void* valloc(std::size_t size) noexcept { return Recorded(Call(gValloc, size), size); }

void* pvalloc(std::size_t size) noexcept { return Recorded(Call(gPvalloc, size), size); }

}  // extern "C"
