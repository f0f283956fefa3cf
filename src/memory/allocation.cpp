// The allocators that retry: one loop around the attempts of three of them, and that of HString, which differs.
#include "zanbase/allocation.h"

#include <atomic>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "platform/clock.h"

namespace {

using Handler = void (*)();

std::atomic<Handler> gpfnOutOfMemoryHandler{nullptr};

// The C library declares its allocators not to throw, and a compiler then drops a `catch` around a call. An
// allocator that a program put in their place may throw. The compiler assumes nothing about a call through a
// volatile pointer.
void* (*const volatile kMalloc)(std::size_t) = std::malloc;
void* (*const volatile kCalloc)(std::size_t, std::size_t) = std::calloc;
void* (*const volatile kRealloc)(void*, std::size_t) = std::realloc;

// The pauses between attempts while no handler is installed. Memory may be freed while other threads or
// processes end, so the attempt is repeated after 1, 2, 4, … ms. A caller that requires its block must not
// continue without it, so after the last pause the process is aborted.
class RetryPauses {
public:
    // Sleeps for the next pause; aborts after the last one. `bytes` is the size that was requested.
    void SleepOrAbort(std::size_t bytes) {
        if (mnPauseMs > kLongestPauseMs) {
            std::fprintf(stderr, "zanbase: memory exhausted and no handler installed: %zu bytes requested\n",
                         bytes);
            std::abort();
        }
        SleepFor(mnPauseMs);
        mnPauseMs *= 2;
    }

private:
    static constexpr unsigned int kLongestPauseMs = 512;
    unsigned int mnPauseMs = 1;
};

// Repeats `attempt` until it gives a block of `bytes` bytes. A std::bad_alloc out of it counts as null.
template <class Attempt>
void* RetryUntilAllocated(std::size_t bytes, Attempt attempt) {
    RetryPauses pauses;
    for (;;) {
        try {
            if (void* block = attempt()) return block;
        } catch (const std::bad_alloc&) {
            // Not passed on: the handler decides what exhausted memory leads to.
        }
        if (const Handler handler = gpfnOutOfMemoryHandler.load()) {
            handler();
        } else {
            pauses.SleepOrAbort(bytes);
        }
    }
}

// The largest size if the product is larger still.
std::size_t Product(std::size_t count, std::size_t size) {
    return size != 0 && count > SIZE_MAX / size ? SIZE_MAX : count * size;
}

// The size of a copy of `text` with its terminator, or of the block that stands for a null text.
std::size_t StringBlockBytes(const char* text) {
    constexpr std::size_t kEmptyBlockBytes = 16;
    if (text == nullptr) return kEmptyBlockBytes;
    const int length = static_cast<int>(std::strlen(text));
    return static_cast<std::size_t>(length) + 1;
}

}  // namespace

void* HMalloc(std::size_t size) {
    return RetryUntilAllocated(size, [=] { return kMalloc(size); });
}

void* HCalloc(std::size_t count, std::size_t size) {
    return RetryUntilAllocated(Product(count, size), [=] { return kCalloc(count, size); });
}

void* HRealloc(void* ptr, std::size_t size) {
    if (size != 0) return RetryUntilAllocated(size, [=] { return kRealloc(ptr, size); });
    try {
        return kRealloc(ptr, 0);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

// Unlike the others it passes on a std::bad_alloc of the attempt, and reads the handler only at entry and
// after each call of it. Each attempt measures the text anew: the handler may have changed it.
char* HString(const char* text) {
    Handler handler = gpfnOutOfMemoryHandler.load();
    RetryPauses pauses;
    for (;;) {
        const std::size_t size = StringBlockBytes(text);
        if (char* copy = static_cast<char*>(kMalloc(size))) {
            if (text != nullptr) return static_cast<char*>(std::memcpy(copy, text, size));
            copy[0] = '\0';
            return copy;
        }
        if (handler != nullptr) {
            handler();
            handler = gpfnOutOfMemoryHandler.load();
        } else {
            pauses.SleepOrAbort(size);
        }
    }
}

void HHandleOutOfMemory() {
    if (const Handler handler = gpfnOutOfMemoryHandler.load()) handler();
}

void HOutOfMemoryHandler(void (*handler)()) { gpfnOutOfMemoryHandler.store(handler); }
