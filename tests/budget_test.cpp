// Budgets: what keeps a limit, what exceeds it, and which sites are named.
#include "zanbase/budget.h"

#include <gtest/gtest.h>

#include "zanbase/disk_io.h"
#include "zanbase/memory.h"

namespace {

char blocks[8];

// Two blocks of 10 and 30 bytes are recorded in the scope, and the larger one is freed. The tracker's older
// peak of 1000 bytes, and 5 bytes that were live before, count for nothing.
TEST(MemoryBudget, NamesTheSitesThatExceedALimit) {
    HMemory::Alloc(&blocks[0], 1000, "old.cpp", 1);
    HMemory::Free(&blocks[0]);
    HMemory::Alloc(&blocks[0], 5, "old.cpp", 2);
    {
        HMemoryBudget budget;
        HMemory::Alloc(&blocks[1], 10, "a.cpp", 1);
        HMemory::Alloc(&blocks[2], 30, "b.cpp", 2);
        HMemory::Free(&blocks[2]);
        budget.LimitLiveBytes(10).LimitPeakBytes(40).LimitAllocations(2);
        EXPECT_TRUE(budget.Check()) << budget.GetText();
        EXPECT_EQ(budget.GetText(), "");
        budget.LimitLiveBytes(9).LimitPeakBytes(39).LimitAllocations(1);
        EXPECT_FALSE(budget.Check());
        EXPECT_EQ(budget.GetText(),
                  "live bytes: 10, limit 9\n  a.cpp:1: 10\n"
                  "peak bytes: 40, limit 39\n  b.cpp:2: 30\n  a.cpp:1: 10\n"
                  "allocations: 2, limit 1\n  a.cpp:1: 1\n  b.cpp:2: 1\n");
    }
    EXPECT_EQ(HMemorySnapshot::Take().mnPeak, 1000);
    HMemory::Reset();
}

TEST(DiskIOBudget, NamesTheFilesThatExceedALimit) {
    HDiskIOOpen("old", &blocks[0], 0);
    HDiskIOBudget budget;
    HDiskIOOpen("a", &blocks[1], 0);
    HDiskIORead(&blocks[1], 7, 0);
    HDiskIORead(&blocks[0], 8, 0);
    EXPECT_TRUE(budget.LimitOpens(1).LimitReads(2).LimitBytesRead(15).Check()) << budget.GetText();
    EXPECT_FALSE(budget.LimitOpens(0).LimitReads(1).LimitBytesRead(14).Check());
    EXPECT_EQ(budget.GetText(),
              "files opened: 1, limit 0\n  a: 1\n"
              "reads: 2, limit 1\n  a: 1\n  old: 1\n"
              "bytes read: 15, limit 14\n  old: 8\n  a: 7\n");
    HDiskIOReset();
}

}  // namespace
