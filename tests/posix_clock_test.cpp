// What the POSIX back end promises of pauses when signals come in.
#include <gtest/gtest.h>

#include <csignal>

#include <sys/time.h>

#include "platform/clock.h"

namespace {

volatile std::sig_atomic_t signals = 0;

void CountSignal(int) { signals = signals + 1; }

TEST(PosixClock, GoesOnPausingAfterASignal) {
    std::signal(SIGALRM, CountSignal);
    const itimerval every_2_ms = {{0, 2000}, {0, 2000}};
    const itimerval never = {};
    setitimer(ITIMER_REAL, &every_2_ms, nullptr);
    const unsigned int start = ReadTicks();
    PauseFor(40);
    const unsigned int passed = ReadTicks() - start;
    setitimer(ITIMER_REAL, &never, nullptr);
    EXPECT_GE(signals, 1);
    EXPECT_GE(passed, 40U);
}

}  // namespace
