// What the tracker's operations leave in its tables, read as a deriving class reads them, and its reports.
#include <gtest/gtest.h>

#include <map>

#include "support/written_text.h"
#include "zanbase/memory_tables.h"
#include "zanbase/string_makers.h"

namespace {

// In one array, so that the order of the pointers is known. kTable and kTwin are the same text.
enum File { kTable, kReader, kTwin, kDeep, kLong };
const char kFiles[][60] = {"/project/src/core/table", "/project/src/io/reader", "/project/src/core/table",
                           "d/123456789/123456789/123456789/123456789/1234567",
                           "a_file_name_that_is_longer_than_all_of_the_column"};
const char* const kNames[] = {"table", "reader", "twin"};
char memory[600];  // the blocks

void Add(int block, std::size_t size, File file, int line) {
    HMemory::Alloc(memory + block, size, kFiles[file], line);
}
void Drop(int block) { HMemory::Free(memory + block); }

std::string SiteText(const char* file, int line) {
    return MkString("%s:%d", kNames[(file - kFiles[0]) / static_cast<int>(sizeof kFiles[0])], line);
}

class Tracker : public HMemory, public testing::Test {
public:
    void TearDown() override {
        while (mpoMemoryStack != nullptr && !mpoMemoryStack->empty()) Pop();
        Reset();
    }

    static std::string Sums() { return MkString("total %zu peak %zu", mnTotalMemory, mnPeekMemory); }

    static std::string Blocks() {
        std::string text;
        for (const auto& [ptr, block] : std::map(mpoMemoryMap->begin(), mpoMemoryMap->end()))
            text += MkString("%d is %zu of %s; ", static_cast<int>(static_cast<char*>(ptr) - memory),
                             block.mnSize, SiteText(block.mpcFile, block.mnLine).c_str());
        return text;
    }

    static std::string Usage() {
        std::string text;
        for (const auto& [site, usage] : std::map(mpoFileMap->begin(), mpoFileMap->end()))
            text += MkString("%s +%zu in %u -%zu in %u; ", SiteText(site.first, site.second).c_str(),
                             usage.mnAllocated, usage.mnAllocCount, usage.mnFreed, usage.mnFreeCount);
        return text;
    }

