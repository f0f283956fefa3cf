// Sleeping on a word until a wake-up or an absolute time.
#include "platform/linux/futex.h"

#include <cerrno>
#include <tuple>

#include "platform/linux/restartable.h"

ZANBASE_FAST_THREAD_LOCAL PendingWakeups toPendingWakeups = {nullptr, nullptr, 0};

namespace {

// 0, or why there was no wake-up.
int Wait(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    const long result = syscall(SYS_futex, &word, FUTEX_WAIT_BITSET_PRIVATE, expected, deadline, nullptr,
                                FUTEX_BITSET_MATCH_ANY);
    return result == 0 ? 0 : errno;
}

#ifdef ZANBASE_THREAD_SANITIZER
// That tool delivers no signal to a thread inside a system call it doesn't know, and threads are ended by a
// signal. So a long wait is cut up, with a call between that it knows.
int WaitInSlices(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    for (;;) {
        const timespec soon = DeadlineIn(5);
        const bool is_last = deadline != nullptr && std::tie(deadline->tv_sec, deadline->tv_nsec) <
                                                        std::tie(soon.tv_sec, soon.tv_nsec);
        const int error = Wait(word, expected, is_last ? deadline : &soon);
        if (error != ETIMEDOUT || is_last) return error;
        usleep(1);
    }
}
#else
constexpr auto WaitInSlices = Wait;
#endif

}  // namespace

bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    const int callers_errno = errno;  // nobody expects a lock to change it
    int error = EINTR;
    while (error == EINTR) error = WaitInSlices(word, expected, deadline);
    errno = callers_errno;
    return error != ETIMEDOUT;
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

void ForwardPendingWakeups() noexcept {
    const PendingWakeups debts = toPendingWakeups;
    toPendingWakeups = {};  // first: if the condition's memory is gone, the read below faults
    if (debts.mpoWord != nullptr) {
        // It may have told an owner to wake sleepers, and not yet kept that owner from overwriting it. Others
        // rely on what they read there; where it fails, they do so for a short sleep only.
        static_cast<void>(BreakStores());
        WakeSleepers(*debts.mpoWord, kEverySleeper);
    }
    if (debts.mpoCondition != nullptr && *debts.mpoCondition != debts.mnSeen)
        WakeSleepers(*debts.mpoCondition, 1);
}
