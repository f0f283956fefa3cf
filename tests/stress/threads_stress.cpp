// Kills threads in different operations; starts, kills and awaits one thread from several; signals a worker. Runs
// for some seconds, or as many times longer as the argument says. A broken promise aborts with a message; a lock of
// the C library that stays held is a hang.
#include <sys/resource.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <locale>
#include <mutex>
#include <random>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/require.h"
#include "support/runner.h"

// A killed thread frees nothing and joins no thread.
extern "C" const char* __asan_default_options() { return "detect_leaks=0"; }
extern "C" const char* __tsan_default_options() { return "report_thread_leaks=0"; }
extern "C" __attribute__((weak)) void __asan_init(), __tsan_init();  // defined under the sanitizers

namespace {

constexpr int kRounds = 20;
int rounds = kRounds;
int pipe_ends[2];  // full after the first writes
std::FILE* const waste = std::fopen("/dev/null", "w");

void Allocate() {
    std::vector<std::string> texts;
    for (unsigned int size = 1; size < 2000; size += 100) texts.emplace_back(size, 'x');
}

// Pauses, because a thread that is never found outside a library is killed only after seconds.
void SetLocale() {
    std::locale::global(std::locale(std::locale::classic(), new std::ctype<char>));
    for (volatile int step = 0; step < 1000;) step = step + 1;
}

// Global, so that they outlive their threads though the thread that started those is killed.
const HSemaphore never(0);
Runner endless([] { never.Lock(); });
Runner allocating(Allocate);

void WritePipe() { Require(write(pipe_ends[1], pipe_ends, sizeof pipe_ends) > 0, "the pipe stays open"); }

// Nearly always inside the C library, so a kill takes seconds: for longer runs only.
void MakeThread() { std::thread(Allocate).join(); }

// What a killed thread must not have locked.
void UseLibraries() {
    Allocate();
    std::ostringstream() << 1.5;
}

// What a thread repeats until it is killed.
void (*const kOperations[])() = {
    [] {},
    std::this_thread::yield,
    [] { sleep(1000); },
    WritePipe,
    [] { endless.Wait(); },
    Allocate,
    SetLocale,
    [] { std::fprintf(waste, "%f %s\n", 1.0 / 3, std::string(30, 'x').c_str()); },
    MakeThread,
    [] { allocating.Start(true) ? allocating.Wait() : allocating.Kill(); },
};

// A thousand kills in a row.
void KillInEveryOperation() {
    std::atomic<int> steps{0};
    for (const auto operation : kOperations) {
        if (operation == WritePipe && __tsan_init != nullptr) continue;  // the tool delays signals meanwhile
        if (operation == SetLocale && __tsan_init != nullptr) continue;  // kills are not delayed there
        if (operation == MakeThread && rounds == kRounds) continue;
        Runner runner([&] {
            const HMutex mutex;
            for (const HMutexLock lock(&mutex);; ++steps) operation();
        });
        for (int round = 0; round < 7 * rounds; ++round) {
            runner.Start(true);
            for (int pause = round % 10; pause > 0; --pause) std::this_thread::yield();
            runner.Kill();
            Require(!runner.IsRunning(), "idle after a kill");
            std::thread(UseLibraries).join();
        }
    }
}

void OperateFromSeveralThreads() {
    Counter counter;
    std::atomic<int> due{2};
    counter.Start(true);
    std::mutex mutex;  // keeps a start and a kill apart
    std::vector<std::thread> operators;
    for (unsigned int seed = 1; seed <= 4; ++seed) {
        operators.emplace_back([&, seed] {
            std::minstd_rand random(seed);
            for (int round = 0; round < 50 * rounds; ++round) {
                due += counter.Signal() ? 1 : 0;
                if (random() % 4 == 0) allocating.Wait();
                const std::lock_guard<std::mutex> lock(mutex);
                const bool kills = random() % 3 == 0;
                if (kills) allocating.Kill();
                if (!kills) allocating.Start(true);
                allocating.SetPriority(static_cast<HThreadPriority>(random() % 8));
            }
        });
    }
    for (std::thread& each : operators) each.join();
    allocating.Wait();
    Require(!allocating.IsRunning(), "idle after a wait");
    while (counter.passes < due || counter.IsProcessing()) std::this_thread::yield();
    Require(counter.passes == due, "a pass for each signal accepted");
}

// The sanitizers, and emulators of a processor, keep memory for each thread that has ended.
bool KeepsMemoryOfThreads() {
#ifdef ZANBASE_TEST_EMULATED
    return true;
#else
    return __asan_init != nullptr || __tsan_init != nullptr;
#endif
}

void LeaveNothingBehind() {
    if (KeepsMemoryOfThreads()) return;
    rusage before{}, after{};
    Runner unawaited([] {});
    for (int round = 0; round < 11000; ++round) {
        unawaited.Start(true);
        while (unawaited.IsRunning()) std::this_thread::yield();
        if (round == 1000) getrusage(RUSAGE_SELF, &before);
    }
    getrusage(RUSAGE_SELF, &after);
    Require(after.ru_maxrss < before.ru_maxrss + 400, "level memory");
}

}  // namespace

int main(int count, char** arguments) {
    if (count > 1) rounds *= std::atoi(arguments[1]);
    if (waste == nullptr || pipe(pipe_ends) != 0) return 1;
    LeaveNothingBehind();
    OperateFromSeveralThreads();
    endless.Start(true);
    KillInEveryOperation();
    allocating.Wait();
    endless.Kill();
    return 0;
}
