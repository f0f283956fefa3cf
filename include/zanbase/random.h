/// @file
/// One repeatable random number generator for the process.
#ifndef ZANBASE_RANDOM_H
#define ZANBASE_RANDOM_H

#include "zanbase/export.h"

// The generator multiplies by 16807 modulo 2^31 - 1. Source: S. K. Park and K. W. Miller, "Random number
// generators: good ones are hard to find", Communications of the ACM 31(10), 1988, pages 1192 to 1201; the
// step within 32 bits is due to L. Schrage, "A more portable Fortran random number generator", ACM
// Transactions on Mathematical Software 5(2), 1979, pages 132 to 138.
//
// All draws step one sequence, which a seed fixes; a program that never seeds gets the same one every time:
// 2147466840, 1865008398, 524833574, … There is no lock: one thread at a time may draw or seed, and threads
// that share the generator hold a lock of their own around each call. Not for secrets, nor where more than
// 2^31 draws, several streams or good low bits are needed; `<random>` has generators for that.

/// Begins the sequence of `seed` and returns it: whoever keeps it can have the same run again. The state
/// becomes one step from the seed, so the first draw is two steps from it.
///
/// 0 takes a seed from the wall clock: its microseconds modulo 2^31. No seed is refused, but 2147483647,
/// -2147483647 and a clock's seed of 0 lead into a state that steps to itself: `IMPRandInt` then gives
/// 2147483647 and `IMPRandom` 1.0 until the next seeding.
ZANBASE_API int IMPInitRandom(int seed);

/// The next number of the sequence, in 1 to 2147483646.
ZANBASE_API int IMPRandInt();

/// A uniform number above 0 and below 1: the next number of the sequence over 2147483647.
ZANBASE_API double IMPRandom();

/// An approximately normal number of mean 0 and standard deviation `sigma`: the sum of twelve uniform numbers
/// less 6, times `sigma`. It is never further from 0 than 6 times `sigma`, and it always takes twelve steps.
ZANBASE_API double IMPRandNorm(double sigma);

#endif
