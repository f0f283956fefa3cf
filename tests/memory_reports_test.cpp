// The tracker's reports as whole texts, and the texts they are made of.
#include <gtest/gtest.h>

#include <string>
#include <thread>

#include "memory/report_text.h"
#include "support/run_in_child.h"
#include "support/written_text.h"
#include "zanbase/memory.h"

namespace {

constexpr std::size_t kG = 1024 * 1024 * 1024;

TEST(SizeText, ChangesUnitAboveEachPowerOf1024) {
    const struct {
        std::size_t bytes;
        const char* text;
    } cases[] = {{0, "0"},         {1024, "1024"},         {1025, "1.00K"},
                 {1536, "1.50K"},  {1048576, "1024.00K"},  {1048577, "1.00M"},
                 {kG, "1024.00M"}, {kG + kG / 2, "1.50G"}, {~std::size_t{0}, "17179869184.00G"}};
    for (const auto& [bytes, text] : cases) EXPECT_EQ(SizeText(bytes), text);
    const struct {
        double kilobytes;
        const char* text;
    } kilo_cases[] = {{0.0, "0.00K"},
                      {1024.0, "1024.00K"},
                      {1024.1, "1.00M"},
                      {1048576.0, "1024.00M"},
                      {1572864.0, "1.50G"}};
    for (const auto& [kilobytes, text] : kilo_cases) EXPECT_EQ(KiloSizeText(kilobytes), text);
}

TEST(FitField, FillsAndNeverCuts) {
    EXPECT_EQ(FitField("ab", 4, true), "  ab");
    EXPECT_EQ(FitField("ab", 4, false), "ab  ");
    EXPECT_EQ(FitField("ab", 2, true), "ab");
    EXPECT_EQ(FitField("abc", 2, false), "abc");
}

TEST(ShortSourcePath, BeginsAtTheFirstSource) {
    EXPECT_EQ(ShortSourcePath("/home/src/io/src/a"), "src/io/src/a");
    EXPECT_EQ(ShortSourcePath("src/a"), "src/a");
    EXPECT_EQ(ShortSourcePath("\\src\\a"), "\\src\\a");
}

// In one array, so that the order of the pointers is known.
const char kFiles[][80] = {"/home/me/src/core/table",
                           "/home/me/src/io/reader",
                           "/somewhere/buffers/tiles/cache/tile_cache_store_file",
                           "/home/me/src/core/table",
                           "",
                           "/23456789/123456789/123456789/123456789/1234567",
                           "d/123456789/123456789/123456789/123456789/123456",
                           "a_file_name_that_is_longer_than_all_of_the_column"};
enum File { kTable, kReader, kTiles, kTableAgain, kEmpty, kExact, kOneOver, kNoSlash };

std::uintptr_t next_address = 0;

void Take(File file, int line, std::size_t size, int times = 1) {
    for (; times > 0; --times)
        HMemory::Alloc(reinterpret_cast<void*>(++next_address), size, kFiles[file], line);
}

void GiveBack(int times) {
    for (; times > 0; --times) HMemory::Free(reinterpret_cast<void*>(next_address--));
}

class MemoryReports : public testing::Test {
protected:
    void SetUp() override {
        HMemory::Reset();
        next_address = 0;
    }
};

const std::string kHeading =
    "Memory Leak Report:\n"
    " ______________________________________________________________________________ \n"
    "|          |        |        |                                                 |\n"
    "|   Size   | Blocks |  Line  | File                                            |\n"
    "|__________|________|________|_________________________________________________|\n"
    "|          |        |        |                                                 |\n";
const std::string kEnd =
    "|__________|________|________|_________________________________________________|\n\n";

TEST_F(MemoryReports, ListLeaksBySize) {
    Take(kTiles, 88, kG, 3);
    Take(kReader, 120, 768, 2);
    Take(kTable, 57, 512);
    EXPECT_EQ(WrittenBy(HMemory::LeakReport),
              kHeading +
                  "|      512 |      1 |     57 | src/core/table                                  |\n"
                  "|    1.50K |      2 |    120 | src/io/reader                                   |\n"
                  "|    3.00G |      3 |     88 | buffers/tiles/cache/tile_cache_store_file       |\n"
                  "|          |        |        |                                                 |\n"
                  "|    3.00G |      6 |        |                                                 |\n" +
                  kEnd);
}

// Groups of one size stand in the order of file pointers, then of lines, which are signed.
TEST_F(MemoryReports, FitPathsAndOrderEqualLeaks) {
    Take(kNoSlash, 1, 7);
    Take(kOneOver, 1, 7);
    Take(kExact, 123456789, 7);
    Take(kEmpty, 1, 7);
    Take(kTableAgain, 2, 7);
    Take(kTable, 2, 7);
    Take(kTable, -3, 7);
    EXPECT_EQ(WrittenBy(HMemory::LeakReport),
              kHeading +
                  "|        7 |      1 |     -3 | src/core/table                                  |\n"
                  "|        7 |      1 |      2 | src/core/table                                  |\n"
                  "|        7 |      1 |      2 | src/core/table                                  |\n"
                  "|        7 |      1 |      1 |                                                 |\n"
                  "|        7 |      1 |123456789 | /23456789/123456789/123456789/123456789/1234567 |\n"
                  "|        7 |      1 |      1 | 123456789/123456789/123456789/123456789/123456  |\n"
                  "|        7 |      1 |      1 | a_file_name_that_is_longer_than_all_of_the_column |\n"
                  "|          |        |        |                                                 |\n"
                  "|       49 |      7 |        |                                                 |\n" +
                  kEnd);
}

TEST_F(MemoryReports, ListUsageBySize) {
    Take(kTableAgain, 1, 100);
    GiveBack(1);
    Take(kReader, 120, 89378, 2);
    Take(kReader, 120, 87381, 118);
    GiveBack(118);
    Take(kTable, 57, 262144, 8);
    EXPECT_EQ(WrittenBy(HMemory::UsageReport),
              "Memory Usage Report By File:\n\n"
              "File: src/core/table, Line: 57\n"
              "Allocated (8): 2.00M\n"
              "Freed     (0):     0\n\n"
              "File: src/io/reader, Line: 120\n"
              "Allocated (120): 10.00M\n"
              "Freed     (118):  9.83M\n\n"
              "Total Below Threshold: 0.10K\n\n"
              "Total Allocated:   12.00M\n"
              "Total Freed:        9.83M\n\n"
              "Peek Allocated:    10.00M\n\n");
}

// The threshold is a tenth of the total in K, cut to a whole number, and taken for a number of bytes.
TEST_F(MemoryReports, SumUpWhatIsBelowTheThreshold) {
    const auto is_listed = [](std::size_t size, std::size_t total) {
        HMemory::Reset();
        Take(kTable, 1, size);
        Take(kReader, 2, total - size);
        return WrittenBy(HMemory::UsageReport).find("Line: 1\n") != std::string::npos;
    };
    EXPECT_TRUE(is_listed(0, 10239));
    EXPECT_FALSE(is_listed(0, 10240));
    EXPECT_TRUE(is_listed(1, 10240));
    EXPECT_TRUE(is_listed(9, 102399));
    EXPECT_FALSE(is_listed(9, 102400));
}

TEST_F(MemoryReports, PrintNothingWhereNothingIs) {
    const auto both = [] {
        return WrittenBy([](std::FILE* stream) {
            HMemory::LeakReport(stream);
            HMemory::UsageReport(stream);
        });
    };
    const ChildResult child = RunInChild([&] { return both().empty() ? 0 : 1; });  // before the first Alloc
    EXPECT_EQ(child.exit_code, 0);
    Take(kTable, 1, 3, 2);
    GiveBack(1);
    HMemory::UsageReset();
    EXPECT_EQ(WrittenBy(HMemory::UsageReport), "");
    EXPECT_NE(WrittenBy(HMemory::LeakReport), "");
    GiveBack(1);
    EXPECT_EQ(WrittenBy(HMemory::LeakReport), "");
    EXPECT_EQ(WrittenBy(HMemory::UsageReport),
              "Memory Usage Report By File:\n\n"
              "File: src/core/table, Line: 1\nAllocated (0): 0\nFreed     (1): 3\n\n"
              "Total Below Threshold: 0.00K\n\n"
              "Total Allocated:    0.00K\nTotal Freed:        0.00K\n\nPeek Allocated:         6\n\n");
    HMemory::Reset();
    EXPECT_EQ(both(), "");
}

TEST_F(MemoryReports, ShowOneStateWhileOthersRecord) {
    std::thread recorder([] {
        for (int round = 0; round < 2000; ++round) {
            HMemory::Alloc(&next_address, 8, kFiles[kTable], 1);
            HMemory::Free(&next_address);
        }
    });
    for (int round = 0; round < 50; ++round) {
        const std::string text = WrittenBy(HMemory::LeakReport);
        EXPECT_TRUE(text.empty() || text.find("|        8 |      1 |        |") != std::string::npos) << text;
        WrittenBy(HMemory::UsageReport);
    }
    recorder.join();
}

}  // namespace
