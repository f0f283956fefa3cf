// What the tracker's operations leave in its tables, read as a deriving class reads them, and its reports.
#include <gtest/gtest.h>

#include <map>
#include <thread>

#include "support/failing_allocation.h"
#include "support/written_text.h"
#include "zanbase/memory_tables.h"
#include "zanbase/string_makers.h"

namespace {

// In one array, so that the order of the pointers is known. The first and the third are the same text.
const char kFiles[][60] = {"/project/src/core/table", "/project/src/io/reader", "/project/src/core/table",
                           "d/123456789/123456789/123456789/123456789/1234567",
                           "a_file_name_that_is_longer_than_all_of_the_column"};
char memory[600];  // the blocks

void Add(int block, std::size_t n, int file, int line) {
    HMemory::Alloc(memory + block, n, kFiles[file], line);
}
void Drop(int block) { HMemory::Free(&memory[block]); }

class Tracker : public HMemory, public testing::Test {
public:
    // Total/peak/saved states; blocks as number=size@site; sites as file.line+calls/bytes-calls/bytes.
    static std::string State() {
        if (mpoFileMap == nullptr && mpoMemoryMap == nullptr && mpoMemoryStack == nullptr) return "nothing";
        std::string text = MkString("%zu/%zu/%zu", mnTotalMemory, mnPeekMemory, mpoMemoryStack->size());
        for (const auto& [ptr, at] : std::map(mpoMemoryMap->begin(), mpoMemoryMap->end()))
            text += MkString(" %td=%zu@%td.%d", static_cast<char*>(ptr) - memory, at.mnSize,
                             (at.mpcFile - kFiles[0]) / 60, at.mnLine);
        for (const auto& [site, use] : std::map(mpoFileMap->begin(), mpoFileMap->end()))
            text += MkString(" %td.%d+%u/%zu-%u/%zu", (site.first - kFiles[0]) / 60, site.second,
                             use.mnAllocCount, use.mnAllocated, use.mnFreeCount, use.mnFreed);
        return text;
    }

    static std::string Reports() { return WrittenBy(LeakReport) + WrittenBy(UsageReport); }
};

TEST_F(Tracker, LeavesItsTablesAsTold) {
    Drop(0), Pop(), Reset(), UsageReset(), Push();
    EXPECT_EQ(State() + Reports(), "nothing");
    const std::pair<void (*)(), const char*> cases[] = {
        {[] { Add(1, 10, 0, 1), Pop(); }, "10/10/0 1=10@0.1 0.1+1/10-0/0"},  // the push above saved nothing
        {[] { Add(0, 10, 0, 1), Add(2, 20, 0, 2), Drop(0), Drop(0), Add(3, 0, 2, 1); },
         "20/30/0 2=20@0.2 3=0@2.1 0.1+1/10-1/10 0.2+1/20-0/0 2.1+1/0-0/0"},
        {[] { Add(1, 10, 0, 1), Add(1, 30, 1, 2), Drop(1); }, "30/40/0 0.1+1/10-1/10 1.2+1/30-0/0"},
        {[] { Add(1, 10, 0, 1), UsageReset(), Drop(1); }, "0/10/0 0.1+0/0-1/10"},
        {[] { Add(1, 10, 0, 1), Push(), Add(1, 99, 0, 1), Reset(), Add(2, 9, 0, 1), Pop(), Add(3, 1, 0, 1); },
         "11/11/0 1=10@0.1 3=1@0.1 0.1+2/11-0/0"},
        {[] { Push(), Add(1, 10, 0, 1), Push(), Push(), Pop(), Pop(), Drop(1); }, "0/10/1 0.1+1/10-1/10"}};
    for (const auto& [run, state] : cases) {
        run();
        EXPECT_EQ(State(), state);
        Pop(), Reset();
        EXPECT_EQ(State() + Reports(), "0/0/0");
    }
}

// In the second round the nodes of freed blocks serve again: only the growth of the table can fail.
TEST_F(Tracker, StaysSoundWhenItsMemoryRunsOut) {
    int blocks = 0;
    const auto check = [&] {
        const std::size_t count = blocks == 0 ? 0 : mpoMemoryMap->size();
        EXPECT_EQ(MkString("%d %d", blocks, blocks), MkString("%zu %zu", count, mnTotalMemory));
    };
    for (int round = 0; round < 2; ++round, Reset()) {
        for (blocks = 0; blocks < 60; ++blocks) FailAtEachNew([&] { Add(blocks, 1, 0, blocks); }, check);
        FailAtEachNew(Push, check);
        Pop();
        for (check(); blocks > 0;) Drop(--blocks);
    }
}

// In bursts past what is kept of nodes and sites, with reports in between.
TEST_F(Tracker, CountsWhatManyThreadsRecord) {
    const auto record = [](int first) {
        for (int round = 0; round < 20; ++round) {
            for (int i = 0; i < 300; ++i) Add(first + i, 2, 0, i);
            EXPECT_NE(Reports(), "");
            for (int i = round / 19; i < 300; ++i) Drop(first + i);
        }
    };
    std::thread other(record, 300);
    record(0);
    other.join();
    EXPECT_NE(State().find(" 0=2@0.0 300=2@0.0 0.0+40/80-38/76 0.1+40/80-40/80 "), std::string::npos);
}

// Leaks by size, then by file pointer, then by line, which is signed; usage from 1229 bytes, a share of the
// sum.
TEST_F(Tracker, Reports) {
    Reset(), Add(1, 1024, 4, 2), Add(2, 1024, 3, 123456789), Add(3, 1024, 0, 2), Add(4, 1024, 0, -3);
    Add(5, 1229, 2, 2), Add(6, 1048576, 0, 57), Add(7, 89378, 1, 120), Add(8, 89378, 1, 120);
    for (int i = 0; i < 1135; ++i) Add(9, 10000, 1, 120), Drop(9);
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
|    1.20K |      1 |      2 | src/core/table                                  |
|  174.57K |      2 |    120 | src/io/reader                                   |
| 1024.00K |      1 |     57 | src/core/table                                  |
|          |        |        |                                                 |
|    1.18M |      8 |        |                                                 |
|__________|________|________|_________________________________________________|

)");
    EXPECT_EQ(WrittenBy(UsageReport),
              "Memory Usage Report By File:\n\n"
              "File: src/core/table, Line: 2\nAllocated (1): 1.20K\nFreed     (0):     0\n\n"
              "File: src/core/table, Line: 57\nAllocated (1): 1024.00K\nFreed     (0):        0\n\n"
              "File: src/io/reader, Line: 120\nAllocated (1137): 10.99M\nFreed     (1135): 10.82M\n\n"
              "Total Below Threshold: 4.00K\n\n"
              "Total Allocated:   12.00M\nTotal Freed:       10.82M\n\nPeek Allocated:     1.19M\n\n");
}

}  // namespace
