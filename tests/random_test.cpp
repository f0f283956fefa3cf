// The random sequence beside the published generator, with seeds from a clock of the test's own.
#include "zanbase/random.h"

#include <gtest/gtest.h>

#include <climits>
#include <random>

#include "platform/clock.h"

WallClock ReadWallClock() noexcept { return {1750000000, 123}; }
unsigned int ReadTicks() noexcept { return 0; }
void SleepFor(unsigned int) noexcept {}

const int unseeded = IMPRandInt();  // before any test seeds

TEST(Random, FollowsThePublishedGenerator) {
    EXPECT_EQ(unseeded, 2147466840);
    IMPInitRandom(1);
    std::minstd_rand0 published(16807);  // the state after seeding is one step from the seed
    for (int step = 2; step <= 10000; ++step) ASSERT_EQ(IMPRandInt(), static_cast<int>(published()));
}

TEST(Random, TakesAnySeedAndReplacesZeroByTheClock) {
    struct {
        int seed, used, first_draw;
    } const cases[] = {{0, 542982264, 16167894}, {INT_MIN, INT_MIN, 1865008398}, {INT_MAX, INT_MAX, INT_MAX}};
    for (const auto& c : cases) {
        EXPECT_EQ(IMPInitRandom(c.seed), c.used);
        EXPECT_EQ(IMPRandInt(), c.first_draw) << c.seed;
    }
}
