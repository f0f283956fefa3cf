// The wait for a lock that is held.
#include "spin_lock.h"

#include <algorithm>
#include <ctime>

namespace recorder {

// The sections are short, but their thread may be off the processor: after some rounds a waiter sleeps, which
// also lets a holder of lower priority run.
void SpinLock::AcquireSlowly() {
    constexpr int kRounds = 200;
    constexpr long kLongestPause = 1000000;  // nanoseconds
    timespec pause{0, 1000};
    for (int round = 0;
         mbHeld.load(std::memory_order_relaxed) || mbHeld.exchange(true, std::memory_order_acquire);) {
        if (++round < kRounds) {
#if defined(__x86_64__)
            __builtin_ia32_pause();
#endif
            continue;
        }
        nanosleep(&pause, nullptr);
        pause.tv_nsec = std::min(pause.tv_nsec * 2, kLongestPause);
    }
}

}  // namespace recorder
