// The generator's sequences, its seeds and what the draws have to do with each other.
#include "zanbase/random.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <random>

#include "zanbase/clock.h"

const int unseeded[] = {IMPRandInt(), IMPRandInt(), IMPRandInt()};  // before any test seeds

TEST(IMPRandInt, FollowsThePublishedGenerator) {
    EXPECT_EQ(unseeded[0], 2147466840);
    EXPECT_EQ(unseeded[2], 524833574);
    IMPInitRandom(1);
    std::minstd_rand0 published(16807);  // the seed is not a draw, nor is the first step
    for (int step = 2; step < 10000; ++step) ASSERT_EQ(IMPRandInt(), static_cast<int>(published()));
    EXPECT_EQ(IMPRandInt(), 1043618065);
}

TEST(IMPInitRandom, TakesAnySeedAndTheClockForZero) {
    for (const auto& [seed, first] : {std::pair(-1, 1865008398), {INT_MIN, 1865008398}, {INT_MAX, INT_MAX}}) {
        EXPECT_EQ(IMPInitRandom(seed), seed);
        EXPECT_EQ(IMPRandInt(), first);
    }
    EXPECT_EQ(IMPRandom(), 1.0);  // the last seed's state steps to itself
    double before = 0;
    int seed = 0;
    do {
        before = GetMicroSeconds();
        seed = IMPInitRandom(0);
    } while (GetMicroSeconds() != before);
    EXPECT_EQ(seed, static_cast<int>(std::fmod(before, 2147483648.0)));
}

TEST(IMPRandNorm, AddsTwelveUniformDraws) {
    IMPInitRandom(42);
    double sum = -6.0;
    for (int draw = 0; draw < 12; ++draw) sum += IMPRandom();
    const int next = IMPRandInt();
    IMPInitRandom(42);
    EXPECT_EQ(IMPRandNorm(-2.0), sum * -2.0);
    EXPECT_EQ(IMPRandInt(), next);
}
