// What the recording operations leave in the ledger.
#include "zanbase/disk_io.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include "diskio/ledger.h"
#include "support/run_in_child.h"

namespace {

void* At(std::uintptr_t handle) { return reinterpret_cast<void*>(handle); }

// Each record as name:opens/closes/seeks/reads(bytes)/writes(bytes).
std::string Records() {
    const HMutexLock lock(LedgerMutexIfMade());
    std::string text;
    for (const auto& [name, usage] : *mpoDiskIOFileMap)
        text += name + ":" + std::to_string(usage.mnOpenCount) + "/" + std::to_string(usage.mnCloseCount) +
                "/" + std::to_string(usage.mnSeekCount) + "/" + std::to_string(usage.mnReadCount) + "(" +
                std::to_string(usage.mnReadSize) + ")/" + std::to_string(usage.mnWriteCount) + "(" +
                std::to_string(usage.mnWriteSize) + ") ";
    return text;
}

void ReadOneByte(std::uintptr_t handle) { HDiskIORead(At(handle), 1, 0.5); }

// The first two begin without a ledger, so they come before the others.
TEST(DiskIO, MakesTheLedgerAtTheFirstCallThatNeedsIt) {
    void (*const calls[])() = {[] { HDiskIOOpen("a", At(1), 1); },
                               [] { HDiskIOClose(At(1), 1); },
                               [] { HDiskIOSeek(At(1), 1); },
                               [] { HDiskIORead(At(1), 1, 1); },
                               [] { HDiskIOWrite(At(1), 1, 1); },
                               [] { _HDiskIOMapFD("a", At(1)); },
                               [] { HDiskIOReset(); },
                               [] { HDiskIOPop(); },
                               [] {
                                   HDiskIOPush();
                                   HDiskIOPop();
                               },
                               [] { EXPECT_EQ(HDiskIOGetFilename(At(1)), ""); }};
    for (const auto& call : calls) {
        const ChildResult child = RunInChild([call] {
            EXPECT_FALSE(HDiskIOAccessFileData("a", nullptr, nullptr, nullptr, nullptr, nullptr, nullptr));
            EXPECT_FALSE(HDiskIOReportFile(stdout, "a"));
            HDiskIOSummaryReport(stdout);
            HDiskIOUsageReport(stdout);
            EXPECT_EQ(LedgerMutexIfMade(), nullptr);
            call();
            EXPECT_NE(LedgerMutexIfMade(), nullptr);
            EXPECT_LE(mpoDiskIOFileMap->size(), 1U);
            EXPECT_TRUE(mpoDiskIOStack->empty());
            return testing::Test::HasFailure() ? 1 : 0;
        });
        EXPECT_EQ(child.exit_code, 0) << child.out;
        EXPECT_EQ(child.out, "");
    }
}

// Threads that meet at the first call share one ledger, and every later update is whole.
TEST(DiskIO, CountsWhatManyThreadsRecord) {
    const ChildResult child = RunInChild([] {
        constexpr unsigned int kThreads = 4;
        constexpr unsigned int kRounds = 2000;
        std::atomic<unsigned int> ready{0};
        std::vector<std::thread> threads;
        for (std::uintptr_t thread = 0; thread < kThreads; ++thread) {
            threads.emplace_back([&, thread] {
                ++ready;
                while (ready < kThreads) std::this_thread::yield();
                HDiskIOOpen("shared", At(thread), 1);
                for (unsigned int round = 0; round < kRounds; ++round) {
                    HDiskIORead(At(thread), 3, 1);
                    HDiskIOOpen("own" + std::to_string(thread), At(100 + thread), 1);
                    HDiskIOWrite(At(100 + thread), 1, 1);
                }
            });
        }
        for (std::thread& thread : threads) thread.join();
        EXPECT_EQ(
            Records(),
            "own0:2000/0/0/0(0)/2000(2000) own1:2000/0/0/0(0)/2000(2000) "
            "own2:2000/0/0/0(0)/2000(2000) own3:2000/0/0/0(0)/2000(2000) shared:4/0/0/8000(24000)/0(0) ");
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.out;
}

TEST(DiskIO, TellsReadsAndWritesOfARecord) {
    HDiskIOReset();
    HDiskIOOpen("a", At(1), 9);
    HDiskIORead(At(1), 10, 0.25);
    HDiskIORead(At(1), 20, 0.5);
    HDiskIOWrite(At(1), 5, 2);
    double read_time = -1;
    double write_time = -1;
    unsigned int reads = 0;
    unsigned int writes = 0;
    unsigned long long read_size = 0;
    unsigned long long write_size = 0;
    EXPECT_FALSE(
        HDiskIOAccessFileData("A", &read_time, &reads, &read_size, &write_time, &writes, &write_size));
    EXPECT_EQ(read_time, -1);
    EXPECT_TRUE(
        HDiskIOAccessFileData("a", &read_time, &reads, &read_size, &write_time, &writes, &write_size));
    EXPECT_EQ(std::make_tuple(read_time, reads, read_size), std::make_tuple(0.75, 2U, 30ULL));
    EXPECT_EQ(std::make_tuple(write_time, writes, write_size), std::make_tuple(2.0, 1U, 5ULL));
    EXPECT_TRUE(HDiskIOAccessFileData("a", nullptr, nullptr, nullptr, nullptr, nullptr, nullptr));
    EXPECT_FALSE(HDiskIOAccessFileData("b", nullptr, nullptr, nullptr, nullptr, nullptr, nullptr));
}

struct Case {
    const char* name;
    void (*run)();
    const char* records;
    const char* name_of_handle_1;
};

class Ledger : public testing::TestWithParam<Case> {};

TEST_P(Ledger, HoldsWhatIsTold) {
    do {
        HDiskIOPop();  // what an earlier test saved
    } while (!mpoDiskIOStack->empty());
    HDiskIOReset();
    GetParam().run();
    EXPECT_EQ(Records(), GetParam().records);
    EXPECT_EQ(HDiskIOGetFilename(At(1)), GetParam().name_of_handle_1);
}

const Case kCases[] = {
    {"EachOperation",
     [] {
         HDiskIOOpen("a", At(1), 1);
         HDiskIOSeek(At(1), 1);
         HDiskIORead(At(1), 10, 1);
         HDiskIORead(At(1), 0, 1);
         HDiskIOWrite(At(1), 1ULL << 40, 1);
         HDiskIOClose(At(1), 1);
         ReadOneByte(1);  // still bound
     },
     "a:1/1/1/3(11)/1(1099511627776) ", "a"},
    {"TwoHandlesOfOneName",
     [] {
         HDiskIOOpen("a", At(1), 1);
         HDiskIOOpen("a", At(2), 1);
         ReadOneByte(1);
         ReadOneByte(2);
     },
     "a:2/0/0/2(2)/0(0) ", "a"},
    {"HandleBoundAnew",
     [] {
         HDiskIOOpen("a", At(1), 1);
         ReadOneByte(1);
         HDiskIOOpen("A", At(1), 1);
         ReadOneByte(1);
         ReadOneByte(1);
     },
     "A:1/0/0/2(2)/0(0) a:1/0/0/1(1)/0(0) ", "A"},
    {"UnknownHandle",
     [] {
         HDiskIOOpen("a", At(2), 1);
         ReadOneByte(1);
         HDiskIOClose(At(1), 1);
         HDiskIOSeek(At(1), 1);
         HDiskIOWrite(At(1), 1, 1);
     },
     "a:1/0/0/0(0)/0(0) ", ""},
    {"UnknownHandleAndARecordOfTheEmptyName",
     [] {
         HDiskIOOpen("", At(2), 1);
         ReadOneByte(1);
         ReadOneByte(2);
     },
     ":1/0/0/2(2)/0(0) ", ""},
    {"MappedBeforeTheRecord",
     [] {
         _HDiskIOMapFD("a", At(1));
         ReadOneByte(1);
         HDiskIOOpen("a", At(2), 1);
         ReadOneByte(1);
     },
     "a:1/0/0/1(1)/0(0) ", "a"},
    {"MappedAwayFromARecord",
     [] {
         HDiskIOOpen("a", At(1), 1);
         _HDiskIOMapFD("b", At(1));
         ReadOneByte(1);
     },
     "a:1/0/0/0(0)/0(0) ", "b"},
    {"PushStartsEmpty",
     [] {
         HDiskIOOpen("a", At(1), 1);
         HDiskIOPush();
         ReadOneByte(1);
     },
     "", ""},
    {"PopBringsBack",
     [] {
         HDiskIOOpen("a", At(1), 1);
         HDiskIOPush();
         ReadOneByte(1);
         HDiskIOOpen("b", At(1), 1);
         HDiskIOReset();
         HDiskIOPop();
         ReadOneByte(1);
         HDiskIOPop();  // nothing saved any more
     },
     "a:1/0/0/1(1)/0(0) ", "a"},
    {"PopsInReverse",
     [] {
         HDiskIOOpen("a", At(1), 1);
         HDiskIOPush();
         HDiskIOOpen("b", At(1), 1);
         HDiskIOPush();
         HDiskIOPush();
         HDiskIOPop();
         HDiskIOPop();
         ReadOneByte(1);
     },
     "b:1/0/0/1(1)/0(0) ", "b"},
    {"NamesAsUnsignedBytes",
     [] {
         for (const char* name : {"a\xff", "ab", "a", "B"}) HDiskIOOpen(name, At(1), 1);
     },
     "B:1/0/0/0(0)/0(0) a:1/0/0/0(0)/0(0) ab:1/0/0/0(0)/0(0) a\xff:1/0/0/0(0)/0(0) ", "B"},
};

INSTANTIATE_TEST_SUITE_P(All, Ledger, testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

}  // namespace
