// Start, end, restart, kill, priority and faults of threads.
#include "zanbase/thread.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/resource.h>

#include <algorithm>
#include <sstream>
#include <stdexcept>
#include <thread>
#include <vector>

#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"

// A killed thread's list of thread-local destructors leaks; thread.h documents it.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }
extern "C" __attribute__((weak)) void __tsan_init();  // defined under the thread sanitizer

TEST(HThread, RunsOnceForEachStart) {
    const HSemaphore leave(0);
    int runs = 0;
    Runner runner([&] {
        runner.Wait();  // on the thread itself it returns
        leave.Lock();
        ++runs;
    });
    for (const bool argument : {true, false}) {
        EXPECT_TRUE(runner.Start(argument));
        EXPECT_FALSE(runner.Start(argument));
        EXPECT_FALSE(Runner(runner).IsRunning());
        leave.Unlock();
        runner.Wait();
        EXPECT_FALSE(runner.IsRunning());
    }
    EXPECT_EQ(runs, 2);
}

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

TEST(HThread, PrintsHowItEndedAndCanBeStartedAgain) {
    static Runner* current = nullptr;
    struct End {
        const char* name;
        void (*run)();
        std::string line;
    };
    const std::string unknown = "HThread::_Run_() Unknown exception.\n";
    const End ends[] = {
        {"return", [] {}, ""},
        {"exception", [] { throw std::runtime_error("bad"); }, "HThread::_Run_() Uncaught exception: bad\n"},
        {"number", [] { throw 7; }, unknown},
        {"null", WriteToNull, unknown},
        {"division", DivideByZero, unknown},
        {"instruction", RunIllegalInstruction, unknown},
        {"stack", UseUpStack, unknown},
        {"pthread_exit", [] { pthread_exit(nullptr); }, ""},
        {"kill", [] { current->Kill(); }, ""},
    };
    for (const End& end : ends) {
        const ChildResult child = RunInChild([&] {
            Runner runner(end.run);
            current = &runner;
            for (int round = 0; round < 3; ++round) runner.RunToEnd();
            Runner([] {}).RunToEnd();  // reaps the thread that killed itself
            return runner.IsRunning() ? 1 : 0;
        });
        EXPECT_EQ(child.exit_code, 0) << end.name << child.err;
        EXPECT_EQ(child.out, end.line + end.line + end.line) << end.name;
    }
}

TEST(HThread, LeavesAbortToTheProcess) {
    const ChildResult child = RunInChild([] {
        Runner([] { std::abort(); }).RunToEnd();
        return 0;
    });
    EXPECT_EQ(child.signal, SIGABRT);
}

// Counts when it is destroyed, after some time.
struct Trace {
    std::atomic<int>& count;
    ~Trace() {
        for (int i = 0; i < 100; ++i) std::this_thread::yield();
        ++count;
    }
};

TEST(HThread, IsAwaitedWithItsTlsDestructorsAndRunsNoneWhenKilled) {
    static std::atomic<int> gone{0};
    pthread_key_t key{};
    pthread_key_create(&key, [](void*) { ++gone; });
    const HMutex mutex;
    const HSemaphore entered(0), leave(0);
    Runner runner([&] {
        EXPECT_EQ(pthread_getspecific(key), nullptr);  // though a killed thread had the same stack
        const Trace frame{gone};
        thread_local const Trace local{gone};
        pthread_setspecific(key, &local);
        const HMutexLock lock(&mutex);
        entered.Unlock();
        leave.Lock();
    });
    for (const bool kills : {false, true}) {
        gone = 0;
        runner.Start(true);
        entered.Lock();
        // Under the thread sanitizer a killed thread returns, with its TLS destructors.
        const int due = !kills ? 3 : __tsan_init != nullptr ? 2 : 0;
        std::vector<std::thread> waiters;
        for (int i = 0; i < 3; ++i) {
            std::atomic<unsigned long long> number{0};
            waiters.emplace_back([&] {
                number = HThread::GetCurrentThreadId();
                runner.Wait();
                EXPECT_EQ(gone, due);
            });
            while (number == 0) std::this_thread::yield();
            AwaitSleepOf(number);
        }
        kills ? runner.Kill() : leave.Unlock();
        for (std::thread& waiter : waiters) waiter.join();
        EXPECT_FALSE(runner.IsRunning());
        EXPECT_EQ(mutex.TryLock(), !kills);
        if (!kills) mutex.Unlock();
    }
}

TEST(HThread, RunsOnDetachedWhileItsObjectOwnsAnother) {
    const HSemaphore left(0), leave[2] = {0, 0};
    std::atomic<int> runs{0};
    Runner runner([&] {
        leave[runs++].Lock();
        left.Unlock();
    });
    for (int threads = 1; threads <= 2; ++threads) {
        runner.DestroyThread();
        EXPECT_FALSE(runner.IsRunning());
        EXPECT_TRUE(runner.Start(true));
        while (runs < threads) std::this_thread::yield();
    }
    leave[0].Unlock();
    left.Lock();
    EXPECT_TRUE(runner.IsRunning());  // the end of the first thread has left the second alone
    leave[1].Unlock();
    runner.Wait();
}

TEST(HThread, TakesItsPriorityWheneverItIsSet) {
    const bool may_raise = setpriority(PRIO_PROCESS, 0, -20) == 0 && setpriority(PRIO_PROCESS, 0, 0) == 0;
    const int nices[] = {19, 10, 5, 0, -5, -10, -20, 0, 0};
    std::atomic<id_t> number{0};
    const HSemaphore leave(0);
    Runner runner([&] {
        number = static_cast<id_t>(HThread::GetCurrentThreadId());
        leave.Lock();
    });
    for (unsigned int step = 0; step < 18; ++step) {
        const auto priority = static_cast<HThreadPriority>(step / 2);
        runner.SetPriority(step % 2 == 0 ? priority : HThreadPriorityNormal);
        number = 0;
        runner.Start(true);
        runner.SetPriority(priority);
        const int due = may_raise ? nices[priority] : std::max(nices[priority], 0);
        while (number == 0 || getpriority(PRIO_PROCESS, number) != due) std::this_thread::yield();
        setpriority(PRIO_PROCESS, number, 19);
        runner.SetPriority(priority);  // the one it has: no system call
        EXPECT_EQ(getpriority(PRIO_PROCESS, number), 19);
        leave.Unlock();
        runner.Wait();
    }
}
