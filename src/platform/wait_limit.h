// The limit of a wait, as all contracts with a timeout take it: milliseconds, or kForever.
#ifndef ZANBASE_PLATFORM_WAIT_LIMIT_H
#define ZANBASE_PLATFORM_WAIT_LIMIT_H

// A wait without a timeout.
constexpr unsigned int kForever = 0xFFFFFFFF;

#endif
