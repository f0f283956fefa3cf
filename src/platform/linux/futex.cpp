// Sleeping on a word until a wake-up or an absolute time.
#include "platform/linux/futex.h"

#include <cerrno>
#include <tuple>

ZANBASE_FAST_THREAD_LOCAL PendingWakeups toPendingWakeups = {nullptr, nullptr, 0};

namespace {

// 0, or the error number that says why there was no wake-up.
int Wait(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    const long result = syscall(SYS_futex, &word, FUTEX_WAIT_BITSET_PRIVATE, expected, deadline, nullptr,
                                FUTEX_BITSET_MATCH_ANY);
    return result == 0 ? 0 : errno;
}

// The thread sanitizer delivers no signal to a thread inside a system call that it does not intercept, and
// threads are killed by a signal. So a long wait is cut into slices, with an intercepted call between them.
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

}  // namespace

bool SleepWhile(FutexWord& word, unsigned int expected, const timespec* deadline) noexcept {
    const int callers_errno = errno;  // callers do not expect a lock to change it
    int error = EINTR;
    const auto wait = IsThreadSanitizerOn() ? WaitInSlices : Wait;
    while (error == EINTR) error = wait(word, expected, deadline);
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
    const PendingWakeups pending = toPendingWakeups;
    toPendingWakeups = {};  // first: if the condition's memory is gone, the read below faults
    if (pending.mpoWord != nullptr) WakeSleepers(*pending.mpoWord, kEverySleeper);
    if (pending.mpoCondition != nullptr && *pending.mpoCondition != pending.mnSeen)
        WakeSleepers(*pending.mpoCondition, 1);
}
