// The text of an elapsed time, as a function of the seconds alone.
#ifndef ZANBASE_TIMING_TIME_TEXT_H
#define ZANBASE_TIMING_TIME_TEXT_H

#include <string>

// "1w02d03h04m05s" from a minute on, else seconds or milliseconds with three decimals. Every double has a
// text: negative values and NaN are in milliseconds, and what a 32-bit count of seconds can't hold is in
// seconds.
std::string TimeText(double seconds);

#endif
