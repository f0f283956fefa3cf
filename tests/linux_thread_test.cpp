// What threads are on Linux: nice values, keys and exits of POSIX, and the child of a fork.
#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <sstream>
#include <thread>

#include "support/blocked_thread.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/semaphore.h"

TEST(HThread, IsIdleInTheChildOfAFork) {
    const HSemaphore never(0);
    Runner runner([&] { never.Lock(); });
    runner.Start(true);
    const unsigned long long number = HThread::GetCurrentThreadId();
    const ChildResult child = RunInChild([&]() -> int {
        EXPECT_FALSE(runner.IsRunning());
        EXPECT_NE(HThread::GetCurrentThreadId(), number);
        runner.Wait();
        runner.Kill();
        _exit(testing::Test::HasFailure() ? 1 : 0);
    });
    EXPECT_EQ(child.exit_code, 0) << child.out;
    runner.Kill();
}

TEST(HThread, PrintsWhyItCouldNotStart) {
    Runner runner([] {});
    const ChildResult child = RunInChild([&] {
        pthread_attr_t attributes;
        pthread_getattr_default_np(&attributes);
        pthread_attr_setstacksize(&attributes, 1UL << 60U);
        pthread_setattr_default_np(&attributes);
        return runner.Start(true) ? 1 : 0;
    });
    std::ostringstream line;
    line << "HThread::Start(" << &runner << ") Error: Resource temporarily unavailable\n";
    EXPECT_EQ(child.out, line.str());
    EXPECT_EQ(child.exit_code, 0);
}

TEST(HThread, MayEndByPthreadExit) {
    const ChildResult child = RunInChild([] {
        Runner runner([] { pthread_exit(nullptr); });
        for (int round = 0; round < 3; ++round) runner.RunToEnd();
        return runner.IsRunning() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    EXPECT_EQ(child.out, "");
}

TEST(HThread, StartsWithoutTheKeysOfAKilledThread) {
    static pthread_key_t key;
    pthread_key_create(&key, nullptr);
    const HSemaphore entered(0), never(0);
    Runner runner([&] {
        EXPECT_EQ(pthread_getspecific(key), nullptr);  // though a killed thread had the same stack
        pthread_setspecific(key, &key);
        entered.Unlock();
        never.Lock();
    });
    for (int round = 0; round < 3; ++round) {
        runner.Start(true);
        entered.Lock();
        runner.Kill();
    }
}

// Each operation is one in which a kill has to wait, and `end` lets it go on.
TEST(HThread, IsKilledWhenItsSignalComesThrough) {
    const HSemaphore entered(0), leave(0);
    const auto block_all = [&] {
        sigset_t all, before;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &before);
        entered.Unlock();
        leave.Lock();
        pthread_sigmask(SIG_SETMASK, &before, nullptr);
        for (;;) pause();
    };
    const auto use_all = [&] {
        for (int number = SIGRTMIN; number <= SIGRTMAX; ++number) signal(number, [](int) {});
        signal(SIGURG, [](int) {});
        entered.Unlock();
        leave.Lock();
    };
    for (const std::function<void()>& run :
         {std::function<void()>(block_all), std::function<void()>(use_all)}) {
        Runner runner(run);
        runner.Start(true);
        entered.Lock();
        std::thread killer = SleepIn([&] { runner.Kill(); });
        EXPECT_TRUE(runner.IsRunning());
        leave.Unlock();
        killer.join();
        EXPECT_FALSE(runner.IsRunning());
    }
}

// Each change of identity signals every thread and waits for all answers.
TEST(HThread, IsKilledBesideChangesOfIdentity) {
    std::atomic<bool> done{false};
    std::thread changer([&] {
        while (!done) EXPECT_EQ(setgid(getgid()), 0);
    });
    const HSemaphore never(0);
    Runner runner([&] { never.Lock(); });
    for (int round = 0; round < 100; ++round) {
        runner.Start(true);
        runner.Kill();
    }
    done = true;
    changer.join();
}

TEST(HThread, TakesItsPriorityWheneverItIsSet) {
    const bool may_raise = setpriority(PRIO_PROCESS, 0, -20) == 0 && setpriority(PRIO_PROCESS, 0, 0) == 0;
    const int own = getpriority(PRIO_PROCESS, 0);  // above 0 under nice
    const int nices[] = {19, 10, 5, 0, -5, -10, -20, 0, 0};
    std::atomic<id_t> number{0};
    const HSemaphore leave(0);
    Runner runner([&] {
        number = static_cast<id_t>(HThread::GetCurrentThreadId());
        leave.Lock();
    });
    for (unsigned int value = 0; value < std::size(nices); ++value) {  // the last two are not priorities
        const auto priority = static_cast<HThreadPriority>(value);
        const int due = may_raise ? nices[value] : std::clamp(own + nices[value], own, 19);
        for (const bool is_set_before : {true, false}) {
            runner.SetPriority(is_set_before ? priority : HThreadPriorityNormal);
            number = 0;
            runner.Start(true);
            runner.SetPriority(priority);
            while (number == 0 || getpriority(PRIO_PROCESS, number) != due) std::this_thread::yield();
            setpriority(PRIO_PROCESS, number, 19);
            runner.SetPriority(priority);  // the one it has: no system call
            EXPECT_EQ(getpriority(PRIO_PROCESS, number), 19);
            leave.Unlock();
            runner.Wait();
        }
    }
}
