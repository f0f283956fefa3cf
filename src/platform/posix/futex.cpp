// Sleeping on a word until a wake-up or an absolute time.
#include "platform/posix/futex.h"

ZANBASE_FAST_THREAD_LOCAL FutexWord* tnpWakeDebt = nullptr;

bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    const long result = syscall(SYS_futex, &word, FUTEX_WAIT_BITSET_PRIVATE, expected, deadline, nullptr,
                                FUTEX_BITSET_MATCH_ANY);
    return result == 0 || errno != ETIMEDOUT;
}

timespec DeadlineIn(unsigned int ms) noexcept {
    timespec deadline{};
    clock_gettime(CLOCK_MONOTONIC, &deadline);
    deadline.tv_sec += ms / 1000;
    deadline.tv_nsec += static_cast<long>(ms % 1000) * 1000000;
    if (deadline.tv_nsec >= 1000000000) {
        deadline.tv_nsec -= 1000000000;
        ++deadline.tv_sec;
    }
    return deadline;
}
