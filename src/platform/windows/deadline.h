// A point of time on the performance counter. The waits of this system may end at a timer interrupt before their limit.
#ifndef ZANBASE_PLATFORM_WINDOWS_DEADLINE_H
#define ZANBASE_PLATFORM_WINDOWS_DEADLINE_H

#include "platform/windows/system.h"

inline long long Counter() noexcept {
    LARGE_INTEGER counter;
    QueryPerformanceCounter(&counter);  // can't fail
    return counter.QuadPart;
}

inline long long CounterPerSecond() noexcept {
    LARGE_INTEGER frequency;
    QueryPerformanceFrequency(&frequency);
    return frequency.QuadPart;
}

class Deadline {
public:
    explicit Deadline(unsigned int ms) noexcept
        : mnEnd(Counter() + ms / 1000 * CounterPerSecond() + ms % 1000 * CounterPerSecond() / 1000) {}

    // Rounded up, so that it is 0 only if the point has passed.
    DWORD MillisecondsLeft() const noexcept {
        const long long left = mnEnd - Counter();
        return left <= 0 ? 0
                         : static_cast<DWORD>((left / CounterPerSecond()) * 1000 + 1 +
                                              left % CounterPerSecond() * 1000 / CounterPerSecond());
    }

private:
    long long mnEnd;
};

#endif
