// All families at once, for a second, or as many as the argument says: threads of each repeat its operations and check
// what they promise, while reports and snapshots read the accounts. A broken promise aborts with a message.
#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "support/require.h"
#include "support/runner.h"
#include "zanbase/snapshot.h"
#include "zanbase/zanbase.h"

// A killed thread frees nothing and joins no thread.
extern "C" const char* __asan_default_options() { return "detect_leaks=0"; }
extern "C" const char* __tsan_default_options() { return "report_thread_leaks=0"; }

namespace {

using Random = std::mt19937;

// A stack of at most four items behind all locks: the read-write lock guards it, the semaphore counts its room, and
// the condition announces new items.
const HWritePrefMutex table;
const HMutex mutex;
const HCondVar filled;
const HSemaphore room(4);
int items = 0;  // guarded by mutex
int first = 0;  // guarded by table, as is second; equal outside a write
int second = 0;

void UseLocks(Random& random) {
    if (room.TryLock(0.001)) {
        const HMutexLock lock(&mutex);
        Require(++items <= 4, "no more items than room");
        filled.Signal();
    }
    mutex.Lock();
    if (items == 0) filled.TryWait(mutex, 0.001);
    if (items > 0) {
        --items;
        room.Unlock();
    }
    mutex.Unlock();
    if (random() % 4 == 0) {
        const HWriterLock lock(&table);
        first = ++second;
    }
    const HReaderLock lock(&table);
    Require(first == second, "no reader beside a writer");
}

void UseThreads(Random& random) {
    int passes = 0;
    Runner counting([&] { ++passes; });
    counting.RunToEnd();
    Require(passes == 1, "one run for each start");
    const HSemaphore never(0);
    Runner waiting([&] { never.Lock(); });
    waiting.Start(true);
    if (random() % 2 == 0) std::this_thread::yield();
    waiting.Kill();
    Require(!waiting.IsRunning(), "idle after a kill");
}

// One thread has the worker, so that it knows how many passes are left to make.
void UseWorker(Random&) {
    Counter worker;
    worker.Start(true);
    int due = 2;
    for (int signal = 0; signal < 100; ++signal) due += worker.Signal() ? 1 : 0;
    while (worker.passes < due || worker.IsProcessing()) std::this_thread::yield();
    Require(worker.passes == due, "a pass for each signal accepted");
}

void UseAllocators(Random& random) {
    char* const text = static_cast<char*>(HRealloc(HString("text"), 5 + random() % 1000));
    Require(std::strcmp(text, "text") == 0, "a block keeps its text");
    std::free(text);
}

void UseTracker(Random& random) {
    static thread_local char blocks[32];
    for (char& block : blocks)
        HMemory::Alloc(&block, random() % 100, __FILE__, static_cast<int>(random() % 8));
    for (char& block : blocks) HMemory::Free(&block);
}

void UseLedger(Random& random) {
    static thread_local char handle;
    HDiskIOOpen(MkString("file %d", static_cast<int>(random() % 8)), &handle, 0);
    HDiskIORead(&handle, 3, 0);
    HDiskIOClose(&handle, 0);
}

void UseText(Random& random) {
    const int number = static_cast<int>(random());
    char field[13] = {};
    PrintInt(field, "%12ld", number);
    Require(ScanInt(field, 12) == number, "a field reads as it was written");
    Require(MkName(number) == std::to_string(number), "names are exact");
    Require(MkTokenString("a", MkName(number), nullptr) == "a|" + std::to_string(number),
            "tokens are joined");
    const char* const text = _("text");
    Require(_("text") == text, "a message keeps its text");
}

void UseSort(Random& random) {
    unsigned char bytes[300];
    for (unsigned char& byte : bytes) byte = static_cast<unsigned char>(random() % 256);
    ZAN_qsort(bytes, 300, 1, [](const void* one, const void* other) { return std::memcmp(one, other, 1); });
    Require(std::is_sorted(std::begin(bytes), std::end(bytes)), "sorted");
}

void ReadAccounts(Random&) {
    static std::FILE* const waste = std::fopen("/dev/null", "w");
    HMemory::LeakReport(waste);
    HMemory::UsageReport(waste);
    HDiskIOSummaryReport(waste);
    for (const auto& row : HDiskIOSnapshot::Take().maRows) {
        Require(row.moOpen.mnCount >= row.moClose.mnCount, "no close without an open");
        Require(row.moRead.mnBytes == 3 * row.moRead.mnCount, "bytes of all reads");
    }
    for (const auto& row : HMemorySnapshot::Take().maRows)
        Require(row.mnLiveBytes == row.mnAllocated - row.mnFreed, "live bytes are those not freed");
}

// Timers belong to thread numbers, so one thread has the team.
void UseTimers(Random&) {
    static const unsigned long long timer = GlobalTimer::GetInstance().RegisterNewTimer("team");
    const OMPThreadCount three(3);
    const OMPDynamic fixed(false);
    Require(IMPRandom() < 1, "a number in its range");
#pragma omp parallel
    for (int round = 0; round < 20; ++round) GlobalTimer::GetInstance().Toggle(timer);
}

}  // namespace

int main(int count, char** arguments) {
    const double seconds = count > 1 ? std::atof(arguments[1]) : 1;
    const HTimer timer;
    std::vector<std::thread> threads;
    void (*const bodies[])(Random&) = {UseLocks,  UseLocks,      UseLocks,   UseThreads,
                                       UseWorker, UseAllocators, UseTracker, UseTracker,
                                       UseLedger, UseText,       UseSort,    ReadAccounts};
    for (const auto body : bodies) {
        threads.emplace_back([&, body] {
            for (Random random(std::random_device{}()); timer.GetTimeInSeconds() < seconds;) body(random);
        });
    }
    for (Random random; timer.GetTimeInSeconds() < seconds;) UseTimers(random);
    for (std::thread& thread : threads) thread.join();
    Require(HMemorySnapshot::Take().mnTotal == 0, "no block is live");
    return 0;
}
