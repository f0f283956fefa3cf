// Which signals count, what a pass may go through, and the end of the worker.
#include "zanbase/hibernate_thread.h"

#include <gtest/gtest.h>

#include <csignal>
#include <functional>
#include <stdexcept>
#include <thread>

#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "zanbase/sleep.h"

namespace {

struct Worker : HHibernateThread {
    Worker(std::function<void()> pass = [] {}) : moPass(std::move(pass)) {}

    // Returns when the worker has begun this many passes, ended the last one, and sleeps.
    void AwaitSleepAfter(int passes) const {
        while (mnPasses != passes || IsProcessing()) std::this_thread::yield();
        AwaitSleepOf(mnNumber);
        EXPECT_EQ(mnPasses, passes);
    }

    void Process() override {
        mnNumber = GetCurrentThreadId();
        moThread = pthread_self();
        ++mnPasses;
        moPass();
    }

    std::function<void()> moPass;
    std::atomic<int> mnPasses{0};  // begun
    std::atomic<unsigned long long> mnNumber{0};
    std::atomic<pthread_t> moThread{};
};

const HSemaphore parked(0), leave(0);

// Holds a thread, asleep or not, in a signal handler until `leave` is given.
void Park(pthread_t thread) {
    std::signal(SIGUSR1, [](int) {
        parked.Unlock();
        leave.Lock();
    });
    pthread_kill(thread, SIGUSR1);
    parked.Lock();
}

TEST(HHibernateThread, CountsSignalsOnlyWhileItHibernates) {
    const HSemaphore entered(0), go_on(0);
    Worker worker([&] {
        entered.Unlock();
        go_on.Lock();
    });
    EXPECT_TRUE(worker.IsProcessing());
    EXPECT_FALSE(worker.Signal());
    EXPECT_TRUE(worker.Start(true));
    for (const int passes : {2, 3}) {
        for (int pass = 0; pass < passes; ++pass) {
            entered.Lock();
            EXPECT_TRUE(worker.IsProcessing());
            EXPECT_FALSE(worker.Signal());
            go_on.Unlock();
        }
        worker.AwaitSleepAfter(passes == 2 ? 2 : 5);
        if (passes == 3) break;
        Park(worker.moThread);
        for (int i = 0; i < 3; ++i) EXPECT_TRUE(worker.Signal());
        leave.Unlock();
    }
}

TEST(HHibernateThread, SurvivesWhatGoesWrongInAPass) {
    const ChildResult child = RunInChild([] {
        Worker worker([&] {
            if (worker.mnPasses == 1) throw std::runtime_error("bad luck");
            if (worker.mnPasses == 2) throw 7;
            worker.mnPasses == 3 ? WriteToNull() : UseUpStack();
        });
        worker.Start(true);
        for (int passes = 2; passes <= 4; ++passes) {
            worker.AwaitSleepAfter(passes);
            if (passes < 4 && !worker.Signal()) return 1;
        }
        return 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    const std::string unknown = "HHibernateThread::Run() Unknown exception.\n";
    EXPECT_EQ(child.out,
              "HHibernateThread::Run() Uncaught exception: bad luck\n" + unknown + unknown + unknown);
}

TEST(HHibernateThread, EndsWithItsObjectByPolling) {
    static int polls = 0, passes = 0;
    InstallUSleepHook([](int microseconds) {
        EXPECT_EQ(microseconds, 1000);
        if (++polls == 3) leave.Unlock();
    });
    { const Worker never_started; }
    EXPECT_EQ(polls, 0);
    {
        Worker worker([] { ++passes; });
        worker.Start(true);
        worker.AwaitSleepAfter(2);
        Park(worker.moThread);
    }
    EXPECT_GE(polls, 3);
    EXPECT_EQ(passes, 2);
}

}  // namespace
