// Makes `operator new` fail on demand, in a test of one source that is linked so that its calls lead here.
#ifndef ZANBASE_TESTS_FAILING_NEW_H
#define ZANBASE_TESTS_FAILING_NEW_H

#include <new>

inline thread_local int news_left = -1;  // calls on this thread until one fails; negative: none does

inline void CountNew() {
    if (news_left >= 0 && --news_left < 0) throw std::bad_alloc();
}

extern "C" {
void* __real__Znwm(std::size_t size);
void* __real__ZnwmSt11align_val_t(std::size_t size, std::align_val_t alignment);
void* __wrap__Znwm(std::size_t size) { return CountNew(), __real__Znwm(size); }
void* __wrap__ZnwmSt11align_val_t(std::size_t size, std::align_val_t alignment) {
    return CountNew(), __real__ZnwmSt11align_val_t(size, alignment);
}
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
