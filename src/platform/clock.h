// Contract: the wall clock, a tick count and a pause.
#ifndef ZANBASE_PLATFORM_CLOCK_H
#define ZANBASE_PLATFORM_CLOCK_H

struct WallClock {
    long long seconds;            // whole seconds since 1970-01-01 00:00:00 UTC
    unsigned short milliseconds;  // 0 to 999, within that second
};

// The system's wall clock, truncated to milliseconds. It jumps when the system time is set.
WallClock ReadWallClock() noexcept;

// A monotonic count of milliseconds, which includes the time that the process sleeps. Wraps at 32 bits.
unsigned int ReadTicks() noexcept;

// Returns after `ms` milliseconds or a little later, never earlier. 0 offers the processor to other threads
// that are ready. Not a cancellation point.
void SleepFor(unsigned int ms) noexcept;

#endif
