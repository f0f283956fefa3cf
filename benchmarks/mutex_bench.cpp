// The mutex beside the standard library's re-entrant one.
#include <benchmark/benchmark.h>

#include <mutex>

#include "ratios.h"
#include "zanbase/mutex.h"

namespace {

HMutex our_mutex;
std::recursive_mutex std_mutex;

void MutexPair(benchmark::State& state) {
    for (auto _ : state) {
        our_mutex.Lock();
        our_mutex.Unlock();
    }
}
BENCHMARK(MutexPair)->ThreadRange(1, 2)->UseRealTime();

void StdRecursiveMutexPair(benchmark::State& state) {
    for (auto _ : state) {
        std_mutex.lock();
        std_mutex.unlock();
    }
}
BENCHMARK(StdRecursiveMutexPair)->ThreadRange(1, 2)->UseRealTime();

const bool rows =
    AddRatio("MutexPair/real_time/threads:1", "StdRecursiveMutexPair/real_time/threads:1", 0.7) &&
    AddRatio("MutexPair/real_time/threads:2", "StdRecursiveMutexPair/real_time/threads:2", 1.0);

}  // namespace
