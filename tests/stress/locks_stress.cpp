// All locks under many threads, with what they promise checked all the time: for a second, or as many times
// longer as the argument says. A broken promise ends it with a message, a lost unit or wake-up with a hang.
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <thread>
#include <vector>

#include "zanbase/condition_variable.h"
#include "zanbase/read_write_mutex.h"

namespace {

using Random = std::minstd_rand;
constexpr int kThreads = 8;
int rounds = 60000;

void Require(bool holds, const char* what) {
    if (holds) return;
    std::fprintf(stderr, "broken: %s\n", what);
    std::abort();
}

void SometimesYield(Random& random) {
    if (random() % 64 == 0) std::this_thread::yield();
}

// Calls body(random) many times on each of the threads.
template <class Body>
void OnAllThreads(Body body) {
    std::vector<std::thread> threads;
    for (unsigned int thread = 1; thread <= kThreads; ++thread) {
        threads.emplace_back([&body, thread] {
            Random random(thread);
            for (int round = 0; round < rounds; ++round) body(random);
        });
    }
    for (std::thread& thread : threads) thread.join();
}

void StressSemaphore() {
    constexpr int kUnits = 3;
    const HSemaphore semaphore(kUnits);
    std::atomic<int> holders{0};
    OnAllThreads([&](Random& random) {
        if (random() % 4 != 0) {
            semaphore.Lock();
        } else if (!semaphore.TryLock(static_cast<double>(random() % 3) / 1000)) {
            return;
        }
        Require(++holders <= kUnits, "no more holders than units");
        SometimesYield(random);
        --holders;
        semaphore.Unlock();
    });
    for (int unit = 0; unit <= kUnits; ++unit)
        Require(semaphore.TryLock(0.0) == (unit < kUnits), "all units");
}

// Every call moves one item in or out, so in the end all that came in has gone out.
void StressMutexAndCondition() {
    constexpr int kRoom = 3;
    const HMutex mutex;
    const HCondVar item, room;
    int items = 0, moves = 0;  // guarded by mutex
    std::atomic<int> turn{0};
    OnAllThreads([&](Random& random) {
        const bool puts = turn++ % 2 == 0;
        if (random() % 4 != 0 || !mutex.TryLock()) mutex.Lock();
        if (puts) {
            while (items == kRoom) room.Wait(mutex);
        } else {
            while (items == 0) static_cast<void>(item.TryWait(mutex, random() % 2 == 0 ? 1e6 : 0.001));
        }
        const HMutexLock nested(&mutex);
        const int before = items;
        SometimesYield(random);
        Require(items == before, "one owner");
        items += puts ? 1 : -1;
        ++moves;
        const HCondVar& changed = puts ? item : room;
        random() % 16 == 0 ? changed.Broadcast() : changed.Signal();
        mutex.Unlock();
    });
    Require(items == 0 && moves == kThreads * rounds, "every move");
}

template <class Mutex>
void StressReadWrite(bool downgrades) {
    const Mutex mutex;
    int first = 0, second = 0;  // guarded by mutex, and the same outside a write
    std::atomic<int> writes{0};
    OnAllThreads([&](Random& random) {
        HReaderLock reader(nullptr);
        const bool writes_now = random() % 4 == 0;
        if (writes_now) {
            const HWriterLock lock(&mutex);
            const HWriterLock nested = lock;
            ++first;
            SometimesYield(random);
            ++second;
            ++writes;
            if (downgrades) reader.Reset(&mutex);
        } else {
            reader.Reset(&mutex);
        }
        SometimesYield(random);
        const HReaderLock nested = reader;
        if (downgrades || !writes_now) Require(first == second, "no writer beside a reader");
    });
    Require(first == second && first == writes, "every write");
}

}  // namespace

int main(int count, char** arguments) {
    if (count > 1) rounds *= std::atoi(arguments[1]);
    StressSemaphore();
    StressMutexAndCondition();
    StressReadWrite<HReadPrefMutex>(true);
    StressReadWrite<HWritePrefMutex>(false);
    return 0;
}
