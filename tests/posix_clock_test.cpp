// What the POSIX back end promises of ticks, and of a pause that signals interrupt.
#include <gtest/gtest.h>
#include <sys/time.h>

#include <chrono>
#include <csignal>

#include "platform/clock.h"

TEST(PosixClock, TicksInMilliseconds) {
    const auto milliseconds = [] {
        const auto now = std::chrono::steady_clock::now().time_since_epoch();
        return static_cast<unsigned int>(now / std::chrono::milliseconds(1));
    };
    const unsigned int before = milliseconds();
    const unsigned int ticks = ReadTicks();
    EXPECT_LE(ticks - before, milliseconds() - before);
}

TEST(PosixClock, GoesOnPausingAfterASignal) {
    static volatile std::sig_atomic_t signals = 0;
    std::signal(SIGALRM, [](int) { signals = 1; });
    const itimerval after_2_ms = {{0, 0}, {0, 2000}};
    setitimer(ITIMER_REAL, &after_2_ms, nullptr);
    const unsigned int start = ReadTicks();
    PauseFor(40);
    EXPECT_GE(ReadTicks() - start, 40U);
    EXPECT_EQ(signals, 1);
}
