// The tables of the library in the child of a process with threads.
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <thread>

#include "diskio/ledger.h"
#include "environment/message_catalogue.h"
#include "platform/clock.h"
#include "support/runner.h"
#include "text/name_ring.h"
#include "timing/row_table.h"
#include "zanbase/memory.h"

// A clock that only the pauses of a waiting fork advance.
static std::atomic<unsigned int> now_ms{0}, pause_ms{0}, pauses{0};

WallClock ReadWallClock() noexcept { return {0, 0}; }
unsigned int ReadTicks() noexcept { return now_ms; }
void SleepFor(unsigned int) noexcept {
    ++pauses;
    now_ms += pause_ms;
    std::this_thread::yield();
}

namespace {

// True if the child of a fork finds that `act` succeeds.
template <class Act>
bool SucceedsInChild(Act act) {
    const pid_t child = fork();
    // The raw call: at _exit the thread sanitizer reports that the child has not joined the other threads.
    if (child == 0) syscall(SYS_exit_group, act() ? 0 : 1);
    int status = -1;
    waitpid(child, &status, 0);
    return status == 0;
}

struct Tracker : HMemory {
    using HMemory::moMutex;
};

// The other thread opens a file and starts a thread while it is inside. For each it needs a lock that fork() acquires
// too.
TEST(Fork, WaitsUntilNoOtherThreadIsInsideATable) {
    const HMutex* const mutexes[] = {&Tracker::moMutex, mpoDiskIOMutex, &goTimerGrowthMutex,
                                     &goMessageCatalogue.moCatalogueMutex, &goNameRing.moRingMutex};
    for (const HMutex* const mutex : mutexes) {
        std::atomic<bool> inside{false};
        std::thread other([&] {
            const HMutexLock lock(mutex);
            const unsigned int before = pauses;
            inside = true;
            while (pauses == before) std::this_thread::yield();
            std::fclose(std::fopen("/dev/null", "r"));
            Runner([] {}).RunToEnd();
        });
        while (!inside) std::this_thread::yield();
        EXPECT_TRUE(SucceedsInChild([mutex] { return mutex->TryLock(); }));
        other.join();
    }
}

TEST(Fork, GivesUpAMutexWhoseOwnerIsGone) {
    pause_ms = 1000;
    std::thread([] { goNameRing.moRingMutex.Lock(); }).join();
    for (const unsigned int wait_ms : {5000U, 1000U}) {  // once given up, it is not waited for again
        const unsigned int start = now_ms;
        EXPECT_TRUE(SucceedsInChild([] { return !goNameRing.moRingMutex.TryLock(); }));
        EXPECT_EQ(now_ms - start, wait_ms);
    }
}

}  // namespace
