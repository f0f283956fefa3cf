// Makes attempts at memory fail on demand, on the thread that asks for it: those of `operator new`, which is
// replaced here, and those of any allocator that a test leads through AttemptFails. For a test of one source.
#ifndef ZANBASE_TESTS_FAILING_ALLOCATION_H
#define ZANBASE_TESTS_FAILING_ALLOCATION_H

#include <cstdlib>
#include <memory>
#include <new>

// First so many attempts succeed, then so many fail; those after them succeed.
inline thread_local int attempts_to_pass = 0, attempts_to_fail = 0;

inline bool AttemptFails() {
    if (attempts_to_pass > 0) {
        --attempts_to_pass;
        return false;
    }
    if (attempts_to_fail == 0) return false;
    --attempts_to_fail;
    return true;
}

inline void* BlockOrThrow(std::size_t size) {
    void* const block = AttemptFails() ? nullptr : std::malloc(size + 1);
    return block != nullptr ? block : throw std::bad_alloc();
}

void* operator new(std::size_t size) { return BlockOrThrow(size); }
void operator delete(void* block) noexcept { std::free(block); }
void operator delete(void* block, std::size_t) noexcept { std::free(block); }

// The pointer to the whole block is just below the aligned part.
void* operator new(std::size_t size, std::align_val_t alignment) {
    void* const whole = BlockOrThrow(size + 2 * static_cast<std::size_t>(alignment));
    void* part = static_cast<void**>(whole) + 1;
    std::size_t space = size + static_cast<std::size_t>(alignment);
    std::align(static_cast<std::size_t>(alignment), size, part, space);
    static_cast<void**>(part)[-1] = whole;
    return part;
}
void operator delete(void* part, std::align_val_t) noexcept { std::free(static_cast<void**>(part)[-1]); }
void operator delete(void* part, std::size_t, std::align_val_t) noexcept {
    std::free(static_cast<void**>(part)[-1]);
}

// Runs `body` with its first attempt failing, then with the second, and so on until all succeed; `check`
// after each failure. Returns the number of failures.
template <class Body, class Check>
int FailAtEachNew(Body body, Check check) {
    for (int failures = 0;; ++failures) {
        attempts_to_pass = failures;
        attempts_to_fail = 1;
        try {
            body();
            attempts_to_pass = attempts_to_fail = 0;
            return failures;
        } catch (const std::bad_alloc&) {
            check();
        }
    }
}

#endif
