// A pair of toggles beside the two clock readings that it requires, and how it scales over a team.
#include "zanbase/global_timer.h"

#include <benchmark/benchmark.h>

#include <chrono>

#include "ratios.h"

namespace {

constexpr int kPairs = 20000;  // enough for the cost of opening a team to vanish

unsigned long long Timer() {
    static const unsigned long long timer = GlobalTimer::GetInstance().RegisterNewTimer("benchmark");
    return timer;
}

// Each thread of a team makes kPairs pairs; ideal scaling takes the same time for every size of the team.
template <class Pair>
void RunInTeam(benchmark::State& state, Pair pair) {
    const int threads = static_cast<int>(state.range(0));
    for (auto _ : state) {
#pragma omp parallel num_threads(threads)
        for (int count = 0; count < kPairs; ++count) pair();
    }
}

void TogglePair(benchmark::State& state) {
    GlobalTimer& timers = GlobalTimer::GetInstance();
    const unsigned long long timer = Timer();
    RunInTeam(state, [&timers, timer] {
        timers.Toggle(timer);
        timers.Toggle(timer);
    });
}
BENCHMARK(TogglePair)->RangeMultiplier(2)->Range(1, 4)->UseRealTime();

void TwoSystemClocks(benchmark::State& state) {
    RunInTeam(state, [] {
        benchmark::DoNotOptimize(std::chrono::system_clock::now());
        benchmark::DoNotOptimize(std::chrono::system_clock::now());
    });
}
BENCHMARK(TwoSystemClocks)->RangeMultiplier(2)->Range(1, 4)->UseRealTime();

const bool rows = AddRatio("TogglePair/1/real_time", "TwoSystemClocks/1/real_time", 1.3) &&
                  AddRatio("TogglePair/2/real_time", "TwoSystemClocks/2/real_time", 0) &&
                  AddRatio("TogglePair/4/real_time", "TwoSystemClocks/4/real_time", 0) &&
                  AddRatio("TogglePair/2/real_time", "TogglePair/1/real_time", 0) &&
                  AddRatio("TogglePair/4/real_time", "TogglePair/1/real_time", 0);

}  // namespace
