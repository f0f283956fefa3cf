// A clock reading beside the standard one.
#include "zanbase/clock.h"

#include <benchmark/benchmark.h>

#include <chrono>

#include "ratios.h"

namespace {

void ReadMicroSeconds(benchmark::State& state) {
    for (auto _ : state) benchmark::DoNotOptimize(GetMicroSeconds());
}
BENCHMARK(ReadMicroSeconds);

void StdSystemClock(benchmark::State& state) {
    for (auto _ : state) benchmark::DoNotOptimize(std::chrono::system_clock::now());
}
BENCHMARK(StdSystemClock);

const bool rows = AddRatio("ReadMicroSeconds", "StdSystemClock", 1.3);

}  // namespace
