// A draw beside the standard library's generator of the same sequence.
#include "zanbase/random.h"

#include <benchmark/benchmark.h>

#include <random>

#include "ratios.h"

namespace {

void DrawInt(benchmark::State& state) {
    IMPInitRandom(1);
    for (auto _ : state) benchmark::DoNotOptimize(IMPRandInt());
}
BENCHMARK(DrawInt);

void StdMinimalStandard(benchmark::State& state) {
    static std::minstd_rand0 generator(1);  // one for the process, as ours
    for (auto _ : state) benchmark::DoNotOptimize(generator());
}
BENCHMARK(StdMinimalStandard);

const bool rows = AddRatio("DrawInt", "StdMinimalStandard", 1.2);

}  // namespace
