// HMutex beside the standard library's re-entrant mutex: a free pair before and after the process has had a
// second thread, threads that compete for the mutex, and the tracker, which holds one, on one thread and on two.
#include "zanbase/mutex.h"

#include <benchmark/benchmark.h>
#include <sys/single_threaded.h>

#include <cstdlib>
#include <mutex>
#include <string>

#include "placement.h"
#include "ratios.h"
#include "zanbase/memory.h"

namespace {

struct Ours {
    void Lock() { moMutex.Lock(); }
    void Unlock() { moMutex.Unlock(); }

private:
    HMutex moMutex;
};

struct Standard {
    void Lock() { moMutex.lock(); }
    void Unlock() { moMutex.unlock(); }

private:
    std::recursive_mutex moMutex;
};

template <class Mutex>
Mutex shared_mutex;

// Holds the mutex for `state.range(0)` steps; each thread asks for it again at once.
template <class Mutex>
void MutexPair(benchmark::State& state) {
    const OwnProcessor own_processor(state.thread_index());
    const auto steps = state.range(0);
    for (auto _ : state) {
        shared_mutex<Mutex>.Lock();
        for (long step = 0; step < steps; ++step) benchmark::DoNotOptimize(step);
        shared_mutex<Mutex>.Unlock();
    }
}

// main runs it before the process starts its first thread: locks cost more from then on.
template <class Mutex>
void MutexPairWithoutThreads(benchmark::State& state) {
    if (__libc_single_threaded == 0) return state.SkipWithError("the process has had threads");
    for (auto _ : state) {
        shared_mutex<Mutex>.Lock();
        shared_mutex<Mutex>.Unlock();
    }
}

// An acquisition by the owner.
template <class Mutex>
void NestedMutexPair(benchmark::State& state) {
    Mutex mutex;
    mutex.Lock();
    for (auto _ : state) {
        mutex.Lock();
        mutex.Unlock();
    }
    mutex.Unlock();
}

void TrackedPair(benchmark::State& state) {
    const OwnProcessor own_processor(state.thread_index());
    void* const block = std::malloc(8);
    for (auto _ : state) {
        HMemory::Alloc(block, 8, __FILE__, __LINE__);
        HMemory::Free(block);
    }
    std::free(block);
}

BENCHMARK_TEMPLATE(MutexPairWithoutThreads, Ours);
BENCHMARK_TEMPLATE(MutexPairWithoutThreads, Standard);
BENCHMARK_TEMPLATE(MutexPair, Ours)->Arg(0)->Threads(1)->Threads(2)->Threads(4)->UseRealTime();
BENCHMARK_TEMPLATE(MutexPair, Standard)->Arg(0)->Threads(1)->Threads(2)->Threads(4)->UseRealTime();
BENCHMARK_TEMPLATE(MutexPair, Ours)->Arg(300)->Arg(3000)->Threads(2)->UseRealTime();
BENCHMARK_TEMPLATE(MutexPair, Standard)->Arg(300)->Arg(3000)->Threads(2)->UseRealTime();
BENCHMARK_TEMPLATE(NestedMutexPair, Ours);
BENCHMARK_TEMPLATE(NestedMutexPair, Standard);
BENCHMARK(TrackedPair)->Threads(1)->Threads(2)->UseRealTime();

bool AddRows() {
    AddRatio("MutexPairWithoutThreads<Ours>", "MutexPairWithoutThreads<Standard>", 1.0);
    AddRatio("MutexPairWithoutThreads<Ours>", "MutexPair<Standard>/0/real_time/threads:1", 0.5);
    const auto compare = [](const std::string& variant, double goal) {
        AddRatio("MutexPair<Ours>" + variant, "MutexPair<Standard>" + variant, goal);
    };
    compare("/0/real_time/threads:1", 1.0);
    compare("/0/real_time/threads:2", 1.1);
    compare("/0/real_time/threads:4", 1.1);
    compare("/300/real_time/threads:2", 1.05);
    compare("/3000/real_time/threads:2", 1.05);
    AddRatio("NestedMutexPair<Ours>", "NestedMutexPair<Standard>", 0);
    return AddRatio("TrackedPair/real_time/threads:2", "TrackedPair/real_time/threads:1", 4.0);
}
const bool rows = AddRows();

}  // namespace
