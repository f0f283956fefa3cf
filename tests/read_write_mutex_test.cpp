// Who gets in beside whom, for both kinds, and the orders of the scoped holders.
#include "zanbase/read_write_mutex.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <sstream>
#include <string>
#include <thread>

#include "support/blocked_thread.h"
#include "zanbase/thread.h"

namespace {

void Call(const HReadWriteMutex& mutex, char call) {
    if (call == 'r') mutex.ReadLock();
    if (call == 'R') mutex.ReadUnlock();
    if (call == 'w') mutex.WriteLock();
    if (call == 'W') mutex.WriteUnlock();
}

// A thread that makes the calls it is told.
class Visitor {
public:
    explicit Visitor(const HReadWriteMutex& mutex) : mThread([&] { Run(mutex); }) {}
    ~Visitor() {
        Begin('.');
        mThread.join();
    }
    void Begin(char call) {
        const int begun = mBegun;
        mCall = call;
        mTurn.Unlock();
        while (mBegun == begun) std::this_thread::yield();
    }
    void AwaitEnd() const {
        while (mMade != mBegun) std::this_thread::yield();
    }
    bool IsStuck() const {
        AwaitSleepOf(mNumber);
        return mMade != mBegun;
    }

private:
    void Run(const HReadWriteMutex& mutex) {
        mNumber = HThread::GetCurrentThreadId();
        for (char call = 0; call != '.'; ++mMade) {
            mTurn.Lock();
            call = mCall;
            ++mBegun;
            Call(mutex, call);
        }
    }

    const HSemaphore mTurn{0};
    char mCall = 0;  // handed over with the turn
    std::atomic<int> mBegun{0}, mMade{0};
    std::atomic<unsigned long long> mNumber{0};
    std::thread mThread;
};

// Plays scenes with the threads a, b and c. "ar": a calls ReadLock, which returns. "bw!": b calls WriteLock
// and is stuck. "b!": b is still stuck. "b.": b's call returns. After each scene the mutex must be free.
template <class Mutex>
void Play(std::initializer_list<const char*> scenes) {
    for (const std::string scene : scenes) {
        SCOPED_TRACE(scene);
        const Mutex mutex;
        std::array<Visitor, 3> visitors{Visitor{mutex}, Visitor{mutex}, Visitor{mutex}};
        std::istringstream steps(scene + " aw aW bw bW");
        for (std::string step; steps >> step;) {
            Visitor& visitor = visitors[static_cast<std::size_t>(step[0] - 'a')];
            if (step[1] != '!' && step[1] != '.') visitor.Begin(step[1]);
            if (step.back() != '!') visitor.AwaitEnd();
            ASSERT_EQ(visitor.IsStuck(), step.back() == '!') << step;
        }
    }
}

TEST(ReadWriteMutexes, KeepOthersOutUntilTheLastUnlock) {
    const auto scenes = {"ar ar bw! ar b! aR b! aR b! aR b. bW",  // the third nests behind a waiting writer
                         "aw aw br! aW b! aW b. bR", "aw aw bw! aW b! aW b. bW", "ar br aR cw! bR c. cW"};
    Play<HReadPrefMutex>(scenes);
    Play<HWritePrefMutex>(scenes);
}

TEST(ReadWriteMutexes, DifferInWhoGoesFirst) {
    Play<HReadPrefMutex>({"ar bw! cr aR b! cR b. bW"});
    Play<HWritePrefMutex>({"ar bw! cr! aR b. c! bW c. cR"});
}

TEST(HReadPrefMutex, DowngradesFromWritingToReading) {
    Play<HReadPrefMutex>({"aw ar aW bw! cr cR b! aR b. bW", "aw ar cr aW bw! aR b! cR b. bW",
                          "aw ar aR bw! aW b. cr! bW c. cR"});
}

class NotingMutex : public HReadWriteMutex {
public:
    void ReadLock() const override { mCalls += "r"; }
    void ReadUnlock() const override { mCalls += "R"; }
    void WriteLock() const override { mCalls += "w"; }
    void WriteUnlock() const override { mCalls += "W"; }
    mutable std::string mCalls;
};

template <class Holder>
std::string CallsOf() {
    const NotingMutex mutex;
    {
        Holder none(nullptr);
        none.Release();
        Holder lock = &mutex;
        Holder copy = lock;
        lock.Release();
        lock.Release();
        lock = copy;
        Holder& same = lock;
        lock = same;
        lock = none;
        copy.Reset(&mutex);
    }
    return mutex.mCalls;
}

TEST(Holders, GiveBackBeforeTheyTake) {
    EXPECT_EQ(CallsOf<HReaderLock>(), "rrRrRrRRrR");
    EXPECT_EQ(CallsOf<HWriterLock>(), "wwWwWwWWwW");
}

}  // namespace
