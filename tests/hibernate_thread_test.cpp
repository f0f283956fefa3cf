// Which signals are accepted, what a pass may do, and the end of the worker.
#include "zanbase/hibernate_thread.h"

#include <gtest/gtest.h>

#include <functional>
#include <stdexcept>
#include <thread>

#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "zanbase/sleep.h"

struct Worker : HHibernateThread {
    Worker(std::function<void(int)> pass) : moPass(std::move(pass)) {}

    // Returns when the worker has made this many passes and sleeps.
    void AwaitSleepAfter(int passes) const {
        while (mnPasses != passes || IsProcessing()) std::this_thread::yield();
        AwaitSleepOf(mnNumber);
        EXPECT_EQ(mnPasses, passes);
    }

    void Process() override {
        mnNumber = GetCurrentThreadId();
        moPass(++mnPasses);
    }

    std::function<void(int)> moPass;
    std::atomic<int> mnPasses{0};  // begun
    std::atomic<unsigned long long> mnNumber{0};
};

TEST(HHibernateThread, AcceptsNoSignalDuringAPass) {
    const HSemaphore entered(0), go_on(0);
    Worker worker([&](int) {
        entered.Unlock();
        go_on.Lock();
    });
    worker.Start(true);
    for (int pass = 1; pass <= 2; ++pass) {
        entered.Lock();
        EXPECT_TRUE(worker.IsProcessing());
        EXPECT_FALSE(worker.Signal());
        go_on.Unlock();
    }
    worker.AwaitSleepAfter(2);
}

TEST(HHibernateThread, SurvivesExceptionsAndFaultsInAPass) {
    const ChildResult child = RunInChild([] {
        Worker worker([](int pass) {
            if (pass == 1) throw std::runtime_error("bad luck");
            if (pass == 2) throw 7;
            if (pass == 3) WriteToNull();
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
    EXPECT_EQ(child.out, "HHibernateThread::Run() Uncaught exception: bad luck\n" + unknown + unknown);
}

TEST(HHibernateThread, EndsWithItsObjectByPolling) {
    static int polls = 0, passes = 0;
    static unsigned long long held = 0;
    InstallUSleepHook([](int microseconds) {
        EXPECT_EQ(microseconds, 1000);
        if (++polls == 3) ReleaseThread(held);
    });
    {
        const Worker never_started([](int) {});
    }
    EXPECT_EQ(polls, 0);
    {
        Worker worker([](int pass) { passes = pass; });
        worker.Start(true);
        worker.AwaitSleepAfter(2);
        held = worker.mnNumber;
        HoldThread(held);
    }
    EXPECT_GE(polls, 3);
    EXPECT_EQ(passes, 2);
}
