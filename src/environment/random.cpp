// The multiplicative generator with multiplier 16807 and modulus 2^31 - 1, in 32 bits.
#include "zanbase/random.h"

#include <cmath>

#include "zanbase/clock.h"

namespace {

constexpr int kModulus = 2147483647;
constexpr unsigned int kMultiplier = 16807;
constexpr int kQuotient = 127773;  // kModulus / kMultiplier

int gnRandomState = -1;  // the last number drawn

// The products wrap in unsigned arithmetic; their difference is in the range of int for every state.
int StepFrom(int state) {
    const int quotient = state / kQuotient;
    const int next =
        static_cast<int>(kMultiplier * static_cast<unsigned int>(state) -
                         static_cast<unsigned int>(kModulus) * static_cast<unsigned int>(quotient));
    return next <= 0 ? next + kModulus : next;
}

}  // namespace

int IMPInitRandom(int seed) {
    if (seed == 0) seed = static_cast<int>(std::fmod(GetMicroSeconds(), 2147483648.0));
    gnRandomState = StepFrom(seed);
    return seed;
}

int IMPRandInt() { return gnRandomState = StepFrom(gnRandomState); }

double IMPRandom() { return IMPRandInt() / 2147483647.0; }

double IMPRandNorm(double sigma) {
    double sum = -6.0;
    for (int draw = 0; draw < 12; ++draw) sum += IMPRandom();
    return sum * sigma;
}
