// Turns of the ring, where each kind of text stands in its slot, and takes from several threads at once.
#include "text/name_ring.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "zanbase/name_ring.h"
#include "zanbase/string_makers.h"

namespace {

constexpr int kSlots = 256;

char* SlotStart(int slot) { return goNameRing.maSlots[slot]; }

// First in the file, and under ctest in a process of its own: nobody has taken a slot yet.
TEST(NameRing, StartsAtSlotZeroAndWraps) {
    EXPECT_EQ(goNameRing.mnLastSlot, -1);
    const char* const ring = SlotStart(0);
    EXPECT_TRUE(std::all_of(ring, ring + sizeof goNameRing.maSlots, [](char c) { return c == '\0'; }));
    EXPECT_EQ(sizeof goNameRing.maSlots, 1048576u);
    for (int take = 0; take < 2 * kSlots + 3; ++take) {
        EXPECT_EQ(MkName("%d", take), SlotStart(take % kSlots));
        EXPECT_EQ(goNameRing.mnLastSlot, take % kSlots);
    }
}

TEST(NameRing, KeepsATextForTheNext255Takes) {
    const char* const name = MkName("kept");
    for (int take = 0; take < kSlots - 1; ++take) MkName(take);
    EXPECT_STREQ(name, "kept");
    MkName("%s", "lost");
    EXPECT_STREQ(name, "lost");
}

char* ByArgumentList(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);
char* ByArgumentList(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    char* const name = MkNameV(format, arguments);
    va_end(arguments);
    return name;
}

TEST(NameRing, GivesEveryOperationOneSlot) {
    MkName(0);
    const int before = goNameRing.mnLastSlot;
    const std::vector<const char*> names = {MkName(short{1}),
                                            MkName(static_cast<unsigned short>(1)),
                                            MkName(1),
                                            MkName(1u),
                                            MkName(1l),
                                            MkName(1ul),
                                            MkName(1ll),
                                            MkName(1ull),
                                            MkName(1.0, 3),
                                            MkName("1"),
                                            MkNameC("%d", 1),
                                            ByArgumentList("%s", "1"),
                                            MkTokenName("1", nullptr)};
    EXPECT_EQ((goNameRing.mnLastSlot - before + kSlots) % kSlots, static_cast<int>(names.size()));
    for (const char* name : names) EXPECT_STREQ(name, "1");
    EXPECT_EQ(std::set<const char*>(names.begin(), names.end()).size(), names.size());
    const int after = goNameRing.mnLastSlot;
    EXPECT_EQ(MkString(1) + MkString(1.0, 0) + MkString("%d", 1) + MkTokenString("1", nullptr), "1111");
    EXPECT_EQ(goNameRing.mnLastSlot, after);
}

// Ends at the last byte of the slot, with the text that the string makers give.
template <class Integer>
void ExpectAtTheEndOfTheSlot() {
    using Limits = std::numeric_limits<Integer>;
    for (const Integer value : {Integer{0}, Integer{7}, Limits::max(), Limits::min()}) {
        const char* const name = MkName(value);
        EXPECT_EQ(name, MkString(value));
        EXPECT_EQ(name + MkString(value).size(), SlotStart(goNameRing.mnLastSlot) + 4095);
    }
}

TEST(MkName, PutsAnIntegerAtTheEndOfItsSlot) {
    ExpectAtTheEndOfTheSlot<short>();
    ExpectAtTheEndOfTheSlot<unsigned short>();
    ExpectAtTheEndOfTheSlot<int>();
    ExpectAtTheEndOfTheSlot<unsigned int>();
    ExpectAtTheEndOfTheSlot<long>();
    ExpectAtTheEndOfTheSlot<unsigned long>();
    ExpectAtTheEndOfTheSlot<long long>();
    ExpectAtTheEndOfTheSlot<unsigned long long>();
}

// Where a slot has room for more than the string makers take.
TEST(MkName, WritesLongFixedPointWhole) {
    EXPECT_STREQ(MkName(1e70, 2), "10000000000000000725314363815292351261583744096465219555182101554790400");
    EXPECT_STREQ(MkName(1e-70, -1), ("0." + std::string(69, '0') + "1").c_str());
    EXPECT_EQ(std::string(MkName(-std::numeric_limits<double>::max(), 9)).size(), 310u);
    // 1074 places behind the point, however many more are asked for; the last one is a 5.
    const std::string least = MkName(std::numeric_limits<double>::denorm_min(), 5000);
    EXPECT_EQ(least.size(), 1076u);
    EXPECT_EQ(least.back(), '5');
    const char* const name = MkName(0.25, 9);
    EXPECT_EQ(name, SlotStart(goNameRing.mnLastSlot));
}

TEST(MkName, CutsAFormatAtTheEndOfTheSlot) {
    for (const int length : {4095, 4096, 5000}) {
        const std::string whole = std::string(static_cast<std::size_t>(length) - 3, ' ') + "end";
        for (const char* name : {MkName("%*s", length, "end"), MkNameC("%*s", length, "end"),
                                 ByArgumentList("%*s", length, "end")}) {
            EXPECT_EQ(name, whole.substr(0, 4095));
        }
    }
    EXPECT_STREQ(MkName("%s", ""), "");
}

TEST(MkTokenName, WritesFromTheStartOfTheSlot) {
    for (const char* first : {static_cast<const char*>(nullptr), "", "a"}) {
        const char* const name = MkTokenName(first, "b", nullptr);
        EXPECT_EQ(name, SlotStart(goNameRing.mnLastSlot));
        EXPECT_EQ(name, MkTokenString(first, "b", nullptr));
    }
    const std::string full(4095, 'x');
    EXPECT_EQ(MkTokenName(full.c_str(), "lost", nullptr), full);
    EXPECT_EQ(MkTokenName((full + "y").c_str(), nullptr), full);
}

// All threads together take each slot once a round, so no result of a round may touch another.
TEST(NameRing, GivesThreadsDistinctSlots) {
    constexpr int kThreads = 4;
    constexpr int kTakes = kSlots / kThreads;
    for (int round = 0; round < 50; ++round) {
        std::vector<const char*> names(kSlots);
        std::vector<std::thread> threads;
        for (int thread = 0; thread < kThreads; ++thread) {
            threads.emplace_back([&names, thread] {
                for (int name = thread * kTakes; name < (thread + 1) * kTakes; ++name) {
                    names[static_cast<std::size_t>(name)] = name % 2 == 0 ? MkName(name) : MkName("%d", name);
                }
            });
        }
        for (std::thread& thread : threads) thread.join();
        for (int name = 0; name < kSlots; ++name) {
            ASSERT_EQ(names[static_cast<std::size_t>(name)], std::to_string(name)) << round;
        }
    }
}

}  // namespace
