// The reports of timers, as whole texts, on a clock of the test's own. There is one instance in a process and
// it reports at exit, so each program runs in a child.
#include "zanbase/global_timer.h"

#include <gtest/gtest.h>

#include <iostream>

#include "platform/clock.h"
#include "support/run_in_child.h"
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

void ReportInOrder() {
    for (const char* const name : {"three", "one", "two", "never", "one"})
        std::cout << Timers().RegisterNewTimer(name) << ' ';
    Spend(0, 3000);
    Spend(2, 2000);
    Spend(1, 1000);
    Timers().Toggle(1);  // runs on over the report
    Timers().Report();
    now_ms += 1000;
    Timers().Toggle(1);
    Spend(4, 1234567890000);
    Timers().Toggle(0);
    Timers().Report();
    Timers().ResetAll();
    Spend(0, 20);  // would stop it first if it were still running
}

// Teams larger than the limit add rows, some of them while other members already use theirs.
void ReportGrowingTeams() {
    OMPSetMaxThreads(2);
    const auto timer = Timers().RegisterNewTimer("timer");
    for (int team = 1; team <= 31; team += 3) {
#pragma omp parallel num_threads(team)
        for (int round = 0; round < 500; ++round) Spend(timer, 2);
    }
}

// Timers are registered while the other members of the team toggle theirs.
void ReportTimersOfATeam() {
#pragma omp parallel num_threads(4)
    for (int round = 0; round < 100; ++round) Spend(Timers().RegisterNewTimer("t"), 2);
}

TEST(GlobalTimer, Reports) {
    std::string four_hundred;
    for (int timer = 0; timer < 400; ++timer) four_hundred += "t: 0.002\n";
    const std::pair<void (*)(), std::string> rows[] = {
        {[] { Timers().RegisterNewTimer("a"), Timers().Report(), std::_Exit(0); }, "a: 0\n"},
        {ReportInOrder,
         "0 1 2 3 4 never: 0\none: 0\none: 1\ntwo: 2\nthree: 3\n"
         "never: 0\none: 2\ntwo: 2\nthree: 3\none: 1.23457e+09\n"
         "one: 0\ntwo: 0\nnever: 0\none: 0\nthree: 0.02\n"},
        {ReportTimersOfATeam, four_hundred},
        {ReportGrowingTeams, "timer: 176\n"}};
    for (const auto& [program, output] : rows) {
        const ChildResult child = RunInChild([&, run = program] { return run(), 0; });
        EXPECT_TRUE(child.exit_code == 0 && child.out == output) << child.out << child.err;
    }
}

}  // namespace
