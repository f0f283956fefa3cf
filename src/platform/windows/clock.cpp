// Clocks of the system and of the C runtime.
#include "platform/clock.h"

#include <ctime>

#include "platform/windows/system.h"

static_assert(CLOCKS_PER_SEC == 1000);

// Not _ftime64, which has the same two numbers: it also looks up the time zone, at many times the cost under Wine.
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

// The time since the start of the process, not the processor time that this function counts on other systems.
unsigned int ReadTicks() noexcept { return static_cast<unsigned int>(std::clock()); }

void SleepFor(unsigned int ms) noexcept { Sleep(ms); }
