// The second test leaves a block and writes, and the third one is within its limits again.
#include <zanbase/integrations/googletest_budgets.h>

#include <zanbase/disk_io.h>
#include <zanbase/memory.h>

namespace {

char block[8];

TEST(Budgets, Kept) {
    HMemory::Alloc(block, 8, "a.cpp", 1);
    HMemory::Free(block);
}

TEST(Budgets, Exceeded) {
    HMemory::Alloc(block, 8, "a.cpp", 1);
    HDiskIOOpen("file", block, 0);
    HDiskIOWrite(block, 100, 0);
}

TEST(Budgets, KeptAgain) { HMemory::Free(block); }

}  // namespace

int main(int count, char** arguments) {
    testing::InitGoogleTest(&count, arguments);
    HGoogleTestBudgets::Install([](HTestBudgets& budgets) {
        budgets.GetMemory().LimitUnfreedBytes(0);
        budgets.GetDiskIO().LimitBytesWritten(99);
    });
    return RUN_ALL_TESTS();
}
