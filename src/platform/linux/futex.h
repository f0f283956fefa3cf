// The one place that blocks: waits on a 32-bit word, with one rule for deadlines and for threads that are
// ended while they wait. Lock, condition and semaphore of this back end stand on it.
//
// A wake-up goes to one sleeping thread. If that thread is ended before it acts on it, or the thread that is
// about to wake it is ended first, nobody would get it. So a thread notes the word that it sleeps on or wakes
// others on in `toPendingWakeups`, and the code that ends a thread calls ForwardPendingWakeups() on it as its last act. A
// wake-up too many is harmless: everybody who sleeps on a word looks at it again.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_H

#include <atomic>
#include <ctime>

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/linux/build.h"

using FutexWord = std::atomic<unsigned int>;
static_assert(sizeof(FutexWord) == 4 && FutexWord::is_always_lock_free, "the kernel reads 32 bits");

constexpr int kEverySleeper = 0x7fffffff;

// Wakes up to `most` threads that sleep on `word` and tells how many there were. Touches only the address, so
// the word may be gone already.
inline int WakeSleepers(FutexWord& word, int most) noexcept {
    return static_cast<int>(syscall(SYS_futex, &word, FUTEX_WAKE_PRIVATE, most, nullptr, nullptr, 0));
}

// Sleeps as long as `word` is `expected`, until a wake-up or the absolute monotonic `deadline` (null: none).
// False if the deadline has passed. True says only that it is time to look at the word again.
bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept;

// Now plus `ms` milliseconds on the monotonic clock.
timespec DeadlineIn(unsigned int ms) noexcept;

// What a thread owes to others. A thread that was woken on a condition owes that until it has its lock back,
// so it can have both kinds of debt at once, but never two of a kind.
struct PendingWakeups {
    FutexWord* mpoWord;       // a lock's or a semaphore's; null: none
    FutexWord* mpoCondition;  // null: none
    unsigned int mnSeen;      // the condition's word as it was when this thread began to wait
};
extern ZANBASE_FAST_THREAD_LOCAL PendingWakeups toPendingWakeups;

// Called on a thread that is being ended: another sleeper gets the wake-up that this thread may have
// swallowed, or all get the one that it was about to send. A condition that nobody has signalled since owes
// nothing.
void ForwardPendingWakeups() noexcept;

// Notes a debt on a lock or semaphore for a scope.
class PendingWakeup {
public:
    explicit PendingWakeup(FutexWord& word) noexcept {
        toPendingWakeups.mpoWord = &word;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    ~PendingWakeup() {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoWord = nullptr;
    }
    PendingWakeup(const PendingWakeup&) = delete;
    PendingWakeup& operator=(const PendingWakeup&) = delete;
};

// The same for a condition, whose word was `seen` at the start of the wait.
class PendingSignal {
public:
    PendingSignal(FutexWord& word, unsigned int seen) noexcept {
        toPendingWakeups.mnSeen = seen;
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoCondition = &word;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    ~PendingSignal() {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoCondition = nullptr;
    }
    PendingSignal(const PendingSignal&) = delete;
    PendingSignal& operator=(const PendingSignal&) = delete;
};

#endif
