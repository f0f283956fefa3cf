// All locks under many threads, with their contracts checked all the time: for a second, or as many times
// longer as the argument says. A broken contract ends it with a message, a lost unit or wake-up with a hang.
#include <cstdlib>
#include <random>
#include <thread>
#include <vector>

#include "support/require.h"
#include "zanbase/condition_variable.h"
#include "zanbase/read_write_mutex.h"

namespace {

int rounds = 60000;

// Calls body(random number, number of the thread) many times on each of eight threads.
template <class Body>
void OnAllThreads(Body body) {
    std::vector<std::thread> threads;
    for (unsigned int thread = 0; thread < 8; ++thread)
        threads.emplace_back([=] {
            std::mt19937 random(thread);
            for (int round = 0; round < rounds; ++round) body(random(), thread);
        });
    for (std::thread& thread : threads) thread.join();
}

// Half of the threads put items where there is room for three, and the others take them out.
void StressRoomAndItems() {
    const HMutex mutex;
    const HCondVar item;
    const HSemaphore room(3);
    int items = 0;  // guarded by mutex
    OnAllThreads([&](auto dice, unsigned int thread) {
        const bool puts = thread % 2 == 0;
        const double limit = dice % 3 == 0 ? 0.001 : 1e6;
        while (puts && !room.TryLock(limit)) continue;
        if (dice % 4 == 0 || !mutex.TryLock()) mutex.Lock();
        while (!puts && items == 0) dice % 4 == 0 ? item.Wait(mutex) : void(item.TryWait(mutex, limit));
        const HMutexLock nested(&mutex);
        const int before = items;
        if (dice / 64 % 64 == 0) std::this_thread::yield();
        items = before + (puts ? 1 : -1);
        Require(items >= 0 && items <= 3, "one owner, and no more items than room");
        if (puts) dice % 16 == 0 ? item.Broadcast() : item.Signal();
        mutex.Unlock();
        if (!puts) room.Unlock();
    });
    for (int unit = 0; unit <= 3; ++unit) Require(room.TryLock(0.0) == (unit < 3), "all units");
    Require(items == 0, "all items");
}

template <class Mutex>
void StressReadWrite(bool downgrades) {
    const Mutex mutex;
    int first = 0, second = 0;  // guarded by mutex, and the same outside a write
    OnAllThreads([&](auto dice, unsigned int) {
        HReaderLock reader(dice % 4 != 0 ? &mutex : nullptr);
        if (dice % 4 == 0) {
            const HWriterLock lock(&mutex), nested = lock;
            ++first;
            if (dice / 64 % 64 == 0) std::this_thread::yield();
            ++second;
            if (!downgrades) return;
            reader.Reset(&mutex);
        }
        const HReaderLock nested = reader;
        if (dice / 64 % 64 == 0) std::this_thread::yield();
        Require(first == second, "no writer beside a reader or a writer");
    });
}

}  // namespace

int main(int count, char** arguments) {
    if (count > 1) rounds = static_cast<int>(rounds * std::atof(arguments[1]));
    StressRoomAndItems();
    StressReadWrite<HReadPrefMutex>(true);
    StressReadWrite<HWritePrefMutex>(false);
    return 0;
}