    static std::string Reports() { return WrittenBy(LeakReport) + WrittenBy(UsageReport); }
};

TEST_F(Tracker, DoesNothingBeforeTheFirstAlloc) {
    Drop(0);
    Pop();
    Reset();
    UsageReset();
    Push();
    EXPECT_EQ(Reports(), "");
    EXPECT_EQ(mpoFileMap, nullptr);
    Add(1, 10, kTable, 1);
    Pop();  // the Push above saved nothing
    EXPECT_EQ(Blocks(), "1 is 10 of table:1; ");
}

TEST_F(Tracker, DistinguishesSitesByPointerAndLine) {
    Add(1, 10, kTable, 1);
    Add(2, 0, kTwin, 1);
    Add(3, 20, kTable, 2);
    Drop(1);
    Drop(1);
    EXPECT_EQ(Sums(), "total 20 peak 30");
    EXPECT_EQ(Blocks(), "2 is 0 of twin:1; 3 is 20 of table:2; ");
    EXPECT_EQ(Usage(), "table:1 +10 in 1 -10 in 1; table:2 +20 in 1 -0 in 0; twin:1 +0 in 1 -0 in 0; ");
}

TEST_F(Tracker, KeepsTheFirstRecordOfABlock) {
    Add(1, 10, kTable, 1);
    Add(1, 30, kReader, 2);
    Drop(1);
    EXPECT_EQ(Sums(), "total 30 peak 40");
    EXPECT_EQ(Usage(), "table:1 +10 in 1 -10 in 1; reader:2 +30 in 1 -0 in 0; ");
    UsageReset();
    Reset();
    EXPECT_EQ(Reports(), "");
}

TEST_F(Tracker, RestoresWhatWasPushed) {
    Add(1, 10, kTable, 1);
    Push();
    Add(1, 99, kTable, 1);
    Push();
    Reset();
    Pop();
    Pop();
    Add(3, 1, kTable, 1);
    EXPECT_EQ(Sums(), "total 11 peak 11");
    EXPECT_EQ(Blocks(), "1 is 10 of table:1; 3 is 1 of table:1; ");
    EXPECT_EQ(Usage(), "table:1 +11 in 2 -0 in 0; ");
}

// Under ctest in a process of its own.
TEST_F(Tracker, UsesTheTablesThatADerivedClassMade) {
    if (mpoFileMap == nullptr) {
        mpoFileMap = new FileMap;
        mpoMemoryMap = new MemoryMap;
        mpoMemoryStack = new std::list<MemoryState>;
    }
    Add(1, 10, kTable, 1);
    Drop(1);
    Add(2, 20, kTable, 1);
    EXPECT_EQ(Blocks(), "2 is 20 of table:1; ");
}

TEST_F(Tracker, FollowsADerivedClassThatChangesTheUsageTable) {
    Add(1, 10, kTable, 1);
    mpoFileMap->erase({kFiles[kTable], 1});
    Drop(1);
    EXPECT_EQ(Usage(), "table:1 +0 in 0 -10 in 1; ");
    FileMap().swap(*mpoFileMap);
    Add(1, 5, kTable, 1);
    EXPECT_EQ(Usage(), "table:1 +5 in 1 -0 in 0; ");
}

// Ordered by size, then by file pointer, then by line, which is signed.
TEST_F(Tracker, PrintsLeaks) {
    Add(1, 1024, kLong, 2);
    Add(2, 1024, kDeep, 123456789);
    Add(3, 1024, kTable, 2);
    Add(4, 1024, kTable, -3);
    Add(5, 1048576, kTable, 57);
    Add(6, 89378, kReader, 120);
    Add(7, 89378, kReader, 120);
    EXPECT_EQ(WrittenBy(LeakReport), R"(Memory Leak Report:
 ______________________________________________________________________________ 
|          |        |        |                                                 |
|   Size   | Blocks |  Line  | File                                            |
|__________|________|________|_________________________________________________|
|          |        |        |                                                 |
|     1024 |      1 |     -3 | src/core/table                                  |
|     1024 |      1 |      2 | src/core/table                                  |
|     1024 |      1 |123456789 | 123456789/123456789/123456789/123456789/1234567 |
|     1024 |      1 |      2 | a_file_name_that_is_longer_than_all_of_the_column |
|  174.57K |      2 |    120 | src/io/reader                                   |
| 1024.00K |      1 |     57 | src/core/table                                  |
|          |        |        |                                                 |
|    1.17M |      7 |        |                                                 |
|__________|________|________|_________________________________________________|

)");
}

// 12,000 K in all: sites below 1,200 bytes are summed up.
TEST_F(Tracker, PrintsUsage) {
    Add(1, 1199, kTable, 1);
    Add(2, 1200, kTable, 2);
    Add(3, 1048576, kTable, 57);
    for (int i = 0; i < 1124; ++i) {
        Add(9, 10000, kReader, 120);
        Drop(9);
    }
    EXPECT_EQ(WrittenBy(UsageReport),
              "Memory Usage Report By File:\n\n"
              "File: src/core/table, Line: 2\nAllocated (1): 1.17K\nFreed     (0):     0\n\n"
              "File: src/core/table, Line: 57\nAllocated (1): 1024.00K\nFreed     (0):        0\n\n"
              "File: src/io/reader, Line: 120\nAllocated (1124): 10.72M\nFreed     (1124): 10.72M\n\n"
              "Total Below Threshold: 1.17K\n\n"
              "Total Allocated:   11.72M\nTotal Freed:       10.72M\n\nPeek Allocated:     1.01M\n\n");
}

}  // namespace
