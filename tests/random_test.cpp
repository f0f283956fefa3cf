// The generator's sequences, its seeds and what the draws have to do with each other.
#include "zanbase/random.h"

#include <gtest/gtest.h>

#include <climits>
#include <random>

#include "platform/clock.h"
#include "support/run_in_child.h"

namespace {

WallClock now = {};

}  // namespace

extern "C" WallClock __wrap__Z13ReadWallClockv() { return now; }

namespace {

TEST(IMPRandInt, GivesOneSequenceWithoutASeed) {
    const ChildResult child = RunInChild([] {
        for (int draw = 0; draw < 3; ++draw) std::printf("%d ", IMPRandInt());
        return 0;
    });
    EXPECT_EQ(child.out, "2147466840 1865008398 524833574 ");
}

TEST(IMPRandInt, FollowsThePublishedGenerator) {
    EXPECT_EQ(IMPInitRandom(1), 1);
    std::minstd_rand0 published(1);
    EXPECT_EQ(published(), 16807U);  // the seed is not a draw, nor is the first step
    for (int step = 2; step < 10000; ++step) ASSERT_EQ(IMPRandInt(), static_cast<int>(published()));
    EXPECT_EQ(IMPRandInt(), 1043618065);
}

TEST(IMPInitRandom, TakesAnySeed) {
    const struct {
        int seed;
        int first;
    } rows[] = {
        {-1, 1865008398},      {1, 282475249},
        {INT_MAX, INT_MAX},    {-INT_MAX, INT_MAX},  // steps to itself
        {INT_MIN, 1865008398}, {INT_MAX - 1, 1865008398},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(IMPInitRandom(row.seed), row.seed);
        EXPECT_EQ(IMPRandInt(), row.first) << row.seed;
    }
    IMPInitRandom(INT_MAX);
    EXPECT_EQ(IMPRandom(), 1.0);
}

TEST(IMPInitRandom, TakesTheClockForZero) {
    const struct {
        WallClock clock;
        int seed;
    } rows[] = {
        {{2, 5}, 2005000}, {{2147, 484}, 352}, {{1700000000, 1}, 404636648}, {{-1, 0}, -1000000}, {{0, 0}, 0}};
    for (const auto& row : rows) {
        now = row.clock;
        EXPECT_EQ(IMPInitRandom(0), row.seed);
        const int first = IMPRandInt();
        IMPInitRandom(row.seed);
        EXPECT_EQ(IMPRandInt(), first);
    }
}

TEST(IMPRandNorm, AddsTwelveUniformDraws) {
    for (const double sigma : {2.0, 0.0, -2.0}) {
        IMPInitRandom(42);
        double sum = -6.0;
        for (int draw = 0; draw < 12; ++draw) {
            const double uniform = IMPRandom();
            EXPECT_GT(uniform, 0.0);
            EXPECT_LT(uniform, 1.0);
            sum += uniform;
        }
        const int next = IMPRandInt();
        IMPInitRandom(42);
        EXPECT_EQ(IMPRandNorm(sigma), sum * sigma);
        EXPECT_EQ(IMPRandInt(), next);
    }
}

}  // namespace
