// Contract: the wall clock, a tick count and a pause.
#ifndef ZANBASE_PLATFORM_CLOCK_H
#define ZANBASE_PLATFORM_CLOCK_H

struct WallClock {
    long long seconds;            // whole seconds since 1970-01-01 00:00:00 UTC
    unsigned short milliseconds;  // 0 to 999, within that second
};

// The system's wall clock, cut to milliseconds. It moves when the system time is set.
WallClock ReadWallClock() noexcept;

// A count that goes up by 1000 a second of real time, also while the process sleeps, and never back; it wraps
// at 32 bits.
unsigned int ReadTicks() noexcept;

// Returns after `ms` milliseconds or a little later, never earlier; 0 lets another ready thread run first.
void SleepFor(unsigned int ms) noexcept;

#endif
