// Timed regions on a clock of the test's own: recursion, threads of any kind, and what snapshots see meanwhile.
#include "zanbase/adapters/scope_timer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "platform/clock.h"
#include "support/run_in_child.h"
#include "zanbase/semaphore.h"
#include "zanbase/snapshot.h"

static thread_local long long now_ms = 1000;  // 1 s, so that no interval begins at 0

WallClock ReadWallClock() noexcept { return {now_ms / 1000, static_cast<unsigned short>(now_ms % 1000)}; }
unsigned int ReadTicks() noexcept { return 0; }
void SleepFor(unsigned int) noexcept {}

namespace {

GlobalTimerSnapshot::Row RowOf(const char* name) {
    const GlobalTimerSnapshot timers = GlobalTimerSnapshot::Take();
    const auto* const row = timers.Find(name);
    return row != nullptr ? *row : GlobalTimerSnapshot::Row();
}

void Recurse(int depth) {
    HTimedRegion("recursive");
    now_ms += 100;
    if (depth > 1) Recurse(depth - 1);
}

TEST(TimedRegion, CountsRecursionOnce) {
    Recurse(3);
    EXPECT_DOUBLE_EQ(RowOf("recursive").mdSeconds, 0.3);
}

// All of them have OpenMP number 0, and are in the region at the same time.
TEST(TimedRegion, AddsUpThreadsThatOpenMPDoesNotKnow) {
    HSemaphore entered(0), leave(0);
    const auto work = [&] {
        HTimedRegion("threads");
        now_ms += 40;
        entered.Unlock();
        leave.Lock();
    };
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread) threads.emplace_back(work);
    for (int thread = 0; thread < 4; ++thread) entered.Lock();
    for (int thread = 0; thread < 4; ++thread) leave.Unlock();
    for (std::thread& thread : threads) thread.join();
    const GlobalTimerSnapshot::Row row = RowOf("threads");
    EXPECT_DOUBLE_EQ(row.mdSeconds, 0.16);
    EXPECT_DOUBLE_EQ(row.maThreadSeconds.at(0), 0.16);
}

TEST(TimedRegion, ShowsOpenIntervalsApart) {
    const unsigned long long id = HTimerNamed("open");
    {
        const HTimerScope region(id);
        now_ms += 250;
        EXPECT_DOUBLE_EQ(RowOf("open").mdOpenSeconds, 0.25);
        EXPECT_EQ(RowOf("open").mdSeconds, 0);
        GlobalTimer::GetInstance().ResetAll();  // drops the open interval
        EXPECT_EQ(RowOf("open").mdOpenSeconds, 0);
    }
    EXPECT_EQ(RowOf("open").mdSeconds, 0);
    GlobalTimer::GetInstance().Toggle(id);
    now_ms += 500;
    EXPECT_DOUBLE_EQ(RowOf("open").mdOpenSeconds, 0.5);
    GlobalTimer::GetInstance().Toggle(id);
    EXPECT_EQ(RowOf("open").mdOpenSeconds, 0);
    EXPECT_DOUBLE_EQ(RowOf("open").mdSeconds, 0.5);
}

// A thread that ends leaves its row to the next one: the sums stay, and other snapshots than the last are torn in no way.
TEST(TimedRegion, IsReadWhileThreadsComeAndGo) {
    std::thread reader([] {
        double before = 0;
        for (int times = 0; times < 2000; ++times) {
            const double seconds = RowOf("churn").mdSeconds;
            EXPECT_GE(seconds, before);
            before = seconds;
        }
    });
    for (int thread = 0; thread < 200; ++thread) {
        std::thread([] {
            HTimedRegion("churn");
            now_ms += 1;
        }).join();
    }
    reader.join();
    EXPECT_NEAR(RowOf("churn").mdSeconds, 0.2, 1e-9);
}

TEST(TimedRegion, IsReportedAtExitUnlessThatIsUnwanted) {
    for (const bool is_wanted : {true, false}) {
        const ChildResult child = RunInChild([is_wanted] {
            {
                HTimedRegion("work");
                now_ms += 1500;
            }
            HReportTimersAtExit(is_wanted);
            return 0;
        });
        EXPECT_THAT(child.out, testing::EndsWith(is_wanted ? "work: 1.5\n" : ""));
        EXPECT_EQ(child.out.empty(), !is_wanted);
    }
}

}  // namespace
