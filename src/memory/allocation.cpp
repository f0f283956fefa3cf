// The allocators that retry: one loop, four attempts.
#include "zanbase/allocation.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "platform/clock.h"

namespace {

using Handler = void (*)();

std::atomic<Handler> gpfnOutOfMemoryHandler{nullptr};

// The C library declares its allocators not to throw, and a compiler then drops a `catch` around a call; an
// allocator that a program put in their place may throw all the same. Nothing is assumed of a call through a
// volatile pointer.
void* (*const volatile kMalloc)(std::size_t) = std::malloc;
void* (*const volatile kCalloc)(std::size_t, std::size_t) = std::calloc;
void* (*const volatile kRealloc)(void*, std::size_t) = std::realloc;

// What a failed attempt leads to when nobody installed a handler: memory may come back while other threads or
// processes end, so the attempt is repeated after 1, 2, 4, … ms; a caller that can't go on without its block
// must not go on, so after the last pause the process stops.
class Patience {
public:
    void Use() {
        if (mnPauseMs > kLongestPauseMs) {
            std::fputs("zanbase: memory exhausted and no handler installed\n", stderr);
            std::abort();
        }
        SleepFor(mnPauseMs);
        mnPauseMs *= 2;
    }

private:
    static constexpr unsigned int kLongestPauseMs = 512;
    unsigned int mnPauseMs = 1;
};

// Runs `attempt` until it gives a block; a std::bad_alloc out of it counts as a null.
template <class Attempt>
void* Insist(Attempt attempt) {
    Patience patience;
    for (;;) {
        try {
            if (void* block = attempt()) return block;
        } catch (const std::bad_alloc&) {
            // Not passed on: the handler decides what becomes of exhausted memory.
        }
        if (const Handler handler = gpfnOutOfMemoryHandler.load()) {
            handler();
        } else {
            patience.Use();
        }
    }
}

}  // namespace

void* HMalloc(std::size_t size) {
    return Insist([=] { return kMalloc(size); });
}

void* HCalloc(std::size_t count, std::size_t size) {
    return Insist([=] { return kCalloc(count, size); });
}

void* HRealloc(void* ptr, std::size_t size) {
    if (size != 0) return Insist([=] { return kRealloc(ptr, size); });
    try {
        return kRealloc(ptr, 0);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

// Unlike the others it lets a std::bad_alloc of the attempt through, and reads the handler only at entry and
// after each call of it.
char* HString(const char* text) {
    constexpr std::size_t kEmptyBlockBytes = 16;
    const int length = text != nullptr ? static_cast<int>(std::strlen(text)) : 0;
    const std::size_t size = text != nullptr ? static_cast<std::size_t>(length) + 1 : kEmptyBlockBytes;
    Handler handler = gpfnOutOfMemoryHandler.load();
    Patience patience;
    for (;;) {
        if (char* copy = static_cast<char*>(kMalloc(size))) {
            if (text == nullptr) {
                copy[0] = '\0';
                return copy;
            }
            return static_cast<char*>(std::memcpy(copy, text, size));
        }
        if (handler != nullptr) {
            handler();
            handler = gpfnOutOfMemoryHandler.load();
        } else {
            patience.Use();
        }
    }
}

void HHandleOutOfMemory() {
    if (const Handler handler = gpfnOutOfMemoryHandler.load()) handler();
}

void HOutOfMemoryHandler(void (*handler)()) { gpfnOutOfMemoryHandler.store(handler); }
