// Which signals count, what a pass may go through, and the end of the worker.
#include "zanbase/hibernate_thread.h"

#include <gtest/gtest.h>

#include <csignal>
#include <functional>
#include <stdexcept>
#include <thread>
#include <utility>
#include <vector>

#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "zanbase/sleep.h"

namespace {

// What stays of a worker when it is gone.
struct Record {
    std::atomic<int> passes{0};  // begun
    std::atomic<unsigned long long> number{0};
    std::atomic<pthread_t> thread{};
};

class Worker : public HHibernateThread {
public:
    Worker(
        Record& record, std::function<void(int)> pass = [](int) {})
        : mrRecord(record), moPass(std::move(pass)) {}

    // Returns when the worker has begun this many passes, ended the last one, and sleeps.
    void AwaitSleepAfter(int passes) const {
        while (mrRecord.passes != passes || IsProcessing()) std::this_thread::yield();
        AwaitSleepOf(mrRecord.number);
        EXPECT_EQ(mrRecord.passes, passes);
    }

private:
    void Process() override {
        mrRecord.number = GetCurrentThreadId();
        mrRecord.thread = pthread_self();
        moPass(++mrRecord.passes);
    }

    Record& mrRecord;
    std::function<void(int)> moPass;
};

HSemaphore parked(0), leave(0);

// Holds a thread, asleep or not, in a signal handler until `leave` is given.
void Park(pthread_t thread) {
    std::signal(SIGUSR1, [](int) {
        parked.Unlock();
        leave.Lock();
    });
    pthread_kill(thread, SIGUSR1);
    parked.Lock();
}

TEST(HHibernateThread, MakesTwoPassesUnasked) {
    Record record;
    Worker worker(record);
    EXPECT_TRUE(worker.IsProcessing());
    EXPECT_FALSE(worker.Signal());
    EXPECT_TRUE(worker.Start(true));
    worker.AwaitSleepAfter(2);
    EXPECT_FALSE(worker.IsProcessing());
}

TEST(HHibernateThread, CountsTheSignalsItAccepts) {
    Record record;
    Worker worker(record);
    worker.Start(true);
    worker.AwaitSleepAfter(2);
    Park(record.thread);
    for (int i = 0; i < 3; ++i) EXPECT_TRUE(worker.Signal());
    leave.Unlock();
    worker.AwaitSleepAfter(5);
    std::atomic<int> accepted{0};
    std::vector<std::thread> senders;
    for (int i = 0; i < 3; ++i) {
        senders.emplace_back([&] {
            for (int round = 0; round < 1000; ++round)
                if (worker.Signal()) ++accepted;
        });
    }
    for (std::thread& sender : senders) sender.join();
    worker.AwaitSleepAfter(5 + accepted);
}

TEST(HHibernateThread, DropsSignalsDuringAPass) {
    Record record;
    HSemaphore entered(0), go_on(0);
    Worker worker(record, [&](int) {
        entered.Unlock();
        go_on.Lock();
    });
    worker.Start(true);
    for (int pass = 0; pass < 2; ++pass) {
        entered.Lock();
        EXPECT_TRUE(worker.IsProcessing());
        EXPECT_FALSE(worker.Signal());
        go_on.Unlock();
    }
    worker.AwaitSleepAfter(2);
}

TEST(HHibernateThread, SurvivesWhatGoesWrongInAPass) {
    const ChildResult child = RunInChild([] {
        Record record;
        Worker worker(record, [](int pass) {
            if (pass == 1) throw std::runtime_error("bad luck");
            if (pass == 2) throw 7;
            if (pass == 3) WriteToNull();
            if (pass == 4) UseUpStack();
        });
        worker.Start(true);
        for (int passes = 2; passes < 6; ++passes) {
            worker.AwaitSleepAfter(passes);
            if (!worker.Signal()) return 1;
        }
        worker.AwaitSleepAfter(6);
        return 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.err;
    const std::string unknown = "HHibernateThread::Run() Unknown exception.\n";
    EXPECT_EQ(child.out,
              "HHibernateThread::Run() Uncaught exception: bad luck\n" + unknown + unknown + unknown);
}

int polls = 0;

TEST(HHibernateThread, EndsWithItsObjectByPolling) {
    InstallUSleepHook([](int microseconds) {
        EXPECT_EQ(microseconds, 1000);
        if (++polls == 3) leave.Unlock();
    });
    Record record;
    { const Worker never_started(record); }
    EXPECT_EQ(polls, 0);
    {
        Worker worker(record);
        worker.Start(true);
        worker.AwaitSleepAfter(2);
        Park(record.thread);
    }
    EXPECT_GE(polls, 3);
    EXPECT_EQ(record.passes, 2);
    {
        Worker killed(record);
        killed.Start(true);
        killed.AwaitSleepAfter(4);
        killed.Kill();
    }
    EXPECT_EQ(record.passes, 4);
}

}  // namespace
