// What the tracker's operations leave in its tables, read as a deriving class reads them, and its reports.
#include <gtest/gtest.h>

#include <future>
#include <set>
#include <sstream>

#include "memory/report_text.h"
#include "support/failing_new.h"
#include "support/written_text.h"
#include "zanbase/memory_tables.h"
#include "zanbase/string_makers.h"

namespace {

// Files a to h, in one array, so that the order of the pointers is known. a and c are the same text.
const char kFiles[][60] = {"/home/me/src/core/table",
                           "/home/me/src/io/reader",
                           "/home/me/src/core/table",
                           "",
                           "/23456789/123456789/123456789/123456789/1234567",
                           "d/123456789/123456789/123456789/123456789/123456",
                           "a_file_name_that_is_longer_than_all_of_the_column",
                           "/somewhere/buffers/tiles/cache/tile_cache_store_file"};

void* At(int address) { return reinterpret_cast<void*>(static_cast<std::size_t>(address)); }

class Tracker : public HMemory {
public:
    // "+1:10a2" records 10 bytes at address 1 for line 2 of file a, "-1" frees address 1; { and } push and
    // pop, ! resets, ~ resets the usage.
    static void Run(const std::string& script) {
        std::istringstream words(script);
        for (std::string word; words >> word;) {
            void* ptr = nullptr;
            std::size_t size = 0;
            char file = 0;
            int line = 0;
            std::sscanf(word.c_str() + 1, "%p:%zu%c%d", &ptr, &size, &file, &line);
            if (word[0] == '+') Alloc(ptr, size, kFiles[file - 'a'], line);
            if (word[0] == '-') Free(ptr);
            if (word[0] == '{') Push();
            if (word[0] == '}') Pop();
            if (word[0] == '!') Reset();
            if (word[0] == '~') UsageReset();
        }
    }

    // Total/peak/saved states; blocks as address=size@site; sites as site+calls/bytes-calls/bytes.
    static std::string State() {
        if (mpoFileMap == nullptr && mpoMemoryMap == nullptr && mpoMemoryStack == nullptr) return "nothing";
        const auto site = [](const char* file, int line) {
            return static_cast<char>('a' + (file - kFiles[0]) / 60) + MkString(line);
        };
        std::set<std::string> parts;
        for (const auto& [ptr, block] : *mpoMemoryMap)
            parts.insert(MkString(" %p=%zu@", ptr, block.mnSize) + site(block.mpcFile, block.mnLine));
        for (const auto& [key, use] : *mpoFileMap)
            parts.insert(
                " " + site(key.first, key.second) +
                MkString("+%u/%zu-%u/%zu", use.mnAllocCount, use.mnAllocated, use.mnFreeCount, use.mnFreed));
        std::string text = MkString("%zu/%zu/%zu", mnTotalMemory, mnPeekMemory, mpoMemoryStack->size());
        for (const std::string& part : parts) text += part;
        return text;
    }

