// Clocks of the C runtime.
#include "platform/clock.h"

#include <ctime>

#include <sys/timeb.h>

#include "platform/windows/system.h"

static_assert(CLOCKS_PER_SEC == 1000);

WallClock ReadWallClock() noexcept {
    struct __timeb64 now;
    _ftime64(&now);
    return {now.time, now.millitm};
}

// The time since the start of the process, not the processor time that this function counts on other systems.
unsigned int ReadTicks() noexcept { return static_cast<unsigned int>(std::clock()); }

void SleepFor(unsigned int ms) noexcept { Sleep(ms); }
