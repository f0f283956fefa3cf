// What the algorithms of lock, condition and semaphore need of the system, as one type. They are templates
// over it, so that tests/models can run the shipped code under every order of its steps.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H

#include <sys/single_threaded.h>

#include "platform/linux/futex.h"

struct FutexSystem {
    using Word = FutexWord;
    using DoubleWord = std::atomic<unsigned long long>;
    using Deadline = const timespec*;  // null: none
    using ForwardWakeupIfKilled = ::ForwardWakeupIfKilled;
    using ForwardSignalIfKilled = ::ForwardSignalIfKilled;
    static constexpr int kEverySleeper = ::kEverySleeper;

    // For the kernel, which takes 32 bits: what it compares, and the address that a sleeper is known by.
    static Word& LowerHalf(DoubleWord& word) noexcept {
        constexpr int kHalf = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__ ? 0 : 1;
        return reinterpret_cast<Word*>(&word)[kHalf];
    }

    // True if the process has one thread, as far as the C library knows.
    static bool IsAlone() noexcept { return __libc_single_threaded != 0; }

    static bool SleepWhile(Word& word, unsigned int expected, Deadline deadline) noexcept {
        return ::SleepWhile(word, expected, deadline);
    }
    static int WakeSleepers(Word& word, int most) noexcept { return ::WakeSleepers(word, most); }
};

#endif
