// The thread number and the limit beside the runtime's own calls.
#include "zanbase/openmp.h"

#include <benchmark/benchmark.h>
#include <omp.h>

#include "ratios.h"

namespace {

template <int (*kCall)()>
void AskOpenMP(benchmark::State& state) {
    for (auto _ : state) benchmark::DoNotOptimize(kCall());
}
BENCHMARK(AskOpenMP<OMPGetThreadNum>)->Name("OurThreadNum");
BENCHMARK(AskOpenMP<omp_get_thread_num>)->Name("RuntimeThreadNum");
BENCHMARK(AskOpenMP<OMPGetMaxThreads>)->Name("OurMaxThreads");
BENCHMARK(AskOpenMP<omp_get_max_threads>)->Name("RuntimeMaxThreads");

const bool rows =
    AddRatio("OurThreadNum", "RuntimeThreadNum", 1.6) && AddRatio("OurMaxThreads", "RuntimeMaxThreads", 0);

}  // namespace
