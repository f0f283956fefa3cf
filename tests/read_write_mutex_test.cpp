// Who gets in beside whom, for both kinds, and the orders of the scoped holders.
#include "zanbase/read_write_mutex.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cctype>
#include <sstream>
#include <string>
#include <thread>

#include "support/blocked_thread.h"
#include "zanbase/semaphore.h"
#include "zanbase/thread.h"

namespace {

// A thread that makes the calls it is told: r, R, w, W for ReadLock, ReadUnlock, WriteLock, WriteUnlock.
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
    void AwaitEnd() {
        while (mMade != mBegun) std::this_thread::yield();
    }
    bool IsStuck() {
        AwaitSleepOf(mNumber);
        return mMade != mBegun;
    }

private:
    void Run(const HReadWriteMutex& mutex) {
        mNumber = HThread::GetCurrentThreadId();
        for (;;) {
            mTurn.Lock();
            const char call = mCall;
            ++mBegun;
            if (call == '.') return;
            if (call == 'r') mutex.ReadLock();
            if (call == 'R') mutex.ReadUnlock();
            if (call == 'w') mutex.WriteLock();
            if (call == 'W') mutex.WriteUnlock();
            ++mMade;
        }
    }

    const HSemaphore mTurn{0};
    char mCall = 0;  // handed over with the turn
    std::atomic<int> mBegun{0}, mMade{0};
    std::atomic<unsigned long long> mNumber{0};
    std::thread mThread;
};

// Plays a scene with the threads a, b and c. "ar": a calls ReadLock, which returns. "bw!": b calls WriteLock
// and is stuck. "b!": b is still stuck. "b.": b's call returns. After the scene the mutex must be free.
template <class Mutex>
void Play(const std::string& scene) {
    SCOPED_TRACE(scene);
    const Mutex mutex;
    std::array<Visitor, 3> visitors{Visitor{mutex}, Visitor{mutex}, Visitor{mutex}};
    std::istringstream steps(scene + " aw aW bw bW");
    for (std::string step; steps >> step;) {
        Visitor& visitor = visitors[static_cast<std::size_t>(step[0] - 'a')];
        if (std::isalpha(step[1]) != 0) visitor.Begin(step[1]);
        if (step.back() == '!') {
            ASSERT_TRUE(visitor.IsStuck()) << step;
        } else {
            visitor.AwaitEnd();
        }
    }
}

TEST(ReadWriteMutexes, NestAndKeepOthersOutUntilTheLastUnlock) {
    for (const char* scene :
         {"ar ar bw! ar b! aR b! aR b! aR b. bW",  // the third is behind a waiting writer
          "aw aw br! aW b! aW b. bR", "aw aw bw! aW b! aW b. bW", "ar br aR cw! bR c. cW"}) {
        Play<HReadPrefMutex>(scene);
        Play<HWritePrefMutex>(scene);
    }
}

TEST(HReadPrefMutex, LetsReadersPastAWaitingWriter) { Play<HReadPrefMutex>("ar bw! cr aR b! cR b. bW"); }

TEST(HWritePrefMutex, LetsAWaitingWriterPastNewReaders) {
    Play<HWritePrefMutex>("ar bw! cr! aR b. c! bW c. cR");
}

TEST(HReadPrefMutex, DowngradesFromWritingToReading) {
    Play<HReadPrefMutex>("aw ar aW bw! cr cR b! aR b. bW");
    Play<HReadPrefMutex>("aw ar cr aW bw! aR b! cR b. bW");
    Play<HReadPrefMutex>("aw ar aR bw! aW b. cr! bW c. cR");
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
        mutex.mCalls += " ";
        lock = none;
        copy.Reset(&mutex);
        mutex.mCalls += " ";
    }
    return mutex.mCalls;
}

TEST(Holders, GiveBackBeforeTheyTake) {
    EXPECT_EQ(CallsOf<HReaderLock>(), "rrRrRr RRr R");
    EXPECT_EQ(CallsOf<HWriterLock>(), "wwWwWw WWw W");
}

}  // namespace
