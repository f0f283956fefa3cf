// From a signal to its pass and back, beside a worker built on a condition variable.
#include "zanbase/hibernate_thread.h"

#include <benchmark/benchmark.h>

#include <condition_variable>
#include <mutex>
#include <thread>

#include "placement.h"
#include "ratios.h"

namespace {

// Both workers release a unit of it in each pass.
const HSemaphore answers(0);

class Hibernating : public HHibernateThread {
public:
    Hibernating() { Start(true); }
    ~Hibernating() override {
        while (IsProcessing()) std::this_thread::yield();
    }

private:
    void Process() override { answers.Unlock(); }
};

class OnCondition {
public:
    OnCondition() : moThread([this] { Run(); }) {}
    ~OnCondition() {
        mbEnds = true;
        while (!Signal()) std::this_thread::yield();
        moThread.join();
    }

    bool Signal() {
        {
            const std::lock_guard<std::mutex> lock(moMutex);
            if (!mbSleeps) return false;
            ++mnUnits;
        }
        moWakeUp.notify_one();
        return true;
    }

private:
    void Run() {
        while (!mbEnds) {
            answers.Unlock();
            std::unique_lock<std::mutex> lock(moMutex);
            mbSleeps = true;
            moWakeUp.wait(lock, [this] { return mnUnits > 0; });
            --mnUnits;
            mbSleeps = false;
        }
    }

    std::mutex moMutex;
    std::condition_variable moWakeUp;
    int mnUnits = 1;        // guarded by moMutex
    bool mbSleeps = false;  // guarded by moMutex
    std::atomic<bool> mbEnds{false};
    std::thread moThread;
};

template <class Worker>
void SignalToPass(benchmark::State& state) {
    const OneProcessor one_processor;
    Worker worker;
    for (int unasked = 0; unasked < 2; ++unasked) answers.Lock();
    for (auto _ : state) {
        while (!worker.Signal()) std::this_thread::yield();
        answers.Lock();
    }
}
BENCHMARK_TEMPLATE(SignalToPass, Hibernating)->UseRealTime();
BENCHMARK_TEMPLATE(SignalToPass, OnCondition)->UseRealTime();

const bool rows = AddRatio("SignalToPass<Hibernating>/real_time", "SignalToPass<OnCondition>/real_time", 1.1);

}  // namespace
