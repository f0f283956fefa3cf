// Turns the seconds of the public interface into the platform's milliseconds, in one place for all waits.
#ifndef ZANBASE_LOCKS_MILLISECONDS_H
#define ZANBASE_LOCKS_MILLISECONDS_H

#include "platform/wait_limit.h"

// Whole milliseconds, cut and not rounded: 1.9999 gives 1999 and 0.0009 gives 0. What the platform's count
// can't hold is settled before the conversion, which would be undefined for it: negative times and what is
// no number give 0, a test without a wait; from 4294967.295 on a limit never runs out.
inline unsigned int MillisecondsIn(double seconds) noexcept {
    const double milliseconds = seconds * 1000.0;
    if (!(milliseconds >= 1.0)) return 0;
    if (milliseconds >= static_cast<double>(kForever)) return kForever;
    return static_cast<unsigned int>(milliseconds);
}

#endif
