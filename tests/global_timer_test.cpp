// The reports of timers, as whole texts, on a clock of the test's own. There is one instance in a process and
// it reports at exit, so each test runs in a child.
#include "zanbase/global_timer.h"

#include <gtest/gtest.h>

#include <iostream>

#include "platform/clock.h"
#include "support/failing_new.h"
#include "support/run_in_child.h"
#include "zanbase/openmp.h"

namespace {

thread_local long long now_ms = 0;

GlobalTimer& Timers() { return GlobalTimer::GetInstance(); }

void Spend(unsigned long long timer, long long ms) {
    Timers().Toggle(timer);
    now_ms += ms;
    Timers().Toggle(timer);
}

}  // namespace

extern "C" WallClock __wrap__Z13ReadWallClockv() {
    return {now_ms / 1000, static_cast<unsigned short>(now_ms % 1000)};
}

namespace {

void ReportInOrder() {
    for (const char* const name : {"three", "one", "two", "never", "one"})
        std::cout << Timers().RegisterNewTimer(name) << ' ';
    Spend(0, 3000);
    Spend(1, 1000);
    Spend(2, 2000);
    Timers().Toggle(1);  // runs on over the report
    now_ms += 500;
    Timers().Report();
    now_ms += 1000;
    Timers().Toggle(1);
    Spend(4, 1234567890000);
    Timers().Toggle(0);
    Timers().Report();
    Timers().ResetAll();
    Spend(0, 20);  // would stop it first if it were still running
    Spend(2, -1);  // modulo 2^64
    std::cout << std::fixed;
}

// Teams larger than the limit add rows, some of them while other members already use theirs.
void ReportGrowingTeams() {
    OMPSetMaxThreads(2);
    const auto first = Timers().RegisterNewTimer("first");
    for (int team = 1; team <= 31; team += 3) {
#pragma omp parallel num_threads(team)
        for (int round = 0; round < 500; ++round) Spend(first, 2);
    }
    const auto second = Timers().RegisterNewTimer("second");
#pragma omp parallel num_threads(8)
    if (OMPGetThreadNum() % 3 == 0) Spend(second, 250);  // rows 0, 3 and 6
}

void ReportAfterShortages() {
    int failures = 0;
    const auto insist = [&](auto step) { failures += FailAtEachNew(step, [] {}); };
    const auto add = [] { Timers().RegisterNewTimer("timer"); };
    OMPSetMaxThreads(1);
    for (int timer = 0; timer < 9; ++timer) insist(add);
#pragma omp parallel num_threads(3)
    if (OMPGetThreadNum() == 2) insist([] { Spend(8, 1000); });
    insist(add);
#pragma omp parallel num_threads(3)
    for (unsigned long long timer = 0; timer < 10; ++timer) Spend(timer, timer < 8 ? 0 : 1000);
    if (failures < 20) std::cout << "few failures: " << failures << '\n';
}

TEST(GlobalTimer, Reports) {
    std::string idle;
    for (int timer = 0; timer < 8; ++timer) idle += "timer: 0\n";
    const struct {
        void (*program)();
        std::string output;
    } rows[] = {
        {[] {}, ""},
        {[] { Timers().Report(), Timers().RegisterNewTimer("a"), Timers().Report(), std::_Exit(0); },
         "a: 0\n"},
        {ReportInOrder,
         "0 1 2 3 4 never: 0\none: 0\none: 1\ntwo: 2\nthree: 3\n"
         "never: 0\ntwo: 2\none: 2.5\nthree: 3\none: 1.23457e+09\n"
         "one: 0.000000\nnever: 0.000000\none: 0.000000\nthree: 0.020000\ntwo: 18446744073709.550781\n"},
        {ReportAfterShortages, idle + "timer: 3\ntimer: 4\n"},
        {ReportGrowingTeams, "second: 0.75\nfirst: 176\n"},
    };
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] { return row.program(), 0; });
        EXPECT_EQ(child.out, row.output) << child.err;
        EXPECT_EQ(child.exit_code, 0);
    }
}

}  // namespace
