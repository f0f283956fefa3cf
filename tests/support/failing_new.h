// Makes `operator new` fail on demand, in a test of one source that is linked so that its calls lead here.
#ifndef ZANBASE_TESTS_FAILING_NEW_H
#define ZANBASE_TESTS_FAILING_NEW_H

#include <new>

inline thread_local int news_left = -1;  // calls on this thread until one fails; negative: none does

inline void CountNew() {
    if (news_left >= 0 && --news_left < 0) throw std::bad_alloc();
}

// The linker's names: ZANBASE_TEST_NEW is that of `operator new` for a size alone.
void* RealNew(std::size_t size) asm("__real_" ZANBASE_TEST_NEW);
void* RealNew(std::size_t size, std::align_val_t alignment) asm("__real_" ZANBASE_TEST_NEW "St11align_val_t");
void* CountedNew(std::size_t size) asm("__wrap_" ZANBASE_TEST_NEW);
void* CountedNew(std::size_t size,
                 std::align_val_t alignment) asm("__wrap_" ZANBASE_TEST_NEW "St11align_val_t");

void* CountedNew(std::size_t size) {
    CountNew();
    return RealNew(size);
}

void* CountedNew(std::size_t size, std::align_val_t alignment) {
    CountNew();
    return RealNew(size, alignment);
}

// Runs `body` with its first call of `operator new` failing, then with the second, and so on until it comes
// through; `check` after each failure. Returns how many there were.
template <class Body, class Check>
int FailAtEachNew(Body body, Check check) {
    for (int failures = 0;; ++failures, check()) {
        try {
            news_left = failures;
            body();
            news_left = -1;
            return failures;
        } catch (const std::bad_alloc&) {  // none fails any more
        }
    }
}

#endif
