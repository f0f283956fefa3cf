// What the recording operations leave in the disk ledger, and its reports.
#include "zanbase/disk_io.h"

#include <gtest/gtest.h>

#include <cmath>
#include <sstream>
#include <thread>
#include <vector>

#include "diskio/disk_io_reports.h"
#include "support/failing_new.h"
#include "support/run_in_child.h"
#include "support/written_text.h"
#include "zanbase/string_makers.h"

namespace {

void* At(std::size_t handle) { return reinterpret_cast<void*>(handle); }

// "o1a" opens handle 1 of file a, "m1a" maps it; r, w, s and c with a handle read 3 bytes, write 5, seek and
// close; { and } push and pop, ! resets, ? asks for a name.
void Play(const std::string& script) {
    std::istringstream words(script);
    for (std::string word; words >> word;) {
        void* const handle = At(static_cast<unsigned char>(word[1]));
        if (word[0] == 'o') HDiskIOOpen(word.substr(2), handle, 1);
        if (word[0] == 'm') _HDiskIOMapFD(word.substr(2), handle);
        if (word[0] == 'r') HDiskIORead(handle, 3, 0.5);
        if (word[0] == 'w') HDiskIOWrite(handle, 5, 0.25);
        if (word[0] == 's') HDiskIOSeek(handle, 1);
        if (word[0] == 'c') HDiskIOClose(handle, 1);
        if (word[0] == '{') HDiskIOPush();
        if (word[0] == '}') HDiskIOPop();
        if (word[0] == '!') HDiskIOReset();
        if (word[0] == '?') HDiskIOGetFilename(handle);
    }
}

// Each record as name:opens/closes/seeks/reads(bytes)/writes(bytes), then the name of handle 1.
std::string State() {
    std::string text;
    for (const auto& [name, use] : *mpoDiskIOFileMap)
        text += name + MkString(":%u/%u/%u/%u(%llu)/%u(%llu) ", use.mnOpenCount, use.mnCloseCount,
                                use.mnSeekCount, use.mnReadCount, use.mnReadSize, use.mnWriteCount,
                                use.mnWriteSize);
    return text + "1=" + HDiskIOGetFilename(At('1'));
}

bool HasRecord(const char* name) {
    return HDiskIOAccessFileData(name, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr);
}

TEST(DiskIO, MakesTheLedgerAtTheFirstCallThatNeedsIt) {
    for (const char* const script : {"o1a", "m1a", "r1", "w1", "s1", "c1", "{", "}", "!", "?1"}) {
        const ChildResult child = RunInChild([script] {
            HDiskIOSummaryReport(stdout);
            HDiskIOUsageReport(stdout);
            if (HasRecord("a") || HDiskIOReportFile(stdout, "a") || LedgerMutexIfMade() != nullptr) return 1;
            Play(script);
            return LedgerMutexIfMade() != nullptr ? 0 : 2;
        });
        EXPECT_EQ(child.exit_code, 0) << script;
        EXPECT_EQ(child.out, "");
    }
}

// A binding may be there before the record, and then seeks are dropped. A lock that stayed held would keep
// the other thread for ever.
TEST(DiskIO, StaysSoundWhenMemoryRunsOut) {
    const ChildResult child = RunInChild([] {
        const auto seek = [] { std::thread([] { HDiskIOSeek(At('1'), 1); }).join(); };
        FailAtEachNew([] { HDiskIOOpen("a", At('1'), 1); }, seek);
        FailAtEachNew([] { HDiskIOOpen("b", At('1'), 1); }, seek);
        const int failures = FailAtEachNew(HDiskIOPush, seek);
        Play("r1");
        if (FailAtEachNew(HDiskIOPop, seek) == 0) std::puts(State().c_str());
        return failures;
    });
    EXPECT_GT(child.exit_code, 4);
    EXPECT_EQ(child.out, MkString("a:1/0/0/0(0)/0(0) b:1/0/%d/0(0)/0(0) 1=b\n", child.exit_code));
}

// Threads that meet at the first call share one ledger.
TEST(DiskIO, CountsWhatManyThreadsRecord) {
    std::atomic<int> missing{4};
    std::vector<std::thread> threads;
    for (const char* const script : {"o1x r1 o5a w5", "o2x r2 o6b w6", "o3x r3 o7c w7", "o4x r4 o8d w8"}) {
        threads.emplace_back([&missing, script] {
            for (--missing; missing > 0;) std::this_thread::yield();
            for (int round = 0; round < 500; ++round) Play(script);
            EXPECT_NE(WrittenBy(HDiskIOSummaryReport) + WrittenBy(HDiskIOUsageReport), "");
        });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(State(),
              "a:500/0/0/0(0)/500(2500) b:500/0/0/0(0)/500(2500) c:500/0/0/0(0)/500(2500) "
              "d:500/0/0/0(0)/500(2500) x:2000/0/0/2000(6000)/0(0) 1=x");
}

TEST(DiskIO, RecordsAsTold) {
    const char* const cases[][2] = {
        {"o1a s1 r1 r1 w1 c1 r1", "a:1/1/1/3(9)/1(5) 1=a"},
        {"o1a o2a r1 r2", "a:2/0/0/2(6)/0(0) 1=a"},
        {"o1a r1 o1A r1 r1", "A:1/0/0/2(6)/0(0) a:1/0/0/1(3)/0(0) 1=A"},
        {"o2a r1 w1 s1 c1", "a:1/0/0/0(0)/0(0) 1="},
        {"o2 r1 w1 s1 c1", ":1/1/1/1(3)/1(5) 1="},  // the empty name has a record
        {"m1a r1 o2a r1", "a:1/0/0/1(3)/0(0) 1=a"},
        {"o1a r1 m1b r1", "a:1/0/0/1(3)/0(0) 1=b"},
        {"o1a { r1", "1="},
        {"o1a r1 { r1 ! o1b r1 } r1 }", "a:1/0/0/2(6)/0(0) 1=a"},
        {"o1a { o1b { { } } r1", "b:1/0/0/1(3)/0(0) 1=b"},
        {"o1a\xff o1ab o1a o1B",
         "B:1/0/0/0(0)/0(0) a:1/0/0/0(0)/0(0) ab:1/0/0/0(0)/0(0) a\xff:1/0/0/0(0)/0(0) 1=B"},
    };
    for (const auto& [script, state] : cases) {
        Play(std::string("! ") + script);
        EXPECT_EQ(State(), state) << script;
        Play("} }");
    }
}

TEST(DiskIO, TellsReadsAndWrites) {
    Play("! o1a r1 r1 w1");
    double times[2] = {};
    unsigned int counts[2] = {};
    unsigned long long sizes[2] = {};
    for (const char* const name : {"a", "A"})
        EXPECT_EQ(HDiskIOAccessFileData(name, times, counts, sizes, times + 1, counts + 1, sizes + 1),
                  HasRecord(name));
    EXPECT_EQ(MkString("%g %u %llu %g %u %llu", times[0], counts[0], sizes[0], times[1], counts[1], sizes[1]),
              "1 2 6 0.25 1 5");
}

TEST(DiskIO, CutsTimesAndNeverRounds) {
    std::string text;
    for (const double seconds : {0.0, 61.5, 3661.25, 360000.0, 1.999, 0.29, -3661.5, double{NAN}})
        text += DiskIOTimeText(seconds) + " ";
    EXPECT_EQ(
        text,
        "00:00:00.00 00:01:01.50 01:01:01.25 100:00:00.00 00:00:01.99 00:00:00.28 -1:-1:-1.-50 00:00:00.00 ");
    EXPECT_EQ(DiskIOTimeText(2147483647.5) + DiskIOTimeText(2147483648.0), "596523:14:07.50596523:14:07.99");
    EXPECT_EQ(DiskIOTimeText(HUGE_VAL) + DiskIOTimeText(-HUGE_VAL), "596523:14:07.99-596523:-14:-8.-99");
}

TEST(DiskIO, ReportsFiles) {
    Play("!");
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport) + WrittenBy(HDiskIOSummaryReport), "");
    EXPECT_FALSE(HDiskIOReportFile(stdout, ""));
    Play("o1z c1");
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), "Disk I/O Usage Report:\n\nNo disk I/O usage to report.\n\n");
    HDiskIORead(At('1'), 0, 61.5);  // moves nothing
    Play("o1y w1 o1x w1 o1b s1 s1 c1");
    for (int i = 0; i < 120; ++i) HDiskIORead(At('1'), 28399, 0.0625);
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport),
              "Disk I/O Usage Report:\n\n"
              "File: x\nOpen  (1): 00:00:01.00\nClose (0): 00:00:00.00\nWrite (1): 00:00:00.25, 5\n\n"
              "File: y\nOpen  (1): 00:00:01.00\nClose (0): 00:00:00.00\nWrite (1): 00:00:00.25, 5\n\n"
              "File: b\nOpen  (  1): 00:00:01.00\nClose (  1): 00:00:01.00\nSeek  (  2): 00:00:02.00\n"
              "Read  (120): 00:00:07.50, 3.25M\n\n");
    EXPECT_EQ(WrittenBy([](std::FILE* stream) { EXPECT_TRUE(HDiskIOReportFile(stream, "z")); }),
              "File: z\nOpen  (1): 00:00:01.00\nClose (1): 00:00:01.00\nRead  (1): 00:01:01.50, 0\n\n");
    const std::string name(5000, 'x');  // a line is cut to 4095 characters
    EXPECT_EQ(DiskIOFileText(name, {}).find(name.substr(0, 4089) + "Open "), 6U);
}

TEST(DiskIO, ReportsSums) {
    DiskIOFileMap files;
    files["a"] = {0.06, 2, 0.005, 1, 0, 99999999, 1.25, 20, 12 << 20, 0, 1U << 31, 0};
    files["b"] = {0.0625, 1, 0.005, 2, 0, 99999999, 0.25, 20, 1 << 19, 360000, 1U << 31, 1ULL << 50};
    EXPECT_EQ(DiskIOSummaryText(files),
              "Disk I/O Summary Report:\n"
              " __________________________________________ \n"
              "|       |         |             |          |\n"
              "|       |  Count  |    Time     |   Size   |\n"
              "|_______|_________|_____________|__________|\n"
              "|       |         |             |          |\n"
              "| File  |       2 |             |          |\n"
              "|       |         |             |          |\n"
              "| Open  |       3 | 00:00:00.12 |          |\n"
              "| Close |       3 | 00:00:00.01 |          |\n"
              "| Seek  |199999998 | 00:00:00.00 |          |\n"
              "| Read  |      40 | 00:00:01.50 |   12.50M |\n"
              "| Write |       0 |100:00:00.00 |1048576.00G |\n"
              "|_______|_________|_____________|__________|\n\n");
}

}  // namespace
