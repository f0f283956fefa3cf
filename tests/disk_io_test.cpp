// What the recording operations leave in the disk ledger, and its reports.
#include "zanbase/disk_io.h"

#include <gtest/gtest.h>

#include <cmath>
#include <sstream>

#include "diskio/disk_io_report_text.h"
#include "support/run_in_child.h"
#include "zanbase/string_makers.h"

namespace {

char handles[128];
void* At(char handle) { return &handles[static_cast<unsigned char>(handle)]; }

// "o1a" opens handle 1 of file a, "m1a" maps it; r, w, s and c with a handle read 3 bytes, write 5, seek and
// close; { and } push and pop, ! resets, ? asks for a name.
void Play(const std::string& script) {
    std::istringstream words(script);
    for (std::string word; words >> word;) {
        void* const handle = At(word[1]);
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

// Each record as name:opens/closes/seeks, reads and writes as count(bytes)seconds, then the name of handle 1.
std::string State() {
    std::string text;
    for (const auto& [name, use] : *mpoDiskIOFileMap) {
        DiskIOUsage reported;
        HDiskIOAccessFileData(name, &reported.mdReadTime, &reported.mnReadCount, &reported.mnReadSize,
                              &reported.mdWriteTime, &reported.mnWriteCount, &reported.mnWriteSize);
        text +=
            name + MkString(":%u/%u/%u %u(%llu)%g %u(%llu)%g; ", use.mnOpenCount, use.mnCloseCount,
                            use.mnSeekCount, reported.mnReadCount, reported.mnReadSize, reported.mdReadTime,
                            reported.mnWriteCount, reported.mnWriteSize, reported.mdWriteTime);
    }
    return text + "1=" + HDiskIOGetFilename(At('1'));
}

std::string Reports() { return WrittenBy(HDiskIOUsageReport) + WrittenBy(HDiskIOSummaryReport); }

TEST(DiskIO, MakesTheLedgerAtTheFirstCallThatNeedsIt) {
    for (const char* const script : {"o1a", "m1a", "r1", "w1", "s1", "c1", "{", "}", "!", "?1"}) {
        const ChildResult child = RunInChild([script] {
            EXPECT_FALSE(HDiskIOReportFile(stdout, "a"));
            EXPECT_EQ(Reports(), "");
            EXPECT_EQ(mpoDiskIOFileMap, nullptr);
            Play(script);
            EXPECT_NE(mpoDiskIOFileMap, nullptr);
            return testing::Test::HasFailure() ? 1 : 0;
        });
        EXPECT_EQ(child.exit_code, 0) << script << child.out;
    }
}

TEST(DiskIO, RecordsWhatItIsGiven) {
    const char* const cases[][2] = {
        {"o1a s1 r1 r1 w1 c1 r1", "a:1/1/1 3(9)1.5 1(5)0.25; 1=a"},
        {"o1ab r1 o1a\xff r1 r1", "ab:1/0/0 1(3)0.5 0(0)0; a\xff:1/0/0 2(6)1 0(0)0; 1=a\xff"},
        {"o2a r1 w1 s1 c1", "a:1/0/0 0(0)0 0(0)0; 1="},
        {"o2 r1 w1 s1 c1", ":1/1/1 1(3)0.5 1(5)0.25; 1="},  // the empty name has a record
        {"m1a r1 o2a r1", "a:1/0/0 1(3)0.5 0(0)0; 1=a"},
        {"o1a r1 m1b r1", "a:1/0/0 1(3)0.5 0(0)0; 1=b"},
        {"o1a r1 { r1 ! o1b r1 } r1 }", "a:1/0/0 2(6)1 0(0)0; 1=a"},
        {"o1a { o1b { { } } r1", "b:1/0/0 1(3)0.5 0(0)0; 1=b"}};
    for (const auto& [script, state] : cases) {
        Play("! " + std::string(script));
        EXPECT_EQ(State(), state) << script;
    }
}

TEST(DiskIO, CutsTimesAndNeverRounds) {
    std::string text;
    for (const double time : {61.5, 360000.0, 1.999, -3661.5, 2147483648.0, -HUGE_VAL, double{NAN}})
        text += DiskIOTimeText(time) + " ";
    EXPECT_EQ(
        text,
        "00:01:01.50 100:00:00.00 00:00:01.99 -1:-1:-1.-50 596523:14:07.99 -596523:-14:-8.-99 00:00:00.00 ");
}

TEST(DiskIO, Reports) {
    Play("!");
    EXPECT_EQ(Reports(), "");
    Play("o1z c1");
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport), "Disk I/O Usage Report:\n\nNo disk I/O usage to report.\n\n");
    Play("o1x w1 o1b s1 c1");
    for (int i = 0; i < 120; ++i) HDiskIORead(At('1'), 28399, 0.0625);
    EXPECT_EQ(WrittenBy(HDiskIOUsageReport),
              "Disk I/O Usage Report:\n\n"
              "File: x\nOpen  (1): 00:00:01.00\nClose (0): 00:00:00.00\nWrite (1): 00:00:00.25, 5\n\n"
              "File: b\nOpen  (  1): 00:00:01.00\nClose (  1): 00:00:01.00\nSeek  (  1): 00:00:01.00\n"
              "Read  (120): 00:00:07.50, 3.25M\n\n");
    HDiskIOWrite(At('1'), 1ULL << 50, 360000);  // what is too long for its column moves the next
    EXPECT_EQ(WrittenBy(HDiskIOSummaryReport), R"(Disk I/O Summary Report:
 __________________________________________ 
|       |         |             |          |
|       |  Count  |    Time     |   Size   |
|_______|_________|_____________|__________|
|       |         |             |          |
| File  |       3 |             |          |
|       |         |             |          |
| Open  |       3 | 00:00:03.00 |          |
| Close |       2 | 00:00:02.00 |          |
| Seek  |       1 | 00:00:01.00 |          |
| Read  |     120 | 00:00:07.50 |    3.25M |
| Write |       2 |100:00:00.25 |1048576.00G |
|_______|_________|_____________|__________|

)");
}

}  // namespace
