// The reports of timers, as whole texts, on a clock of the test's own. There is one instance in a process and
// it reports at exit, so each program runs in a child.
#include "zanbase/global_timer.h"

#include <gtest/gtest.h>

#include <iostream>
#include <thread>

#include "platform/clock.h"
#include "support/run_in_child.h"
#include "timing/row_table.h"
#include "zanbase/openmp.h"

static thread_local long long now_ms = 0;

WallClock ReadWallClock() noexcept { return {now_ms / 1000, static_cast<unsigned short>(now_ms % 1000)}; }
unsigned int ReadTicks() noexcept { return 0; }
void SleepFor(unsigned int) noexcept {}

namespace {

GlobalTimer& Timers() { return GlobalTimer::GetInstance(); }

void Spend(unsigned long long timer, long long ms) {
    Timers().Toggle(timer);
    now_ms += ms;
    Timers().Toggle(timer);
}

// What the program and then its exit print.
std::string OutputOf(void (*program)()) {
    const ChildResult child = RunInChild([program] {
        program();
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    return child.out;
}

TEST(GlobalTimer, OrdersTimersByTotalAndReportsAgainAtExit) {
    const std::string output = OutputOf([] {
        unsigned long long id = 0;
        for (const char* const name : {"three", "one", "two", "never", "one"})
            EXPECT_EQ(Timers().RegisterNewTimer(name), id++);
        Spend(0, 3000);
        Spend(1, 1000);
        Spend(2, 2000);
        Spend(4, 1234567890000);
        Timers().Report();
    });
    EXPECT_EQ(output,
              "never: 0\none: 1\ntwo: 2\nthree: 3\none: 1.23457e+09\n"
              "never: 0\none: 1\ntwo: 2\nthree: 3\none: 1.23457e+09\n");
}

TEST(GlobalTimer, OrdersTimersWhoseSecondsAreEqual) {
    const std::string output = OutputOf([] {
        for (const char* const name : {"more", "less"}) Timers().RegisterNewTimer(name);
        Spend(0, 18446744073709004);
        Spend(1, 18446744073709002);
    });
    EXPECT_EQ(output, "less: 1.84467e+13\nmore: 1.84467e+13\n");
}

// The mutex stays held, as by a thread that was killed while it added rows.
TEST(GlobalTimer, NeedsItsMutexForNewRowsOnly) {
    const std::string output = OutputOf([] {
        std::thread([] { goTimerGrowthMutex.Lock(); }).join();
        Spend(Timers().RegisterNewTimer("timer"), 1000);
        Timers().ResetAll();
    });
    EXPECT_EQ(output, "timer: 0\n");
}

// Teams larger than the limit add rows, some of them while other members already use theirs.
TEST(GlobalTimer, AddsUpOverGrowingTeams) {
    const std::string output = OutputOf([] {
        OMPSetMaxThreads(2);
        const auto timer = Timers().RegisterNewTimer("timer");
        for (int team = 1; team <= 31; team += 3) {
#pragma omp parallel num_threads(team)
            for (int round = 0; round < 500; ++round) Spend(timer, 2);
        }
    });
    EXPECT_EQ(output, "timer: 176\n");
}

}  // namespace
