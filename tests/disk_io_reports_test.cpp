// The disk reports as whole texts.
#include "diskio/disk_io_reports.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <thread>

#include "support/written_text.h"
#include "zanbase/disk_io.h"

namespace {

void* At(std::uintptr_t handle) { return reinterpret_cast<void*>(handle); }

void Move(const std::string& name, unsigned long long read, unsigned long long written) {
    HDiskIOOpen(name, At(1), 0.05);
    if (read != 0) HDiskIORead(At(1), read, 0.5);
    if (written != 0) HDiskIOWrite(At(1), written, 0.25);
}

std::string FileReport(const std::string& name) {
    return WrittenBy([&](std::FILE* stream) { EXPECT_TRUE(HDiskIOReportFile(stream, name)); });
}

TEST(DiskIOTimeText, CutsAndNeverRounds) {
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const struct {
        double seconds;
        const char* text;
    } cases[] = {{0, "00:00:00.00"},
                 {61.5, "00:01:01.50"},
                 {3661.25, "01:01:01.25"},
                 {360000, "100:00:00.00"},
                 {1.999, "00:00:01.99"},
                 {0.29, "00:00:00.28"},
                 {-0.0, "00:00:00.00"},
                 // Beyond what is measured: all the same the text is defined.
                 {-3661.5, "-1:-1:-1.-50"},
                 {2147483647.5, "596523:14:07.50"},
                 {2147483648.0, "596523:14:07.99"},
                 {kInfinity, "596523:14:07.99"},
                 {-kInfinity, "-596523:-14:-8.-99"},
                 {-1e300, "-596523:-14:-8.-99"},
                 {std::numeric_limits<double>::quiet_NaN(), "00:00:00.00"}};
    for (const auto& [seconds, text] : cases) EXPECT_EQ(DiskIOTimeText(seconds), text) << seconds;
}

class DiskIOReports : public testing::Test {
protected:
    void SetUp() override { HDiskIOReset(); }
};

TEST_F(DiskIOReports, ShowOneFile) {
    HDiskIOOpen("/data/run.dat", At(1), 0.05);
    EXPECT_EQ(FileReport("/data/run.dat"),
              "File: /data/run.dat\nOpen  (1): 00:00:00.05\nClose (0): 00:00:00.00\n\n");
    for (int i = 0; i < 12; ++i) HDiskIOSeek(At(1), 0.25);
    for (int i = 0; i < 120; ++i) HDiskIORead(At(1), 28399, 0.0625);
    HDiskIOClose(At(1), 0.01);
    EXPECT_EQ(FileReport("/data/run.dat"),
              "File: /data/run.dat\n"
              "Open  (  1): 00:00:00.05\n"
              "Close (  1): 00:00:00.01\n"
              "Seek  ( 12): 00:00:03.00\n"
              "Read  (120): 00:00:07.50, 3.25M\n\n");
    HDiskIOWrite(At(1), 1, 60);
    EXPECT_NE(FileReport("/data/run.dat").find("Write (  1): 00:01:00.00, 1\n\n"), std::string::npos);
    EXPECT_EQ(WrittenBy([](std::FILE* stream) { EXPECT_FALSE(HDiskIOReportFile(stream, "/DATA/run.dat")); }),
              "");
}

TEST_F(DiskIOReports, CutALongLineAndPrintCountsAsSigned) {
    DiskIOUsage usage;
    usage.mnOpenCount = ~0U;
    EXPECT_EQ(DiskIOFileText("a", usage), "File: a\nOpen  (-1): 00:00:00.00\nClose ( 0): 00:00:00.00\n\n");
    const std::string name(5000, 'x');
    EXPECT_EQ(DiskIOFileText(name, DiskIOUsage()),
              "File: " + name.substr(0, 4089) + "Open  (0): 00:00:00.00\nClose (0): 00:00:00.00\n\n");
}

TEST_F(DiskIOReports, SumUp) {
    EXPECT_EQ(WrittenBy(HDiskIOSummaryReport), "");
    Move("a", 12 * 1048576, 0);
    HDiskIOSeek(At(1), 3600);
    HDiskIOClose(At(1), 0.01);
    Move("b", 524288, 0);
    const std::string head =
        "Disk I/O Summary Report:\n"
        " __________________________________________ \n"
        "|       |         |             |          |\n"
        "|       |  Count  |    Time     |   Size   |\n"
        "|_______|_________|_____________|__________|\n"
        "|       |         |             |          |\n"
        "| File  |       2 |             |          |\n"
        "|       |         |             |          |\n";
    const std::string end = "|_______|_________|_____________|__________|\n\n";
    EXPECT_EQ(WrittenBy(HDiskIOSummaryReport), head +
                                                   "| Open  |       2 | 00:00:00.10 |          |\n"
                                                   "| Close |       1 | 00:00:00.01 |          |\n"
                                                   "| Seek  |       1 | 01:00:00.00 |          |\n"
                                                   "| Read  |       2 | 00:00:01.00 |   12.50M |\n"
                                                   "| Write |       0 | 00:00:00.00 |        0 |\n" +
                                                   end);
    DiskIOFileMap files;
    files["a"].mnReadCount = files["b"].mnReadCount = 99999999;
    files["a"].mnWriteCount = files["b"].mnWriteCount = 1U << 31;  // the sum wraps
    files["b"].mdWriteTime = 360000;
    files["b"].mnWriteSize = 1ULL << 50;
    EXPECT_EQ(DiskIOSummaryText(files), head +
                                            "| Open  |       0 | 00:00:00.00 |          |\n"
                                            "| Close |       0 | 00:00:00.00 |          |\n"
                                            "| Seek  |       0 | 00:00:00.00 |          |\n"
                                            "| Read  |199999998 | 00:00:00.00 |        0 |\n"
                                            "| Write |       0 |100:00:00.00 |1048576.00G |\n" +
                                            end);
}

std::string Block(const std::string& name, const std::string& read) {
    return "File: " + name + "\nOpen  (1): 00:00:00.05\nClose (0): 00:00:00.00\n" + read + "\n";
}

TEST_F(DiskIOReports, ListFilesBySize) {
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), "");
    Move("nothing", 0, 0);
    HDiskIORead(At(1), 0, 0.5);
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), "Disk I/O Usage Report:\n\nNo disk I/O usage to report.\n\n");
    EXPECT_EQ(FileReport("nothing"), Block("nothing", "Read  (1): 00:00:00.50, 0\n"));
    Move("m", 100, 200);
    Move("z", 100, 0);
    Move("c", 200, 0);
    Move("b", 0, 100);
    const std::string text = "Disk I/O Usage Report:\n\n" + Block("b", "Write (1): 00:00:00.25, 100\n") +
                             Block("z", "Read  (1): 00:00:00.50, 100\n") +
                             Block("c", "Read  (1): 00:00:00.50, 200\n") +
                             Block("m", "Read  (1): 00:00:00.50, 100\nWrite (1): 00:00:00.25, 200\n");
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), text);
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), text);
}

TEST_F(DiskIOReports, ShowOneStateWhileOthersRecord) {
    std::thread recorder([] {
        for (int round = 0; round < 1000; ++round) {
            HDiskIOPush();
            Move("a", 1, 1);
            HDiskIOReset();
            HDiskIOPop();
        }
    });
    for (int round = 0; round < 200; ++round) {
        const std::string text = WrittenBy(HDiskIOUsageReport);
        EXPECT_TRUE(text.empty() || text.find("File: a\n") != std::string::npos ||
                    text.find("No disk I/O usage") != std::string::npos)
            << text;
        WrittenBy(HDiskIOSummaryReport);
    }
    recorder.join();
}

}  // namespace
