// The read-write locks: which threads enter beside which, and the scoped holders. models/memory_model.cpp
// runs their steps in many orders.
#include "zanbase/read_write_mutex.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <sstream>
#include <string>
#include <thread>

#include "support/blocked_thread.h"
#include "support/holder_rules.h"
#include "support/run_in_child.h"
#include "zanbase/thread.h"

namespace {

struct CountingMutex : HReadWriteMutex {
    void ReadLock() const override { ++mnReads; }
    void ReadUnlock() const override { --mnReads; }
    void WriteLock() const override { ++mnWrites; }
    void WriteUnlock() const override { --mnWrites; }
    mutable int mnReads = 0, mnWrites = 0;
};

TEST(ReadWriteHolders, ReleaseBeforeTheyAcquire) {
    CountingMutex first, second;
    ExpectHolderRules<HReaderLock>(first, second, [](const CountingMutex& mutex) { return mutex.mnReads; });
    ExpectHolderRules<HWriterLock>(first, second, [](const CountingMutex& mutex) { return mutex.mnWrites; });
}

template <class Mutex>
void ExpectHeldInChild() {
    const Mutex mutex;
    HWriterLock lock(&mutex);
    const ChildResult child = RunInChild([&] {
        const HWriterLock nested(&mutex);  // deadlocks unless the child's thread holds the lock
        return 7;
    });
    EXPECT_EQ(child.exit_code, 7);
}

TEST(HReadPrefMutex, IsHeldAcrossAFork) { ExpectHeldInChild<HReadPrefMutex>(); }
TEST(HWritePrefMutex, IsHeldAcrossAFork) { ExpectHeldInChild<HWritePrefMutex>(); }

// A thread that makes the calls of its letters: r, R, w, W for ReadLock, ReadUnlock, WriteLock, WriteUnlock.
class Visitor {
public:
    explicit Visitor(const HReadWriteMutex& mutex) : moThread([&] { Run(mutex); }) {}
    ~Visitor() {
        Begin(kEnd);
        moThread.join();
    }

    // Returns when the call has begun.
    void Begin(char call) {
        mnCall = call;
        moTurn.Unlock();
        while (mnCall == call) std::this_thread::yield();
    }
    // Waits until the thread sleeps: in its call, or for the next one.
    bool IsStuck() const {
        AwaitSleepOf(mnId);
        return mnCall != kNone;
    }
    void AwaitReturn() const {
        while (mnCall != kNone) std::this_thread::yield();
    }

private:
    static constexpr char kNone = 0, kBegun = '!', kEnd = '.';

    void Run(const HReadWriteMutex& mutex) {
        mnId = HThread::GetCurrentThreadId();
        for (char call = kNone; call != kEnd; mnCall = kNone) {
            moTurn.Lock();
            call = mnCall.exchange(kBegun);
            if (call == 'r') mutex.ReadLock();
            if (call == 'R') mutex.ReadUnlock();
            if (call == 'w') mutex.WriteLock();
            if (call == 'W') mutex.WriteUnlock();
        }
    }

    const HSemaphore moTurn{0};
    std::atomic<char> mnCall{kNone};
    std::atomic<unsigned long long> mnId{0};
    std::thread moThread;
};

// Plays scenes with the threads a, b and c. "ar": a calls ReadLock, which returns. "bw!": b calls WriteLock and is
// stuck. "b!": b is still stuck. "b.": b's call returns. At the end of each the mutex must be free.
template <class Mutex>
void Play(std::initializer_list<const char*> scenes) {
    for (const std::string scene : scenes) {
        const Mutex mutex;
        std::array<Visitor, 3> visitors{Visitor{mutex}, Visitor{mutex}, Visitor{mutex}};
        std::istringstream steps(scene + " aw aW bw bW");
        for (std::string step; steps >> step;) {
            Visitor& visitor = visitors[static_cast<std::size_t>(step[0] - 'a')];
            const bool calls = step[1] != '!' && step[1] != '.';
            const bool gets_stuck = step.back() == '!';
            if (calls) visitor.Begin(step[1]);
            if (!gets_stuck) visitor.AwaitReturn();
            ASSERT_EQ(visitor.IsStuck(), gets_stuck) << step << " of " << scene;
        }
    }
}

constexpr auto kOutsideUntilTheLastUnlock = {"ar br aR cw! bR c. cW", "aw aw br! aW b! aW b. bR",
                                             "aw aw bw! aW b! aW b. bW"};
constexpr auto kNestedPastAWaitingWriter = {"ar bw! ar b! aR b! aR b. bW"};

TEST(HReadPrefMutex, KeepsOthersOut) { Play<HReadPrefMutex>(kOutsideUntilTheLastUnlock); }
TEST(HWritePrefMutex, KeepsOthersOut) { Play<HWritePrefMutex>(kOutsideUntilTheLastUnlock); }
TEST(HReadPrefMutex, NestsReadLocks) { Play<HReadPrefMutex>(kNestedPastAWaitingWriter); }
TEST(HWritePrefMutex, NestsReadLocks) { Play<HWritePrefMutex>(kNestedPastAWaitingWriter); }
TEST(HReadPrefMutex, AdmitsReadersFirst) { Play<HReadPrefMutex>({"ar bw! cr aR b! cR b. bW"}); }
TEST(HWritePrefMutex, AdmitsWritersFirst) { Play<HWritePrefMutex>({"ar bw! cr! aR b. c! bW c. cR"}); }
TEST(HReadPrefMutex, DowngradesAndBack) {
    Play<HReadPrefMutex>({"aw ar aW bw! cr cR b! aR b. bW", "aw ar cr aW bw! aR b! cR b. bW",
                          "aw ar aR bw! aW b. cr! bW c. cR"});
}

}  // namespace
