// The hooks of the C allocators. A block is recorded after it was taken and dropped before it is freed:
// between the two no other thread can get a block at its address.
#include <cstddef>
#include <cstdlib>

#include <malloc.h>

#include "next_function.h"
#include "recording.h"

namespace recorder {
namespace {

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

[[gnu::always_inline]] inline void* Recorded(void* block, std::size_t size) {
    if (block != nullptr && Wants(kMemory)) RecordBlock(block, size, CallerOfHook());
    return block;
}

// A reallocation that fails leaves the block as it was; with a size of 0 it freed it.
template <class Call>
[[gnu::always_inline]] inline void* Reallocated(void* old, std::size_t size, const Call& reallocate) {
    if (old == nullptr || !Wants(kMemory)) return Recorded(reallocate(), size);
    const DroppedBlock dropped = ForgetBlock(old);
    void* const block = reallocate();
    if (block == nullptr && size != 0 && dropped.found) {
        const RecursionGuard guard;
        RestoreBlock(*gAccount, old, dropped);
    }
    return Recorded(block, size);
}

}  // namespace
}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

// A function that allocates `bytes`.
#define ZANBASE_ALLOCATOR(name, parameters, bytes, ...) \
    ZANBASE_HOOK(void*, name, parameters, noexcept) { return Recorded(next::name(__VA_ARGS__), bytes); }

ZANBASE_ALLOCATOR(memalign, (std::size_t alignment, std::size_t size), size, alignment, size)
ZANBASE_ALLOCATOR(aligned_alloc, (std::size_t alignment, std::size_t size), size, alignment, size)
ZANBASE_ALLOCATOR(valloc, (std::size_t size), size, size)
ZANBASE_ALLOCATOR(pvalloc, (std::size_t size), size, size)

ZANBASE_HOOK(void*, malloc, (std::size_t size), noexcept) {
    if (IsLookingUp() && next::malloc.Known() == nullptr) return TakeForLookUp(size);
    return Recorded(next::malloc(size), size);
}

ZANBASE_HOOK(void*, calloc, (std::size_t count, std::size_t size), noexcept) {
    if (IsLookingUp() && next::calloc.Known() == nullptr) return TakeForLookUp(count * size);
    return Recorded(next::calloc(count, size), count * size);
}

ZANBASE_HOOK(int, posix_memalign, (void** block, std::size_t alignment, std::size_t size), noexcept) {
    const int error = next::posix_memalign(block, alignment, size);
    if (error == 0) Recorded(*block, size);
    return error;
}

ZANBASE_HOOK(void*, realloc, (void* old, std::size_t size), noexcept) {
    return Reallocated(old, size, [&] { return next::realloc(old, size); });
}

ZANBASE_HOOK(void*, reallocarray, (void* old, std::size_t count, std::size_t size), noexcept) {
    std::size_t bytes = 0;
    if (__builtin_mul_overflow(count, size, &bytes))
        return next::reallocarray(old, count, size);  // refuses it
    return Reallocated(old, bytes, [&] { return next::realloc(old, bytes); });
}

ZANBASE_HOOK(void, free, (void* block), noexcept) {
    if (block == nullptr || IsForLookUp(block)) return;
    if (Wants(kMemory)) ForgetBlock(block);
    next::free(block);
}
