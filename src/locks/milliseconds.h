// Converts the seconds of the public interface into the platform's milliseconds, in one place for all waits.
#ifndef ZANBASE_LOCKS_MILLISECONDS_H
#define ZANBASE_LOCKS_MILLISECONDS_H

#include "platform/wait_limit.h"

// Whole milliseconds, cut and not rounded: 1.9999 gives 1999 and 0.0009 gives 0. Values whose conversion
// would be undefined are handled first: negative times and NaN give 0, a test without a wait; 4294967.295 and
// more give kForever.
inline unsigned int MillisecondsIn(double seconds) noexcept {
    const double milliseconds = seconds * 1000.0;
    if (!(milliseconds >= 1.0)) return 0;
    if (milliseconds >= static_cast<double>(kForever)) return kForever;
    return static_cast<unsigned int>(milliseconds);
}

#endif
