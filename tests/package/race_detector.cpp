// Hands plain data from thread to thread in ways that the other programs leave out. With an argument it also
// makes two faults: a data race and a lock-order inversion.
#include <atomic>
#include <thread>

#include "support/runner.h"
#include "zanbase/zanbase.h"

namespace {

// Apart, because the tool knows the last four accesses of every eight bytes.
alignas(8) int data = 0;
alignas(8) std::atomic<int> steps{0};  // the step at which a thread continues; relaxed, so it orders nothing

void UseData() {
    ++data;
    steps.fetch_add(1, std::memory_order_relaxed);
}

void AwaitStep(int number) {
    while (steps.load(std::memory_order_relaxed) < number) std::this_thread::yield();
}

void HandOver() {
    Runner runner(UseData);
    runner.Start(true);
    while (runner.IsRunning()) std::this_thread::yield();
    UseData();
    const HSemaphore never(0);
    Runner endless([&] {
        UseData();
        never.Lock();
    });
    endless.Start(true);
    AwaitStep(3);
    endless.Kill();
    UseData();
    // After the fault the message is printed, which allocates: a false report if the tool had missed the jump.
    Runner faulty([] { *reinterpret_cast<volatile int*>(8) = 1; });
    faulty.RunToEnd();
}

void Race() {
    Runner runner([] {
        UseData();
        AwaitStep(6);
    });
    runner.Start(true);
    AwaitStep(5);
    UseData();
    runner.Wait();
}

void Invert() {
    const HMutex first;
    const HMutex second;
    { const HMutexLock outer(&first), inner(&second); }
    { const HMutexLock outer(&second), inner(&first); }
}

}  // namespace

int main(int count, char**) {
    HandOver();
    if (count == 1) return 0;
    Race();
    Invert();
    return 0;
}
