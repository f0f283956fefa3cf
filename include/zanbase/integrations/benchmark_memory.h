/// @file
/// Shows in the results of Google Benchmark what the tracker recorded. Requires Google Benchmark (1.7 or later).
///
///     int main(int argc, char** argv) {
///         benchmark::Initialize(&argc, argv);
///         HBenchmarkMemory memory;
///         benchmark::RegisterMemoryManager(&memory);
///         benchmark::RunSpecifiedBenchmarks();
///         benchmark::RegisterMemoryManager(nullptr);
///     }
#ifndef ZANBASE_INTEGRATIONS_BENCHMARK_MEMORY_H
#define ZANBASE_INTEGRATIONS_BENCHMARK_MEMORY_H

#include <optional>

#include <benchmark/benchmark.h>

#include "zanbase/account_data.h"
#include "zanbase/snapshot.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// Measures the run that Google Benchmark makes for the memory of each benchmark: allocations, the peak, the bytes
/// allocated and the growth. Restarts the tracker's peak for that time, as `HMemoryBudget`. Not thread-safe: Google Benchmark
/// calls it on one thread.
class HBenchmarkMemory : public benchmark::MemoryManager {
public:
    /// Starts to measure.
    void Start() override {
        moStart = HMemorySnapshot::Take();
        mnOldPeak = HRestartMemoryPeak(&mnStartTotal);
    }

    /// Stops, and fills in the result.
    void Stop(Result& result) override {
        const HMemorySnapshot now = HMemorySnapshot::Take();
        const HMemorySnapshot::Row total = now.Since(moStart).Total();
        HRaiseMemoryPeak(mnOldPeak);
        result.num_allocs = total.mnAllocCount;
        result.max_bytes_used = now.mnPeak - mnStartTotal;
        result.total_allocated_bytes = total.mnAllocated;
        result.net_heap_growth = now.mnTotal - mnStartTotal;
    }

    /// The same, as older versions call it. `result` is not null.
    void Stop(Result* result) override { Stop(*result); }

private:
    HMemorySnapshot moStart;
    long long mnStartTotal = 0;  // bytes live at the start
    long long mnOldPeak = 0;     // of the tracker, at the start
};

ZANBASE_MODE_END

/// @}

#endif
