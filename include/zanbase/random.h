/// @file
/// One repeatable random number generator for the process.
///
/// All draws advance one sequence, which a seed determines. A program that never seeds gets the same sequence
/// in every run: 2147466840, 1865008398, 524833574, …
///
///     IMPInitRandom(42);
///     double noise = IMPRandNorm(0.5);
///
/// The generator multiplies by 16807 modulo 2^31 - 1. Source: S. K. Park and K. W. Miller, "Random number
/// generators: good ones are hard to find", Communications of the ACM 31(10), 1988, pages 1192 to 1201. The
/// step within 32 bits is due to L. Schrage, "A more portable Fortran random number generator", ACM
/// Transactions on Mathematical Software 5(2), 1979, pages 132 to 138.
///
/// Thread-safety: none. Every function reads and writes the one state without a lock. Threads that share the
/// generator hold a lock of their own around each call.
///
/// Not for secrets. Not where a program needs more than 2^31 draws, several streams or good low bits:
/// `<random>` has generators for that.
#ifndef ZANBASE_RANDOM_H
#define ZANBASE_RANDOM_H

#include "zanbase/export.h"

/// @addtogroup environment
/// @{

/// Starts the sequence of `seed` and returns the seed. Store the result to repeat a run. The state becomes
/// one step from the seed, so the first draw is two steps from it.
///
/// A `seed` of 0 takes the seed from the wall clock: its microseconds modulo 2^31. Every seed is accepted.
/// The seeds 2147483647 and -2147483647, and a clock seed of 0, lead to a state that never changes:
/// `IMPRandInt` then returns 2147483647 and `IMPRandom` 1.0 until the next seeding. Not thread-safe.
ZANBASE_API int IMPInitRandom(int seed);

/// Returns the next number of the sequence, from 1 to 2147483646. Not thread-safe.
ZANBASE_API int IMPRandInt();

/// Returns a uniform number above 0 and below 1: the next number of the sequence divided by 2147483647. Not
/// thread-safe.
ZANBASE_API double IMPRandom();

/// Returns an approximately normal number with mean 0 and standard deviation `sigma`: the sum of twelve
/// uniform numbers minus 6, times `sigma`. Its magnitude is at most 6 times that of `sigma`. Takes exactly
/// twelve steps of the sequence. Not thread-safe.
ZANBASE_API double IMPRandNorm(double sigma);

/// @}

#endif
