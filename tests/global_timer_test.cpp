// The reports of timers, as whole texts, on a clock of the test's own. There is one instance in a process and
// it reports at exit, so each test runs in a child.
#include "zanbase/global_timer.h"

#include <gtest/gtest.h>

#include <atomic>
#include <iostream>
#include <new>

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
}

void ReportAfterReset() {
    const auto ran = Timers().RegisterNewTimer("ran"), runs = Timers().RegisterNewTimer("runs");
    Spend(ran, 100);
    Timers().Toggle(runs);
    Timers().ResetAll();
    Timers().Report();
    Spend(runs, 20);  // would stop it first if it were running
    Spend(ran, -1);   // modulo 2^64
    std::cout << std::fixed;
}

struct SaysGoodbye {
    ~SaysGoodbye() { std::cout << "goodbye\n"; }
};

void ReportAmongStaticObjects() {
    static const SaysGoodbye before;
    Timers().RegisterNewTimer("timer");
    static const SaysGoodbye after;
    std::exit(0);
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
    const int before = allocations;
#pragma omp parallel num_threads(8)
    if (OMPGetThreadNum() % 3 == 0) Spend(second, 250);  // rows 0, 3 and 6
    if (allocations != before) std::cout << "allocates in use\n";
}

// Repeats `step` with the first, the second, … of its allocations failing, until it gets through.
template <class Step>
int Insist(Step step) {
    for (int failing = 1;; ++failing) {
        allocations = 0;
        failing_allocation = failing;
        try {
            step();
            failing_allocation = 0;
            return failing - 1;
        } catch (const std::bad_alloc&) {
        }
    }
}

void ReportAfterShortages() {
    OMPSetMaxThreads(2);
    int refused = Insist(Timers);
    for (int timer = 0; timer < 9; ++timer) refused += Insist([] { Timers().RegisterNewTimer("timer"); });
#pragma omp parallel num_threads(3)
    if (OMPGetThreadNum() == 2) refused += Insist([] { Spend(8, 1000); });
    refused += Insist([] { Spend(Timers().RegisterNewTimer("late"), 1000); });
#pragma omp parallel num_threads(3)
    for (unsigned long long timer = 0; timer < 10; ++timer) Spend(timer, timer < 8 ? 0 : 1000);
    if (refused < 20) std::cout << "few refusals: " << refused << '\n';
}

TEST(GlobalTimer, Reports) {
    std::string idle;
    for (int timer = 0; timer < 8; ++timer) idle += "timer: 0\n";
    const struct {
        void (*program)();
        std::string output;
    } rows[] = {
        {[] {}, ""},
        {[] { Timers().Report(); }, ""},
        {ReportInOrder,
         "0 1 2 3 4 never: 0\none: 0\none: 1\ntwo: 2\nthree: 3\n"
         "never: 0\ntwo: 2\none: 2.5\nthree: 3\none: 1.23457e+09\n"},
        {ReportAfterReset, "ran: 0\nruns: 0\nruns: 0.020000\nran: 18446744073709.550781\n"},
        {ReportAmongStaticObjects, "goodbye\ntimer: 0\ngoodbye\n"},
        {ReportGrowingTeams, "second: 0.75\nfirst: 176\n"},
        {ReportAfterShortages, idle + "timer: 4\nlate: 4\n"},
    };
    for (const auto& row : rows) {
        const ChildResult child = RunInChild([&] { return row.program(), 0; });
        EXPECT_EQ(child.out, row.output) << child.err;
        EXPECT_EQ(child.exit_code, 0);
    }
}

}  // namespace
