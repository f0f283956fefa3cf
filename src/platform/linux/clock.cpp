// Clocks of POSIX: real time for the wall clock, monotonic time for ticks and pauses.
#include "platform/clock.h"

#include <cerrno>
#include <ctime>

#include <sched.h>

#include "platform/linux/cancellation.h"
#include "platform/linux/futex.h"

namespace {

constexpr long kNanosecondsPerMillisecond = 1000000;

timespec Now(clockid_t clock) noexcept {
    timespec now{};
    clock_gettime(clock, &now);  // can't fail: both clocks always exist
    return now;
}

}  // namespace

WallClock ReadWallClock() noexcept {
    const timespec now = Now(CLOCK_REALTIME);
    return {now.tv_sec, static_cast<unsigned short>(now.tv_nsec / kNanosecondsPerMillisecond)};
}

unsigned int ReadTicks() noexcept {
    const timespec now = Now(CLOCK_MONOTONIC);
    return static_cast<unsigned int>(
        static_cast<unsigned long long>(now.tv_sec) * 1000 +
        static_cast<unsigned long long>(now.tv_nsec / kNanosecondsPerMillisecond));
}

void SleepFor(unsigned int ms) noexcept {
    if (ms == 0) {
        sched_yield();
        return;
    }
    const NoCancellation no_cancellation;
    const timespec until = DeadlineIn(ms);
    // The deadline is absolute, so after a signal only the rest is slept.
    while (clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &until, nullptr) == EINTR) {
    }
}
