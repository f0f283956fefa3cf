// The one place that blocks: waits on a 32-bit word, with one rule for deadlines and for threads that are
// ended while they wait. Lock, condition and semaphore of this back end stand on it.
//
// A wake-up is given to one sleeping thread. If that thread is ended before it acts on the wake-up, nobody
// else would ever get it. So a thread notes the word that it sleeps on, or is about to wake others on, in
// `tnpWakeDebt`, and the code that ends a thread calls PassWakeUpOn() on it as its last act. A wake-up too
// many is harmless: everybody who sleeps on a word looks at it again.
#ifndef ZANBASE_PLATFORM_POSIX_FUTEX_H
#define ZANBASE_PLATFORM_POSIX_FUTEX_H

#include <atomic>
#include <cerrno>
#include <climits>
#include <ctime>

#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

using FutexWord = std::atomic<unsigned int>;
static_assert(sizeof(FutexWord) == 4 && FutexWord::is_always_lock_free, "the kernel reads 32 bits");

#define ZANBASE_FAST_THREAD_LOCAL __thread __attribute__((tls_model("initial-exec")))

extern ZANBASE_FAST_THREAD_LOCAL FutexWord* tnpWakeDebt;

inline void WakeSleepers(FutexWord& word, int most) noexcept {
    syscall(SYS_futex, &word, FUTEX_WAKE_PRIVATE, most, nullptr, nullptr, 0);
}

// Sleeps as long as `word` is `expected`, until a wake-up or the absolute monotonic `deadline` (null: none).
// False if the deadline has passed. May return true for no reason, so callers look at the word again.
bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept;

// Now plus `ms` milliseconds on the monotonic clock.
timespec DeadlineIn(unsigned int ms) noexcept;

// Called on a thread that is being ended: another sleeper gets the wake-up that this thread may have
// swallowed.
inline void PassWakeUpOn() noexcept {
    if (tnpWakeDebt != nullptr) WakeSleepers(*tnpWakeDebt, 1);
}

// Notes a wake debt for a scope.
class WakeDebt {
public:
    explicit WakeDebt(FutexWord& word) noexcept {
        tnpWakeDebt = &word;
        std::atomic_signal_fence(std::memory_order_seq_cst);
    }
    ~WakeDebt() {
        std::atomic_signal_fence(std::memory_order_seq_cst);
        tnpWakeDebt = nullptr;
    }
    WakeDebt(const WakeDebt&) = delete;
    WakeDebt& operator=(const WakeDebt&) = delete;
};

#endif
