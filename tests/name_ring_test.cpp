// Turns of the ring, where a text stands in its slot, and takes from several threads at once.
#include "text/name_ring.h"

#include <array>
#include <climits>
#include <thread>
#include <vector>

#include "support/text_pairs.h"
#include "zanbase/name_ring.h"
#include "zanbase/string_makers.h"

namespace {

// First in the file, and under ctest in a process of its own: nobody has taken a slot yet.
TEST(NameRing, StartsZeroedAtSlotZeroAndWraps) {
    EXPECT_EQ(goNameRing.mnLastSlot, -1);
    for (const auto& slot : goNameRing.maSlots) EXPECT_EQ(std::string(slot, 4096), std::string(4096, '\0'));
    for (int take = 0; take <= 512; ++take) EXPECT_EQ(MkName("kept"), goNameRing.maSlots[take % 256]);
    for (int take = 1; take < 256; ++take) MkName(take);
    EXPECT_EQ(MkString(1) + MkString(1.0, 3) + MkString("%d", 1) + MkTokenString("1", nullptr), "1111");
    EXPECT_STREQ(goNameRing.maSlots[0], "kept");
    EXPECT_STREQ(MkName("lost"), goNameRing.maSlots[0]);
}

TEST(NameRing, GivesEachNameASlotAndTheWholeOfIt) {
    const auto place = [](const char* name) { return name - goNameRing.maSlots[goNameRing.mnLastSlot]; };
    EXPECT_EQ(place(MkName(0)), 4094);
    EXPECT_EQ(place(MkName(LLONG_MIN)), 4075);
    EXPECT_EQ(place(MkName(1.5, 1)), 0);
    EXPECT_EQ(place(MkTokenName("a", nullptr)), 0);
    const std::string full(4095, 'x');
    const std::string more = full + "y";
    ExpectPairs(MkName(short{SHRT_MIN}), "-32768", MkName(static_cast<unsigned short>(USHRT_MAX)), "65535",
                MkName(INT_MIN), "-2147483648", MkName(UINT_MAX), "4294967295", MkName(LONG_MIN),
                std::to_string(LONG_MIN), MkName(ULONG_MAX), std::to_string(ULONG_MAX), MkName(ULLONG_MAX),
                "18446744073709551615", MkName("%s", full.c_str()), full, MkName("%s", more.c_str()), full,
                MkName(5e-324, INT_MAX), MkString("%.1074f", 5e-324), MkNameC("%s", more.c_str()), full,
                MkTokenName(more.c_str(), nullptr), full, MkName(1e70, 2),
                "10000000000000000725314363815292351261583744096465219555182101554790400");
}

// All threads together take each slot once a round, so no text of a round may touch another.
TEST(NameRing, GivesThreadsDistinctSlots) {
    std::array<const char*, 256> names{};
    const auto take = [&names](unsigned int first) {
        for (unsigned int name = first; name < 256; name += 4) names[name] = MkName("%u", name);
    };
    for (int round = 0; round < 50; ++round) {
        std::vector<std::thread> threads;
        for (unsigned int first = 0; first < 4; ++first) threads.emplace_back(take, first);
        for (std::thread& thread : threads) thread.join();
        for (unsigned int name = 0; name < 256; ++name) ASSERT_EQ(names[name], std::to_string(name));
    }
}

}  // namespace
