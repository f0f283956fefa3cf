// The mutex beside the critical section that it is made of.
#include <benchmark/benchmark.h>

#include <windows.h>

#include "../ratios.h"
#include "zanbase/mutex.h"

namespace {

void MutexPair(benchmark::State& state) {
    const HMutex mutex;
    for (auto _ : state) {
        mutex.Lock();
        mutex.Unlock();
    }
}
BENCHMARK(MutexPair);

void CriticalSectionPair(benchmark::State& state) {
    CRITICAL_SECTION section;
    InitializeCriticalSection(&section);
    for (auto _ : state) {
        EnterCriticalSection(&section);
        LeaveCriticalSection(&section);
    }
    DeleteCriticalSection(&section);
}
BENCHMARK(CriticalSectionPair);

const bool rows = AddRatio("MutexPair", "CriticalSectionPair", 1.1);

}  // namespace
