// The reports of timers, as whole texts, on a clock of the test's own. There is one instance in a process and
// it reports at exit, so each test runs in a child.
#include "zanbase/global_timer.h"

#include <gmock/gmock.h>

#include <atomic>
#include <iostream>
#include <new>
#include <string>

#include "platform/clock.h"
#include "support/run_in_child.h"
#include "zanbase/openmp.h"

namespace {

thread_local long long now_ms = 0;
std::atomic<int> allocations{0};
std::atomic<int> failing_allocation{0};  // the number, from 1, of the one that fails; 0: none

void CountAllocation() {
    if (++allocations == failing_allocation) throw std::bad_alloc();
}

GlobalTimer& Timers() { return GlobalTimer::GetInstance(); }

void Spend(unsigned long long timer, long long ms) {
    Timers().Toggle(timer);
    now_ms += ms;
    Timers().Toggle(timer);
}

std::string ReportsOf(void (*body)()) {
    const ChildResult child = RunInChild([=] { return body(), 0; });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    return child.out;
}

}  // namespace

extern "C" {
WallClock __wrap__Z13ReadWallClockv() { return {now_ms / 1000, static_cast<unsigned short>(now_ms % 1000)}; }
void* __real__Znwm(std::size_t size);
void* __real__ZnwmSt11align_val_t(std::size_t size, std::align_val_t alignment);
void* __wrap__Znwm(std::size_t size) { return CountAllocation(), __real__Znwm(size); }
void* __wrap__ZnwmSt11align_val_t(std::size_t size, std::align_val_t alignment) {
    return CountAllocation(), __real__ZnwmSt11align_val_t(size, alignment);
}
}

namespace {

TEST(GlobalTimer, ReportsAtExitOnlyWhatIsThere) {
    EXPECT_EQ(ReportsOf([] {}), "");
    EXPECT_EQ(ReportsOf([] { Timers().Report(); }), "");
    EXPECT_EQ(ReportsOf([] { Timers().RegisterNewTimer("idle"); }), "idle: 0\n");
}

TEST(GlobalTimer, ReportsFinishedIntervalsFromTheSmallestTotal) {
    const std::string out = ReportsOf([] {
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
    });
    EXPECT_EQ(out,
              "0 1 2 3 4 never: 0\none: 0\none: 1\ntwo: 2\nthree: 3\n"
              "never: 0\ntwo: 2\none: 2.5\nthree: 3\none: 1.23457e+09\n");
}

TEST(GlobalTimer, StopsAndClearsEverythingOnReset) {
    const std::string out = ReportsOf([] {
        const auto ran = Timers().RegisterNewTimer("ran");
        const auto runs = Timers().RegisterNewTimer("runs");
        Spend(ran, 100);
        Timers().Toggle(runs);
        Timers().ResetAll();
        Timers().Report();
        now_ms += 100;
        Spend(runs, 20);  // starts it: it would have stopped a running one
    });
    EXPECT_EQ(out, "ran: 0\nruns: 0\nran: 0\nruns: 0.02\n");
}

TEST(GlobalTimer, LeavesTheNumberFormatToTheStream) {
    const std::string out = ReportsOf([] {
        const auto back = Timers().RegisterNewTimer("back");
        now_ms = 1000;
        Spend(back, -1);  // modulo 2^64
        Timers().Report();
        std::cout.precision(2);
        std::cout << std::fixed;
    });
    EXPECT_EQ(out, "back: 1.84467e+13\nback: 18446744073709.55\n");
}

// Teams larger than the limit add rows, some of them while other members already use theirs.
TEST(GlobalTimer, AddsUpThreadsOfGrowingTeams) {
    const std::string out = ReportsOf([] {
        OMPSetMaxThreads(2);
        const auto first = Timers().RegisterNewTimer("first");
        for (int team = 1; team <= 31; team += 3) {
#pragma omp parallel num_threads(team)
            for (int round = 0; round < 500; ++round) Spend(first, 2);
        }
        const auto second = Timers().RegisterNewTimer("second");
#pragma omp parallel num_threads(8)
        if (OMPGetThreadNum() % 3 == 0) {  // rows 0, 3 and 6
            const int before = allocations;
            Spend(second, 250);
            if (allocations != before) std::cout << "allocates in use\n";
        }
    });
    EXPECT_EQ(out, "second: 0.75\nfirst: 176\n");
}

TEST(GlobalTimer, StaysWholeWhenMemoryRunsOutAnywhere) {
    const std::string out = ReportsOf([] {
        OMPSetMaxThreads(2);
        int refused = 0;
        // Repeats `step` with the first, the second, … of its allocations failing, until it gets through.
        const auto insist = [&refused](const auto& step) {
            for (int failing = 1;; ++failing) {
                allocations = 0;
                failing_allocation = failing;
                try {
                    step();
                    failing_allocation = 0;
                    return;
                } catch (const std::bad_alloc&) {
                    failing_allocation = 0;
                    ++refused;
                }
            }
        };
        insist([] { Timers(); });
        for (int timer = 0; timer < 10; ++timer) insist([] { Spend(Timers().RegisterNewTimer("timer"), 1); });
#pragma omp parallel num_threads(3)
        {
#pragma omp critical
            if (OMPGetThreadNum() == 2) insist([] { Spend(9, 1000); });
        }
        insist([] { Spend(Timers().RegisterNewTimer("late"), 3000); });
        insist([] { Timers().ResetAll(); });
#pragma omp parallel num_threads(3)
        for (unsigned long long timer = 0; timer < 11; ++timer) Spend(timer, 1);
        if (refused < 10) std::cout << "few refusals: " << refused << '\n';
    });
    std::string expected;
    for (int timer = 0; timer < 10; ++timer) expected += "timer: 0.003\n";
    EXPECT_EQ(out, expected + "late: 0.003\n");
}

struct SaysGoodbye {
    ~SaysGoodbye() { std::cout << "goodbye\n"; }
};

TEST(GlobalTimer, ReportsBetweenTheObjectsBuiltBeforeAndAfterIt) {
    const std::string out = ReportsOf([] {
        static const SaysGoodbye before;
        Timers().RegisterNewTimer("timer");
        static const SaysGoodbye after;
        std::exit(0);
    });
    EXPECT_EQ(out, "goodbye\ntimer: 0\ngoodbye\n");
}

}  // namespace
