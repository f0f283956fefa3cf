// The wall clock in three units, each from one reading, and the stopwatch.
#include "zanbase/clock.h"

#include "platform/clock.h"
#include "timing/time_text.h"

// Seconds and milliseconds are added up in doubles in just this way, so that readings are the same to the
// last bit wherever they are made.
double GetMicroSeconds() {
    const WallClock now = ReadWallClock();
    return now.milliseconds * 1000.0 + static_cast<double>(now.seconds) * 1000000.0;
}

double GetMilliSeconds() {
    const WallClock now = ReadWallClock();
    return static_cast<double>(now.seconds) * 1000.0 + now.milliseconds;
}

double GetTimeInSeconds() {
    const WallClock now = ReadWallClock();
    return now.milliseconds / 1000.0 + static_cast<double>(now.seconds);
}

HTimer::HTimer() : mdStartTime(::GetTimeInSeconds()) {}

HTimer::HTimer(const HTimer&) : HTimer() {}

HTimer::~HTimer() = default;

HTimer& HTimer::operator=(const HTimer&) { return *this; }

void HTimer::Reset() { mdStartTime = ::GetTimeInSeconds(); }

double HTimer::GetTimeInSeconds() const { return ::GetTimeInSeconds() - mdStartTime; }

double HTimer::GetTimeInMinutes() const { return GetTimeInSeconds() / 60.0; }

double HTimer::GetTimeInHours() const { return GetTimeInSeconds() / 60.0 / 60.0; }

std::string HTimer::GetTimeAsString() const { return TimeText(GetTimeInSeconds()); }
