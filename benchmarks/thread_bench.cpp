// Start and end of a thread, beside the standard library's, and the number of the calling thread.
#include "zanbase/thread.h"

#include <benchmark/benchmark.h>

#include <thread>

#include "placement.h"
#include "ratios.h"

namespace {

struct Nothing : HThread {
    void Run() override {}
};

void ThreadStartAndWait(benchmark::State& state) {
    const OneProcessor one_processor;
    Nothing thread;
    for (auto _ : state) {
        thread.Start(true);
        thread.Wait();
    }
}
BENCHMARK(ThreadStartAndWait)->UseRealTime();

void StdThreadStartAndJoin(benchmark::State& state) {
    const OneProcessor one_processor;
    for (auto _ : state) std::thread([] {}).join();
}
BENCHMARK(StdThreadStartAndJoin)->UseRealTime();

void CurrentThreadId(benchmark::State& state) {
    for (auto _ : state) benchmark::DoNotOptimize(HThread::GetCurrentThreadId());
}
BENCHMARK(CurrentThreadId);

void StdCurrentThreadId(benchmark::State& state) {
    for (auto _ : state) benchmark::DoNotOptimize(std::this_thread::get_id());
}
BENCHMARK(StdCurrentThreadId);

const bool rows = AddRatio("ThreadStartAndWait/real_time", "StdThreadStartAndJoin/real_time", 1.15) &&
                  AddRatio("CurrentThreadId", "StdCurrentThreadId", 0);

}  // namespace
