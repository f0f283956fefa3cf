// What the algorithms of lock, condition and semaphore need of the system, as one type. They are templates
// over it, so that a test can run the very same code under every order of steps.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_SYSTEM_H

#include <sys/single_threaded.h>

#include "platform/linux/futex.h"
#include "platform/linux/restartable.h"

struct FutexSystem {
    using Word = FutexWord;
    using Owner = std::atomic<unsigned long long>;
    using Deadline = const timespec*;  // null: none
    using PendingWakeup = ::PendingWakeup;
    using PendingSignal = ::PendingSignal;
    static constexpr int kEverySleeper = ::kEverySleeper;

    // Whether the process has never had a second thread, or the system knows that it has none now.
    static bool IsAlone() noexcept { return __libc_single_threaded != 0; }
    static void StoreAlone(Word& word, unsigned int value) noexcept {
        word.store(value, std::memory_order_relaxed);
    }

    static bool SleepWhile(Word& word, unsigned int expected, Deadline deadline) noexcept {
        return ::SleepWhile(word, expected, deadline);
    }
    static int WakeSleepers(Word& word, int most) noexcept { return ::WakeSleepers(word, most); }
    static bool StoreIfStill(Word& word, unsigned int expected, unsigned int desired) noexcept {
        return ::StoreIfStill(word, expected, desired);
    }
    static bool BreakStores() noexcept { return ::BreakStores(); }
    static void SleepShortly(Word& word, unsigned int expected) noexcept {
        const timespec soon = DeadlineIn(1);
        ::SleepWhile(word, expected, &soon);
    }

    // Makes `attempt` a few times with growing pauses; true as soon as it succeeds. Lasts about as long as
    // going to sleep and being woken would, so a wait costs at most twice of what the better way had cost.
    template <class Attempt>
    static bool Spin(Attempt attempt) noexcept {
        for (int pauses = 1; pauses <= kLongestSpin; pauses *= 2) {
            for (int pause = 0; pause < pauses; ++pause) Relax();
            if (attempt()) return true;
        }
        return false;
    }

private:
    static constexpr int kLongestSpin = 32;

    static void Relax() noexcept {
#if defined(__x86_64__) || defined(__i386__)
        __builtin_ia32_pause();
#elif defined(__aarch64__)
        asm volatile("isb");
#endif
    }
};

#endif
