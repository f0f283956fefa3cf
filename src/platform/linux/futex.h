// The one place that blocks: waits on a 32-bit word, with one rule for deadlines and for threads that are
// killed while they wait. Lock, condition and semaphore of this back end are built on it.
//
// A wake-up reaches one sleeping thread. If that thread is killed before it acts on the wake-up, or the
// waking thread is killed before it sends it, the wake-up is lost and other sleepers may sleep for ever. So a
// thread notes in toPendingWakeups the word that it sleeps on or wakes others on, and a killed thread calls
// ForwardPendingWakeups() before it exits. A superfluous wake-up is harmless: every sleeper checks the word
// again.
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

// Wakes up to `most` threads that sleep on `word`; returns how many it woke. Passes only the address to the
// kernel, so it is safe on a word that another thread has destroyed.
inline int WakeSleepers(FutexWord& word, int most) noexcept {
    return static_cast<int>(syscall(SYS_futex, &word, FUTEX_WAKE_PRIVATE, most, nullptr, nullptr, 0));
}

// Sleeps if `word` is `expected`, until a wake-up or the absolute monotonic `deadline` (null: none). False if
// the deadline has passed. True means only that the caller has to check the word again: it was different, or
// the wake-up may be spurious. Preserves errno. Orders no memory: the caller's accesses to the word do.
bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept;

// Now plus `ms` milliseconds on the monotonic clock.
timespec DeadlineIn(unsigned int ms) noexcept;

// Wake-ups to forward if this thread is killed now: on a lock or semaphore word while it sleeps on it or
// wakes others, on a condition until it has acquired the lock again. Both may be set, never two of one kind.
// Only the thread itself and its signal handlers access it, so signal fences suffice to order the accesses.
struct PendingWakeups {
    FutexWord* mpoWord;       // a lock's or a semaphore's; null: none
    FutexWord* mpoCondition;  // null: none
    unsigned int mnSeen;      // the condition's word when this thread began to wait
};
extern ZANBASE_FAST_THREAD_LOCAL PendingWakeups toPendingWakeups;

// Sends the pending wake-ups of the calling thread and clears them; for a thread that is being killed or
// abandons a lock operation. All sleepers of a lock or semaphore word are woken, since this thread may have
// been about to send a wake-up as well as received one; one sleeper of a condition, if it was signalled
// since. Async-signal-safe.
void ForwardPendingWakeups() noexcept;

// Notes a pending wake-up on a lock or semaphore word for a scope: a kill in it forwards the wake-up.
class ForwardWakeupIfKilled {
public:
    explicit ForwardWakeupIfKilled(FutexWord& word) noexcept {
        toPendingWakeups.mpoWord = &word;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    ~ForwardWakeupIfKilled() {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoWord = nullptr;
    }
    ForwardWakeupIfKilled(const ForwardWakeupIfKilled&) = delete;
    ForwardWakeupIfKilled& operator=(const ForwardWakeupIfKilled&) = delete;
};

// Notes a pending wake-up on a condition for a scope: a kill in it forwards the wake-up. The condition's word was
// `seen` at the start of the wait.
class ForwardSignalIfKilled {
public:
    ForwardSignalIfKilled(FutexWord& word, unsigned int seen) noexcept {
        toPendingWakeups.mnSeen = seen;
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoCondition = &word;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    ~ForwardSignalIfKilled() {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        toPendingWakeups.mpoCondition = nullptr;
    }
    ForwardSignalIfKilled(const ForwardSignalIfKilled&) = delete;
    ForwardSignalIfKilled& operator=(const ForwardSignalIfKilled&) = delete;
};

#endif
