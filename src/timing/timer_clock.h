// The clock of the timers.
#ifndef ZANBASE_TIMING_TIMER_CLOCK_H
#define ZANBASE_TIMING_TIMER_CLOCK_H

#include "platform/clock.h"

// The value of GetMicroSeconds as a whole number. A double would be exact until the year 2255, but a toggle
// would take a seventh longer. Differences are right modulo 2^64, also for a clock before 1970.
inline unsigned long long ReadTimerClock() {
    const WallClock now = ReadWallClock();
    return static_cast<unsigned long long>(now.seconds) * 1000000 + now.milliseconds * 1000ULL;
}

#endif
