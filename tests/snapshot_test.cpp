// Snapshots of the three accounts, and their arithmetic.
#include "zanbase/snapshot.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory_resource>

#include "zanbase/global_timer.h"
#include "zanbase/memory.h"
#include "zanbase/string_makers.h"

namespace {

using testing::ElementsAre;
using testing::UnorderedElementsAre;

char blocks[8];
constexpr char kFile[] = "a.cpp";
const std::string file_again = kFile;  // the same text at another address

std::vector<std::string> Texts(const HMemorySnapshot& memory) {
    std::vector<std::string> texts;
    for (const auto& row : memory.maRows) {
        texts.push_back(MkString("%s:%d live %lld/%lld alloc %lld/%lld free %lld/%lld", row.moFile.c_str(),
                                 row.mnLine, row.mnLiveBlocks, row.mnLiveBytes, row.mnAllocCount,
                                 row.mnAllocated, row.mnFreeCount, row.mnFreed));
    }
    return texts;
}

// The usage table is emptied while one block is live, whose site is then known by the block alone.
TEST(MemorySnapshot, HoldsEachSiteWithItsBlocks) {
    HMemory::Alloc(&blocks[0], 10, kFile, 1);
    HMemory::UsageReset();
    HMemory::Alloc(&blocks[1], 20, kFile, 2);
    HMemory::Alloc(&blocks[2], 5, kFile, 2);
    HMemory::Free(&blocks[2]);
    HMemory::Alloc(&blocks[3], 40, file_again.c_str(), 2);
    std::pmr::set_default_resource(std::pmr::null_memory_resource());  // must not be used
    const HMemorySnapshot memory = HMemorySnapshot::Take();
    std::pmr::set_default_resource(nullptr);
    EXPECT_THAT(Texts(memory), UnorderedElementsAre("a.cpp:1 live 1/10 alloc 0/0 free 0/0",
                                                    "a.cpp:2 live 1/20 alloc 2/25 free 1/5",
                                                    "a.cpp:2 live 1/40 alloc 1/40 free 0/0"));
    EXPECT_EQ(memory.mnTotal, 70);
    EXPECT_EQ(memory.mnPeak, 70);
    HMemory::Reset();
}

TEST(MemorySnapshot, SubtractsAndAddsByTextAndLine) {
    HMemory::Alloc(&blocks[0], 10, kFile, 1);
    HMemory::Alloc(&blocks[1], 10, kFile, 2);
    HMemorySnapshot sum = HMemorySnapshot::Take();
    HMemory::Free(&blocks[0]);
    HMemory::Alloc(&blocks[2], 30, file_again.c_str(), 1);
    const HMemorySnapshot later = HMemorySnapshot::Take();
    const HMemorySnapshot difference = later.Since(sum);
    EXPECT_THAT(Texts(difference), ElementsAre("a.cpp:1 live 0/20 alloc 1/30 free 1/10"));
    EXPECT_EQ(difference.mnTotal, 20);
    EXPECT_EQ(difference.mnPeak, 20);
    sum.Merge(difference);
    EXPECT_THAT(Texts(sum), ElementsAre("a.cpp:1 live 1/30 alloc 2/40 free 1/10",
                                        "a.cpp:2 live 1/10 alloc 1/10 free 0/0"));
    EXPECT_EQ(sum.mnTotal, later.mnTotal);
    HMemory::Reset();
}

// The later snapshot has a thread more, and a timer without a difference.
TEST(GlobalTimerSnapshot, SubtractsAndAddsThreadByThread) {
    GlobalTimerSnapshot sum{{{"read", 1, {1}}, {"idle", 3, {3}}}};
    const GlobalTimerSnapshot later{{{"read", 3.5, {1.5, 2}}, {"idle", 3, {3}}}};
    const GlobalTimerSnapshot difference = later.Since(sum);
    ASSERT_EQ(difference.maRows.size(), 1U);
    EXPECT_EQ(difference.maRows[0].mdSeconds, 2.5);
    EXPECT_THAT(difference.maRows[0].maThreadSeconds, ElementsAre(0.5, 2));
    sum.Merge(difference);
    ASSERT_EQ(sum.maRows.size(), 2U);
    EXPECT_EQ(sum.maRows[1].mdSeconds, 3.5);
    EXPECT_THAT(sum.maRows[1].maThreadSeconds, ElementsAre(1.5, 2));
}

}  // namespace
