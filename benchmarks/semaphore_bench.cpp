// The semaphore beside the system's: a pair on one thread, and two threads that pass a unit back and forth.
#include "zanbase/semaphore.h"

#include <benchmark/benchmark.h>
#include <semaphore.h>

#include <thread>

#include "placement.h"
#include "ratios.h"

namespace {

class SystemSemaphore {
public:
    explicit SystemSemaphore(unsigned int count) { sem_init(&moUnits, 0, count); }
    ~SystemSemaphore() { sem_destroy(&moUnits); }
    void Lock() { sem_wait(&moUnits); }
    void Unlock() { sem_post(&moUnits); }

private:
    sem_t moUnits;
};

template <class Semaphore>
void SemaphorePair(benchmark::State& state) {
    Semaphore semaphore(1);
    for (auto _ : state) {
        semaphore.Lock();
        semaphore.Unlock();
    }
}
BENCHMARK_TEMPLATE(SemaphorePair, HSemaphore);
BENCHMARK_TEMPLATE(SemaphorePair, SystemSemaphore);

template <class Semaphore>
void SemaphorePingPong(benchmark::State& state) {
    const OneProcessor one_processor;
    Semaphore ping(0);
    Semaphore pong(0);
    bool ends = false;  // handed over with ping's unit
    std::thread peer([&] {
        for (;;) {
            ping.Lock();
            if (ends) return;
            pong.Unlock();
        }
    });
    for (auto _ : state) {
        ping.Unlock();
        pong.Lock();
    }
    ends = true;
    ping.Unlock();
    peer.join();
}
BENCHMARK_TEMPLATE(SemaphorePingPong, HSemaphore)->UseRealTime();
BENCHMARK_TEMPLATE(SemaphorePingPong, SystemSemaphore)->UseRealTime();

const bool rows =
    AddRatio("SemaphorePair<HSemaphore>", "SemaphorePair<SystemSemaphore>", 1.25) &&
    AddRatio("SemaphorePingPong<HSemaphore>/real_time", "SemaphorePingPong<SystemSemaphore>/real_time", 1.1);

}  // namespace
