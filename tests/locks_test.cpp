// The locks one at a time: limits, units, levels, who gets in beside whom, and the scoped holders. What they
// pass on is the platform's, see platform_test.cpp; locks_stress.cpp has them under many threads.
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cmath>
#include <deque>
#include <sstream>
#include <thread>

#include "locks/milliseconds.h"
#include "support/blocked_thread.h"
#include "support/environment.h"
#include "support/runner.h"
#include "zanbase/condition_variable.h"
#include "zanbase/read_write_mutex.h"

namespace {

TEST(MillisecondsIn, CutsAndNeverLeavesTheRange) {
    const std::pair<double, unsigned int> cases[] = {
        {0.0009, 0},          {1.9999, 1999}, {4294967.0, 4294967000}, {4294967.5, kForever},
        {HUGE_VAL, kForever}, {-0.5, 0},      {-HUGE_VAL, 0},          {std::nan(""), 0}};
    for (const auto& [seconds, result] : cases) EXPECT_EQ(MillisecondsIn(seconds), result) << seconds;
}

// The units that nobody holds, all taken and given back.
int FreeUnits(const HSemaphore& semaphore) {
    if (!semaphore.TryLock(0.0)) return 0;
    const int units = 1 + FreeUnits(semaphore);
    semaphore.Unlock();
    return units;
}

// The levels that this thread has, all given back and taken again.
int LevelsOf(const HMutex& mutex) {
    bool is_free = false;
    std::thread([&] { is_free = mutex.TryLock() && (mutex.Unlock(), true); }).join();
    if (is_free) return 0;
    mutex.Unlock();
    const int levels = 1 + LevelsOf(mutex);
    mutex.Lock();
    return levels;
}

// A wait lets go of one level for its length, and so does assigning a holder to itself for a moment.
TEST(HMutexLock, LetsAWaiterInByGivingBackItsOnlyLevel) {
    for (const bool by_condition : {false, true}) {
        const HMutex mutex;
        const HCondVar condition;
        HMutexLock lock, &same = lock;
        lock.Reset(&mutex);
        HMutexLock deeper = lock;
        std::atomic<bool> entered{false};
        std::thread other([&] {
            const HMutexLock mine(&mutex);
            entered = true;
            condition.Signal();
        });
        EXPECT_FALSE(condition.TryWait(mutex, 0.01));
        EXPECT_FALSE(entered);
        deeper.Release();
        while (!entered && !by_condition) lock = same;
        while (!entered) EXPECT_TRUE(condition.TryWait(mutex, 1e9));
        EXPECT_FALSE(condition.TryWait(mutex, 0.0));
        EXPECT_TRUE(LevelsOf(mutex) == 1 && lock.GetMutex() == &mutex && deeper.GetMutex() == nullptr);
        lock.Release();
        other.join();
    }
}

struct Units {
    void Take(double limit) { EXPECT_TRUE(moSemaphore.TryLock(limit)); }
    void Give() { moSemaphore.Unlock(); }
    HSemaphore moSemaphore{0};
};

struct Items {
    void Take(double limit) {
        const HMutexLock lock(&moMutex);
        while (mnItems == 0) EXPECT_TRUE(moCondition.TryWait(moMutex, limit));
        --mnItems;
    }
    void Give() {
        const HMutexLock lock(&moMutex);
        ++mnItems;
        moCondition.Signal();
    }
    HMutex moMutex;
    HCondVar moCondition;
    int mnItems = 0;  // guarded by moMutex
};

// Three wait; the first is ended, asleep or waking up for a gift. That may be gone with it, but two more must do
// for the other two.
template <class Source>
void ExpectOthersServed(bool gives_before) {
    for (int round = 0; round < 200; ++round) {
        Source source;
        const double limit = round % 4 < 2 ? 1e6 : 1e300;
        std::deque<Runner> waiters;
        for (int waiter = 0; waiter < 3; ++waiter) {
            std::atomic<unsigned long long> number{0};
            waiters.emplace_back([&] { number = HThread::GetCurrentThreadId(), source.Take(limit); });
            waiters.back().Start(true);
            while (number == 0) std::this_thread::yield();
            AwaitSleepOf(number);
        }
        if (gives_before && round % 2 == 0) source.Give();
        waiters[0].Kill();
        for (int other = 1; other < 3; ++other) source.Give();
        for (Runner& waiter : waiters) waiter.Wait();
    }
}

TEST(KilledWaiters, TakeNoUnitFromTheOthers) { ExpectOthersServed<Units>(true); }

TEST(KilledWaiters, TakeNoWakeUpFromTheOthers) {
    if (!kConditionOutlivesKills) GTEST_SKIP() << "not promised on this system";
    ExpectOthersServed<Items>(false);  // a thread that is ended with the mutex would keep it
}

std::string calls;  // of all that follow

struct NotingMutex : HReadWriteMutex {
    void ReadLock() const override { calls += "r", ++mnHeld; }
    void ReadUnlock() const override { calls += "R", --mnHeld; }
    void WriteLock() const override { calls += "w", ++mnHeld; }
    void WriteUnlock() const override { calls += "W", --mnHeld; }
    mutable int mnHeld = 0;
};

// A holder has one of what it holds, which is given back before another is taken.
template <class Holder, class Lock, class Held, class... Units>
void ExpectRules(Held held, Units... units) {
    Lock first{units...}, second{units...};
    Holder none(nullptr);
    none.Release();
    {
        Holder lock = &first, copy = lock, &same = lock;
        lock = same;
        EXPECT_EQ(held(first), 2);
        lock.Release();
        lock.Release();
        EXPECT_EQ(held(first), 1);
        lock = copy;
        EXPECT_EQ(held(first), 2);
        copy.Reset(&second);
        EXPECT_TRUE(held(first) == 1 && held(second) == 1);
        copy = none;
        EXPECT_EQ(held(second), 0);
    }
    EXPECT_EQ(held(first), 0);
}

TEST(Holders, GiveBackBeforeTheyTake) {
    const auto noted = [](const NotingMutex& mutex) { return mutex.mnHeld; };
    ExpectRules<HReaderLock, NotingMutex>(noted);
    ExpectRules<HWriterLock, NotingMutex>(noted);
    EXPECT_EQ(calls, "rrRrRrRrRRwwWwWwWwWW");
    const auto taken = [](const HSemaphore& semaphore) { return 2 - FreeUnits(semaphore); };
    EXPECT_EQ(FreeUnits(HSemaphore()), 1);
    ExpectRules<HSemaphoreLock, HSemaphore>(taken, 2U);
    ExpectRules<HMutexLock, HMutex>(LevelsOf);
}

// A thread that makes the calls it is told.
struct Visitor {
    explicit Visitor(const HReadWriteMutex& mutex) : moThread([&] { Run(mutex); }) {}
    ~Visitor() { Begin('.'), moThread.join(); }
    void Begin(char call) {
        mnCall = call;
        moTurn.Unlock();
        while (mnCall == call) std::this_thread::yield();
    }
    void Run(const HReadWriteMutex& mutex) {
        mnNumber = HThread::GetCurrentThreadId();
        for (char call = 0; call != '.'; mnCall = 0) {
            moTurn.Lock();
            call = mnCall.exchange('!');
            if (call == 'r') mutex.ReadLock();
            if (call == 'R') mutex.ReadUnlock();
            if (call == 'w') mutex.WriteLock();
            if (call == 'W') mutex.WriteUnlock();
        }
    }
    const HSemaphore moTurn{0};
    std::atomic<char> mnCall{0};  // as told, then '!' while it is made, then 0
    std::atomic<unsigned long long> mnNumber{0};
    std::thread moThread;
};

// Plays scenes with the threads a, b and c. "ar": a calls ReadLock, which returns. "bw!": b calls WriteLock
// and is stuck. "b!": b is still stuck. "b.": b's call returns. After each scene the mutex must be free.
template <class Mutex>
void Play(std::initializer_list<const char*> scenes) {
    for (const std::string scene : scenes) {
        const Mutex mutex;
        std::array<Visitor, 3> visitors{Visitor{mutex}, Visitor{mutex}, Visitor{mutex}};
        std::istringstream steps(scene + " aw aW bw bW");
        for (std::string step; steps >> step;) {
            Visitor& visitor = visitors[static_cast<std::size_t>(step[0] - 'a')];
            if (step[1] != '!' && step[1] != '.') visitor.Begin(step[1]);
            while (step.back() != '!' && visitor.mnCall != 0) std::this_thread::yield();
            AwaitSleepOf(visitor.mnNumber);
            ASSERT_EQ(visitor.mnCall != 0, step.back() == '!') << step << " of " << scene;
        }
    }
}

TEST(ReadWriteMutexes, KeepOthersOutAndDifferInWhoGoesFirst) {
    const auto scenes = {"ar ar bw! ar b! aR b! aR b! aR b. bW",  // the third nests behind a waiting writer
                         "aw aw br! aW b! aW b. bR", "aw aw bw! aW b! aW b. bW", "ar br aR cw! bR c. cW"};
    Play<HReadPrefMutex>(scenes);
    Play<HWritePrefMutex>(scenes);
    Play<HReadPrefMutex>({"ar bw! cr aR b! cR b. bW"});
    Play<HWritePrefMutex>({"ar bw! cr! aR b. c! bW c. cR"});
    // The writer reads too, and goes on as a reader or as a writer, beside the readers that it has let in.
    Play<HReadPrefMutex>({"aw ar aW bw! cr cR b! aR b. bW", "aw ar cr aW bw! aR b! cR b. bW",
                          "aw ar aR bw! aW b. cr! bW c. cR"});
}

}  // namespace
