// The tables of the library in the child of a process with threads.
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <thread>

#include "diskio/ledger.h"
#include "environment/message_catalogue.h"
#include "support/blocked_thread.h"
#include "text/name_ring.h"
#include "timing/row_table.h"
#include "zanbase/memory.h"
#include "zanbase/thread.h"

namespace {

struct Tracker : HMemory {
    using HMemory::moMutex;
};

// The other thread opens a file while it is inside, for which it needs a lock that fork() acquires too.
TEST(Fork, WaitsUntilNoOtherThreadIsInsideATable) {
    const unsigned long long main_thread = HThread::GetCurrentThreadId();
    const HMutex* const mutexes[] = {&Tracker::moMutex, mpoDiskIOMutex, &goTimerGrowthMutex,
                                     &goMessageCatalogue.moCatalogueMutex, &goNameRing.moRingMutex};
    for (const HMutex* const mutex : mutexes) {
        std::atomic<bool> inside{false};
        std::thread other([&] {
            const HMutexLock lock(mutex);
            inside = true;
            AwaitSleepOf(main_thread);
        });
        while (!inside) std::this_thread::yield();
        const pid_t child = fork();
        // The raw call: at _exit the thread sanitizer reports that the child has not joined the other thread.
        if (child == 0) syscall(SYS_exit_group, mutex->TryLock() ? 0 : 1);
        int status = -1;
        waitpid(child, &status, 0);
        other.join();
        EXPECT_EQ(status, 0);
    }
}

}  // namespace
