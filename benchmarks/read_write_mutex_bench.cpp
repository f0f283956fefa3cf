// The read-write locks beside Boost's and the system's: pairs on one thread, and how long one thread waits
// under a stream of the other kind.
#include "zanbase/read_write_mutex.h"

#include <benchmark/benchmark.h>
#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <boost/thread/shared_mutex.hpp>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "placement.h"
#include "ratios.h"

namespace {

class BoostShared {
public:
    void ReadLock() { moMutex.lock_shared(); }
    void ReadUnlock() { moMutex.unlock_shared(); }
    void WriteLock() { moMutex.lock(); }
    void WriteUnlock() { moMutex.unlock(); }

private:
    boost::shared_mutex moMutex;
};

class System {
public:
    ~System() { pthread_rwlock_destroy(&moLock); }
    void ReadLock() { pthread_rwlock_rdlock(&moLock); }
    void ReadUnlock() { pthread_rwlock_unlock(&moLock); }
    void WriteLock() { pthread_rwlock_wrlock(&moLock); }
    void WriteUnlock() { pthread_rwlock_unlock(&moLock); }

private:
    pthread_rwlock_t moLock = PTHREAD_RWLOCK_INITIALIZER;
};

template <class Mutex>
void ReadPair(benchmark::State& state) {
    Mutex mutex;
    for (auto _ : state) {
        mutex.ReadLock();
        mutex.ReadUnlock();
    }
}

template <class Mutex>
Mutex shared_lock;

// Each thread reads again at once.
template <class Mutex>
void SharedReadPair(benchmark::State& state) {
    const OwnProcessor own_processor(state.thread_index());
    for (auto _ : state) {
        shared_lock<Mutex>.ReadLock();
        shared_lock<Mutex>.ReadUnlock();
    }
}

template <class Mutex>
void NestedReadPair(benchmark::State& state) {
    Mutex mutex;
    mutex.ReadLock();
    for (auto _ : state) {
        mutex.ReadLock();
        mutex.ReadUnlock();
    }
    mutex.ReadUnlock();
}

template <class Mutex>
void WritePair(benchmark::State& state) {
    Mutex mutex;
    for (auto _ : state) {
        mutex.WriteLock();
        mutex.WriteUnlock();
    }
}

// Two threads enter and leave in turns that overlap; the measured one enters from time to time as the other
// kind. The stream ends after kStreamMs, so that every wait ends.
constexpr int kStreamMs = 100;

double MsSince(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

void Work() {
    for (int i = 0; i < 2000; ++i) benchmark::DoNotOptimize(i);
}

template <class Mutex, bool kReadersStream>
void LongestWait(benchmark::State& state) {
    const auto visit = [](Mutex& mutex, bool reads) {
        reads ? mutex.ReadLock() : mutex.WriteLock();
        const auto inside = std::chrono::steady_clock::now();
        Work();
        reads ? mutex.ReadUnlock() : mutex.WriteUnlock();
        return inside;
    };
    double longest_ms = 0;
    for (auto _ : state) {
        Mutex mutex;
        const auto start = std::chrono::steady_clock::now();
        std::vector<std::thread> stream;
        stream.reserve(2);
        for (int i = 0; i < 2; ++i) {
            stream.emplace_back([&] {
                while (MsSince(start) < kStreamMs) visit(mutex, kReadersStream);
            });
        }
        while (MsSince(start) < kStreamMs) {
            const auto asked = std::chrono::steady_clock::now();
            const std::chrono::duration<double, std::milli> wait = visit(mutex, !kReadersStream) - asked;
            longest_ms = std::max(longest_ms, wait.count());
            std::this_thread::yield();
        }
        for (std::thread& thread : stream) thread.join();
    }
    state.counters["longest_ms"] = longest_ms;
}

BENCHMARK_TEMPLATE(ReadPair, HReadPrefMutex);
BENCHMARK_TEMPLATE(ReadPair, HWritePrefMutex);
BENCHMARK_TEMPLATE(ReadPair, BoostShared);
BENCHMARK_TEMPLATE(ReadPair, System);
BENCHMARK_TEMPLATE(SharedReadPair, HReadPrefMutex)->Threads(2)->UseRealTime();
BENCHMARK_TEMPLATE(SharedReadPair, HWritePrefMutex)->Threads(2)->UseRealTime();
BENCHMARK_TEMPLATE(SharedReadPair, BoostShared)->Threads(2)->UseRealTime();
BENCHMARK_TEMPLATE(NestedReadPair, HReadPrefMutex);
BENCHMARK_TEMPLATE(NestedReadPair, HWritePrefMutex);
BENCHMARK_TEMPLATE(NestedReadPair, System);
BENCHMARK_TEMPLATE(WritePair, HReadPrefMutex);
BENCHMARK_TEMPLATE(WritePair, HWritePrefMutex);
BENCHMARK_TEMPLATE(WritePair, BoostShared);
BENCHMARK_TEMPLATE(WritePair, System);
BENCHMARK_TEMPLATE(LongestWait, HReadPrefMutex, true)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, HWritePrefMutex, true)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, BoostShared, true)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, System, true)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, HReadPrefMutex, false)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, HWritePrefMutex, false)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, BoostShared, false)->Iterations(1)->UseRealTime();
BENCHMARK_TEMPLATE(LongestWait, System, false)->Iterations(1)->UseRealTime();

bool AddRows() {
    for (const std::string ours : {"<HReadPrefMutex>", "<HWritePrefMutex>"}) {
        AddRatio("NestedReadPair" + ours, "NestedReadPair<System>", 1.5);
        AddRatio(std::string("SharedReadPair").append(ours).append("/real_time/threads:2"),
                 "SharedReadPair<BoostShared>/real_time/threads:2", 1.0);
        for (const std::string pair : {"ReadPair", "WritePair"}) {
            AddRatio(pair + ours, pair + "<BoostShared>", 0.95);
            AddRatio(pair + ours, pair + "<System>", 0);
        }
    }
    return true;
}
const bool rows = AddRows();

}  // namespace
