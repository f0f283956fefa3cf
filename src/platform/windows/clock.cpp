// Clocks of the system. Those of the C runtime count by the system time, which can be set, and _ftime64 also looks up
// the time zone, which makes it many times as slow under Wine.
#include "platform/clock.h"

#include "platform/windows/deadline.h"

WallClock ReadWallClock() noexcept {
    constexpr unsigned long long kUnitsPerSecond = 10000000;  // of 100 nanoseconds
    constexpr unsigned long long kUnitsPerMillisecond = 10000;
    constexpr long long kSecondsFrom1601To1970 = 11644473600;
    FILETIME now;
    GetSystemTimePreciseAsFileTime(&now);
    const unsigned long long units =
        (static_cast<unsigned long long>(now.dwHighDateTime) << 32U) + now.dwLowDateTime;
    return {static_cast<long long>(units / kUnitsPerSecond) - kSecondsFrom1601To1970,
            static_cast<unsigned short>(units % kUnitsPerSecond / kUnitsPerMillisecond)};
}

unsigned int ReadTicks() noexcept {
    const long long counter = Counter();
    const long long per_second = CounterPerSecond();
    // In two parts, since the product of the whole would overflow.
    return static_cast<unsigned int>(counter / per_second * 1000 + counter % per_second * 1000 / per_second);
}

void SleepFor(unsigned int ms) noexcept {
    const Deadline deadline(ms);
    Sleep(ms);
    while (const DWORD left = deadline.MillisecondsLeft()) Sleep(left);
}