    // Blocks of one byte each; no tables is no blocks.
    static bool Holds(int blocks) {
        const auto count = static_cast<std::size_t>(blocks);
        return mnTotalMemory == count && (count == 0 || mpoMemoryMap->size() == count);
    }
};

TEST(HMemory, LeavesItsTablesAsTold) {
    const auto reports = [] { return WrittenBy(HMemory::LeakReport) + WrittenBy(HMemory::UsageReport); };
    Tracker::Run("-0 } ! ~ {");
    EXPECT_EQ(Tracker::State() + reports(), "nothing");
    const char* const cases[][2] = {
        {"+1:10a1 }", "10/10/0 0x1=10@a1 a1+1/10-0/0"},  // the push above saved nothing
        {"+1:1a1 +2:2a2 +3:0c1 +0:5a1",
         "8/8/0 (nil)=5@a1 0x1=1@a1 0x2=2@a2 0x3=0@c1 a1+2/6-0/0 a2+1/2-0/0 c1+1/0-0/0"},
        {"+0:10a1 +2:20a1 -0 -0 -7 +3:5a1", "25/30/0 0x2=20@a1 0x3=5@a1 a1+3/35-1/10"},
        {"+9:1a9 -9 +1:10a1 +1:30b2", "40/40/0 0x1=10@a1 a1+1/10-0/0 a9+1/1-1/1 b2+1/30-0/0"},
        {"+1:10a1 +1:30b2 -1 -1", "30/40/0 a1+1/10-1/10 b2+1/30-0/0"},
        {"+1:10a1 +2:20a1 ~ -1", "20/30/0 0x2=20@a1 a1+0/0-1/10"},
        {"+1:10a1 { -1 +2:99a1", "99/99/1 0x2=99@a1 a1+1/99-0/0"},
        {"+1:10a1 { +1:99a1 -1 ! +2:99a1 } -2 +3:1a1", "11/11/0 0x1=10@a1 0x3=1@a1 a1+2/11-0/0"},
        {"{ +1:10a1 { +2:20a1 { } } -1", "0/10/1 a1+1/10-1/10"},
        {"+1:10a1 ! -1", "0/0/0"},
    };
    for (const auto& [script, state] : cases) {
        Tracker::Run(script);
        EXPECT_EQ(Tracker::State(), state) << script;
        Tracker::Run("} } !");
        EXPECT_EQ(reports(), "");
    }
}

// In the second round the nodes of freed blocks serve again, so that the growth of the table is all that can
// fail.
TEST(HMemory, StaysSoundWhenItsMemoryRunsOut) {
    int blocks = 0;
    const auto record = [&] { HMemory::Alloc(At(blocks), 1, kFiles[0], blocks); };
    const auto check = [&] { EXPECT_TRUE(Tracker::Holds(blocks)) << blocks; };
    FailAtEachNew(record, check);
    Tracker::Run("! {");
    for (int round = 0; round < 2; ++round) {
        for (blocks = 0; blocks < 60; ++blocks) FailAtEachNew(record, check);
        FailAtEachNew(HMemory::Push, check);
        HMemory::Pop();
        for (check(); blocks > 0;) HMemory::Free(At(--blocks));
        Tracker::Run("} {");
    }
}

// In bursts past what is kept of nodes and sites, with reports in between.
TEST(HMemory, CountsWhatManyThreadsRecord) {
    HMemory::Reset();
    const auto record = [](int thread) {
        for (int round = 0; round < 20; ++round) {
            for (int i = 0; i < 300; ++i) HMemory::Alloc(At(i * 2 + thread), 2, kFiles[0], i);
            EXPECT_NE(WrittenBy(HMemory::LeakReport) + WrittenBy(HMemory::UsageReport), "");
            for (int i = round < 19 ? 0 : 1; i < 300; ++i) HMemory::Free(At(i * 2 + thread));
        }
    };
    const std::future<void> other = std::async(std::launch::async, record, 1);
    record(0);
    other.wait();
    EXPECT_NE(Tracker::State().find(" (nil)=2@a0 0x1=2@a0 a0+40/80-38/76 a1+40/80-40/80 "),
              std::string::npos);
}

TEST(ReportText, FitsSizesFieldsAndPaths) {
    std::string text;
    for (const std::size_t bytes :
         {0ULL, 1024ULL, 1025ULL, 1048576ULL, 1048577ULL, 1ULL << 30, 3ULL << 29, ~0ULL})
        text += SizeText(bytes) + " ";
    EXPECT_EQ(text, "0 1024 1.00K 1024.00K 1.00M 1024.00M 1.50G 17179869184.00G ");
    EXPECT_EQ(KiloSizeText(0) + KiloSizeText(1024) + KiloSizeText(1048576), "0.00K1024.00K1024.00M");
    EXPECT_EQ(FitField("abc", 2, true) + FitField("b", 3, false) + ShortSourcePath("/a/src/b/src/c"),
              "abcb  src/b/src/c");
}

// By size, then by file pointer, then by line, which is signed.
TEST(HMemory, ReportsLeaks) {
    Tracker::Run(
        "! +1:7g2 +2:7f2 +3:7d2 +4:7c2 +5:7a2 +6:7e123456789 +7:7a-3 +8:3221225472h88 +9:768b120 +a:768b120 "
        "~");
    EXPECT_EQ(WrittenBy(HMemory::LeakReport),
              "Memory Leak Report:\n"
              " ______________________________________________________________________________ \n"
              "|          |        |        |                                                 |\n"
              "|   Size   | Blocks |  Line  | File                                            |\n"
              "|__________|________|________|_________________________________________________|\n"
              "|          |        |        |                                                 |\n"
              "|        7 |      1 |     -3 | src/core/table                                  |\n"
              "|        7 |      1 |      2 | src/core/table                                  |\n"
              "|        7 |      1 |      2 | src/core/table                                  |\n"
              "|        7 |      1 |      2 |                                                 |\n"
              "|        7 |      1 |123456789 | /23456789/123456789/123456789/123456789/1234567 |\n"
              "|        7 |      1 |      2 | 123456789/123456789/123456789/123456789/123456  |\n"
              "|        7 |      1 |      2 | a_file_name_that_is_longer_than_all_of_the_column |\n"
              "|    1.50K |      2 |    120 | src/io/reader                                   |\n"
              "|    3.00G |      1 |     88 | buffers/tiles/cache/tile_cache_store_file       |\n"
              "|          |        |        |                                                 |\n"
              "|    3.00G |     10 |        |                                                 |\n"
              "|__________|________|________|_________________________________________________|\n\n");
    EXPECT_EQ(WrittenBy(HMemory::UsageReport), "");
}

// The sites d1 and c1 are below the threshold of 1229 bytes, until c1 has grown by one.
TEST(HMemory, ReportsUsage) {
    Tracker::Run("! +9:0d1 ~ -9 +1:89378b120 +2:89378b120 +3:2097152a57 +5:1228c1");
    for (int i = 0; i < 118; ++i) Tracker::Run("+4:87381b120 -4");
    EXPECT_EQ(WrittenBy(HMemory::UsageReport),
              "Memory Usage Report By File:\n\n"
              "File: src/core/table, Line: 57\nAllocated (1): 2.00M\nFreed     (0):     0\n\n"
              "File: src/io/reader, Line: 120\nAllocated (120): 10.00M\nFreed     (118):  9.83M\n\n"
              "Total Below Threshold: 1.20K\n\n"
              "Total Allocated:   12.00M\nTotal Freed:        9.83M\n\nPeek Allocated:     2.25M\n\n");
    Tracker::Run("+6:1c1");
    EXPECT_NE(WrittenBy(HMemory::UsageReport).find("Allocated (2): 1.20K\nFreed     (0):     0\n"),
              std::string::npos);
}

}  // namespace
