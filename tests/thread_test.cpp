// Start, end, restart, kill and faults of threads.
#include "zanbase/thread.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>

#include "support/environment.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/semaphore.h"

// A killed thread's list of thread-local destructors leaks; thread.h documents it.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }

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

struct Loud {
    ~Loud() { std::puts("destroyed"); }
};

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
        {"object", [] { throw Loud(); }, unknown + "destroyed\n"},
        {"null", WriteToNull, unknown},
        {"division", DivideByZero, unknown},
        {"instruction", RunIllegalInstruction, unknown},
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

TEST(HThread, SurvivesAnExhaustedStack) {
    if (!kExhaustedStackIsAFault) GTEST_SKIP() << "the process ends here";
    const ChildResult child = RunInChild([] {
        Runner runner(UseUpStack);
        for (int round = 0; round < 3; ++round) runner.RunToEnd();
        return runner.IsRunning() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    const std::string unknown = "HThread::_Run_() Unknown exception.\n";
    EXPECT_EQ(child.out, unknown + unknown + unknown);
}

TEST(HThread, RunsOnDetachedWhileItsObjectOwnsAnother) {
    const HSemaphore left(0), leave[3] = {0, 0, 1};
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
    Runner::_Run_(&runner);           // waits for nothing: the third of the runs
    EXPECT_FALSE(runner.IsRunning());
    leave[1].Unlock();
    left.Lock();
    left.Lock();
}
