// All locks under many threads, with what each of them promises checked all the time. Runs a short while, or
// as many times longer as its argument says; any lost unit, wake-up or exclusion ends it with a message or a
// hang.
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <random>
#include <thread>
#include <vector>

#include "zanbase/zanbase.h"

namespace {

constexpr int kThreads = 8;
int rounds = 20000;

void Require(bool holds, const char* what) {
    if (holds) return;
    std::fprintf(stderr, "broken: %s\n", what);
    std::abort();
}

// Runs body(thread, random) once on each of the threads.
template <class Body>
void OnAllThreads(Body body) {
    std::vector<std::thread> threads;
    for (int thread = 0; thread < kThreads; ++thread) {
        threads.emplace_back([&body, thread] {
            std::minstd_rand random(static_cast<unsigned int>(thread) + 1);
            body(thread, random);
        });
    }
    for (std::thread& thread : threads) thread.join();
}

void StressMutex() {
    const HMutex mutex;
    long long count = 0;  // guarded by mutex
    OnAllThreads([&](int, auto& random) {
        for (int round = 0; round < rounds; ++round) {
            if (random() % 4 != 0 || !mutex.TryLock()) mutex.Lock();
            HMutexLock lock(&mutex);
            const long long before = count;
            if (random() % 64 == 0) std::this_thread::yield();
            Require(count == before, "one owner of a mutex");
            count = before + 1;
            mutex.Unlock();
        }
    });
    Require(count == static_cast<long long>(kThreads) * rounds, "every turn of a mutex");
}

void StressSemaphore() {
    constexpr int kUnits = 3;
    const HSemaphore semaphore(kUnits);
    std::atomic<int> holders{0};
    OnAllThreads([&](int, auto& random) {
        for (int round = 0; round < rounds; ++round) {
            if (random() % 4 != 0) {
                semaphore.Lock();
            } else if (!semaphore.TryLock(static_cast<double>(random() % 3) / 1000)) {
                continue;
            }
            Require(++holders <= kUnits, "no more holders than units");
            if (random() % 64 == 0) std::this_thread::yield();
            --holders;
            semaphore.Unlock();
        }
    });
    for (int unit = 0; unit < kUnits; ++unit) Require(semaphore.TryLock(0.0), "no unit lost");
    Require(!semaphore.TryLock(0.0), "no unit too many");
}

// Half of the threads put numbers into a short queue, the other half take them out.
void StressCondition() {
    constexpr std::size_t kRoom = 4;
    const HMutex mutex;
    const HCondVar changed;
    const HCondVar room;
    std::deque<int> queue;  // guarded by mutex, like the sum
    long long sum = 0;
    OnAllThreads([&](int thread, auto& random) {
        for (int round = 1; round <= rounds; ++round) {
            const HMutexLock lock(&mutex);
            if (thread % 2 == 0) {
                while (queue.size() == kRoom) room.Wait(mutex);
                queue.push_back(round);
                random() % 16 == 0 ? changed.Broadcast() : changed.Signal();
            } else {
                while (queue.empty())
                    static_cast<void>(changed.TryWait(mutex, random() % 2 == 0 ? 1e6 : 0.001));
                sum += queue.front();
                queue.pop_front();
                room.Signal();
            }
        }
    });
    Require(sum == static_cast<long long>(kThreads) / 2 * rounds * (rounds + 1) / 2, "every number once");
}

template <class Mutex>
void StressReadWrite(bool downgrades) {
    const Mutex mutex;
    long long first = 0, second = 0, writes = 0;  // guarded by mutex; the first two are the same
    std::atomic<long long> written{0};
    OnAllThreads([&](int, auto& random) {
        for (int round = 0; round < rounds; ++round) {
            HReaderLock reader(nullptr);
            const bool writes_now = random() % 4 == 0;
            const bool reads_now = !writes_now || (downgrades && random() % 2 == 0);
            if (writes_now) {
                const HWriterLock lock(&mutex);
                const HWriterLock again = lock;
                ++first;
                if (random() % 64 == 0) std::this_thread::yield();
                ++second;
                ++writes;
                if (reads_now) reader.Reset(&mutex);
            } else {
                reader.Reset(&mutex);
            }
            if (writes_now) ++written;
            if (random() % 64 == 0) std::this_thread::yield();
            const HReaderLock nested = reader;
            if (reads_now) Require(first == second, "no writer beside a reader");
        }
    });
    Require(first == second && writes == written, "every write");
}

}  // namespace

int main(int count, char** arguments) {
    if (count > 1) rounds *= std::atoi(arguments[1]);
    StressMutex();
    StressSemaphore();
    StressCondition();
    StressReadWrite<HReadPrefMutex>(true);
    StressReadWrite<HWritePrefMutex>(false);
    return 0;
}
