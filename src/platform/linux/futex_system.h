// What the algorithms of lock, condition and semaphore need of the system, as one type. They are templates
// over it, so that tests/models can run the shipped code under every order of its steps.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H

#include <sys/single_threaded.h>

#include "platform/linux/futex.h"

struct FutexSystem {
    using Word = FutexWord;
    using Owner = std::atomic<unsigned long long>;
    using Deadline = const timespec*;  // null: none
    using PendingWakeup = ::PendingWakeup;
    using PendingSignal = ::PendingSignal;
    static constexpr int kEverySleeper = ::kEverySleeper;

    // True if the process has one thread, as far as the C library knows.
    static bool IsAlone() noexcept { return __libc_single_threaded != 0; }

    static bool SleepWhile(Word& word, unsigned int expected, Deadline deadline) noexcept {
        return ::SleepWhile(word, expected, deadline);
    }
    static int WakeSleepers(Word& word, int most) noexcept { return ::WakeSleepers(word, most); }
};

#endif
