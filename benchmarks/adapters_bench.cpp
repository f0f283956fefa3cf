// The adapters beside feeding by hand.
#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdlib>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "ratios.h"
#include "zanbase/adapters/recorded_file.h"
#include "zanbase/adapters/scope_timer.h"
#include "zanbase/adapters/tracked_memory.h"

namespace {

// A resource over malloc, and one that feeds the tracker by hand.
template <bool kFeeds>
class MallocResource : public std::pmr::memory_resource {
    void* do_allocate(std::size_t bytes, std::size_t) override {
        void* const block = std::malloc(bytes);
        if constexpr (kFeeds) HMemory::Alloc(block, bytes, __FILE__, __LINE__);
        return block;
    }
    void do_deallocate(void* block, std::size_t, std::size_t) override {
        if constexpr (kFeeds) HMemory::Free(block);
        std::free(block);
    }
    bool do_is_equal(const memory_resource& other) const noexcept override { return this == &other; }
};

// A vector grows to 100 numbers, through eight blocks, and shrinks again.
template <class Vector>
void PushAndPop(Vector numbers) {
    for (int number = 0; number < 100; ++number) numbers.push_back(number);
    benchmark::DoNotOptimize(numbers.back());
    for (int number = 0; number < 100; ++number) numbers.pop_back();
}

void TrackedVector(benchmark::State& state) {
    MallocResource<false> heap;
    HTrackedResource memory(&heap);
    for (auto _ : state) PushAndPop(std::pmr::vector<int>(&memory));
    HMemory::Reset();
}

void TrackedAllocatorVector(benchmark::State& state) {
    for (auto _ : state) PushAndPop(std::vector<int, HTrackedAllocator<int>>(HCallSite::Here()));
    HMemory::Reset();
}

void VectorFedByHand(benchmark::State& state) {
    MallocResource<true> memory;
    for (auto _ : state) PushAndPop(std::pmr::vector<int>(&memory));
    HMemory::Reset();
}

BENCHMARK(TrackedVector);
BENCHMARK(TrackedAllocatorVector);
BENCHMARK(VectorFedByHand);

constexpr char kFile[] = "/proc/self/exe";  // in the page cache, since it runs
constexpr std::size_t kBlock = 4096;

void RecordedRead(benchmark::State& state) {
    std::error_code error;
    HRecordedDescriptor file = HRecordedDescriptor::Open(kFile, {}, error);
    char block[kBlock];
    for (auto _ : state) {
        lseek(file.GetNative(), 0, SEEK_SET);
        benchmark::DoNotOptimize(file.Read(block, sizeof block, error));
    }
    HDiskIOReset();
}

void ReadRecordedByHand(benchmark::State& state) {
    const int file = open(kFile, O_RDONLY);
    HDiskIOOpen(kFile, &state, 0);
    char block[kBlock];
    for (auto _ : state) {
        lseek(file, 0, SEEK_SET);
        const auto start = std::chrono::steady_clock::now();
        const ssize_t size = read(file, block, sizeof block);
        const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - start;
        if (size >= 0) HDiskIORead(&state, static_cast<unsigned long long>(size), seconds.count());
        benchmark::DoNotOptimize(size);
    }
    close(file);
    HDiskIOReset();
}

BENCHMARK(RecordedRead);
BENCHMARK(ReadRecordedByHand);

void TimedRegion(benchmark::State& state) {
    for (auto _ : state) {
        HTimedRegion("region");
        benchmark::ClobberMemory();
    }
}

void TwoToggles(benchmark::State& state) {
    static const unsigned long long id = GlobalTimer::GetInstance().RegisterNewTimer("by hand");
    for (auto _ : state) {
        GlobalTimer::GetInstance().Toggle(id);
        benchmark::ClobberMemory();
        GlobalTimer::GetInstance().Toggle(id);
    }
}

BENCHMARK(TimedRegion);
BENCHMARK(TwoToggles);

const bool rows = AddRatio("TrackedVector", "VectorFedByHand", 1.15) &&
                  AddRatio("TrackedAllocatorVector", "VectorFedByHand", 1.15) &&
                  AddRatio("RecordedRead", "ReadRecordedByHand", 1.1) &&
                  AddRatio("TimedRegion", "TwoToggles", 1.1);

}  // namespace
