// Sleeping on a word until a wake-up or an absolute time.
#include "platform/posix/futex.h"

#include <cerrno>

#include "platform/posix/restartable.h"

ZANBASE_FAST_THREAD_LOCAL WakeDebts toWakeDebts = {nullptr, nullptr, 0};

bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    for (;;) {
        const long result = syscall(SYS_futex, &word, FUTEX_WAIT_BITSET_PRIVATE, expected, deadline, nullptr,
                                    FUTEX_BITSET_MATCH_ANY);
        if (result == 0 || errno != EINTR) return result == 0 || errno != ETIMEDOUT;
    }
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

void PassWakeUpOn() noexcept {
    const WakeDebts debts = toWakeDebts;
    if (debts.mpoWord != nullptr) {
        // It may have told an owner to wake sleepers, and not yet kept that owner from overwriting it. Others
        // rely on what they read there.
        BreakStores();
        WakeSleepers(*debts.mpoWord, kEverySleeper);
    }
    if (debts.mpoCondition != nullptr && *debts.mpoCondition != debts.mnSeen)
        WakeSleepers(*debts.mpoCondition, 1);
}
