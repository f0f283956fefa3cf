// What the library needs of a compiler beyond the language, as g++ and clang have it. Another compiler gets its own forms
// here.
#ifndef ZANBASE_PLATFORM_COMPILER_H
#define ZANBASE_PLATFORM_COMPILER_H

// Where the current function returns to, as a `void*`.
#define ZANBASE_RETURN_ADDRESS() __builtin_return_address(0)

// A condition that is false nearly always.
#define ZANBASE_UNLIKELY(condition) __builtin_expect(condition, 0)

// A function that is not put into its callers.
#define ZANBASE_NOT_INLINE __attribute__((noinline))

// The number of the highest bit that is set. Requires: `value` is not 0.
constexpr unsigned int HighestBit(unsigned long long value) noexcept {
    return 63U - static_cast<unsigned int>(__builtin_clzll(value));
}

#endif
