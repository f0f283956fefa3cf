// The lockables: who holds them, and guards that are released early. clang's analysis of them is in package/headers.sh.
#include <gtest/gtest.h>

#include <thread>

#include "support/run_in_child.h"
#include "zanbase/adapters/lockable.h"

namespace {

template <class Ask>
bool AnswerOfAnother(Ask ask) {
    bool answer = false;
    std::thread([&] { answer = ask(); }).join();
    return answer;
}

TEST(Lockable, KnowsWhichThreadOwnsIt) {
    HLockable mutex;
    const auto owns = [&] { return HLockOwner::Owns(mutex.GetMutex()); };
    EXPECT_FALSE(owns());
    mutex.lock();
    mutex.lock();
    mutex.unlock();
    EXPECT_TRUE(owns());
    EXPECT_FALSE(AnswerOfAnother(owns));
    mutex.unlock();
    EXPECT_FALSE(owns());
}

template <class Kind>
void ExpectReaderAndWriterKnown() {
    const Kind mutex;
    const auto reads = [&] { return HLockOwner::Reads(mutex); };
    const auto writes = [&] { return HLockOwner::Writes(mutex); };
    mutex.ReadLock();
    EXPECT_TRUE(reads());
    EXPECT_FALSE(writes());
    EXPECT_FALSE(AnswerOfAnother(reads));
    mutex.ReadUnlock();
    EXPECT_FALSE(reads());
    mutex.WriteLock();
    EXPECT_TRUE(writes());
    EXPECT_FALSE(AnswerOfAnother(writes));
    mutex.WriteUnlock();
    EXPECT_FALSE(writes());
}

TEST(Lockable, KnowsItsReadersAndItsWriter) {
    ExpectReaderAndWriterKnown<HReadPrefMutex>();
    ExpectReaderAndWriterKnown<HWritePrefMutex>();
}

TEST(Lockable, EndsTheProcessWhereAnAssertionDoesNotHold) {
    const ChildResult child = RunInChild([] {
        HSharedLockable mutex;
        mutex.lock_shared();
        mutex.AssertSharedHeld();
        mutex.AssertHeld();
        return 0;
    });
    EXPECT_NE(child.exit_code, 0);
    EXPECT_NE(child.err.find("does not hold it\n"), std::string::npos) << child.err;
}

TEST(LockGuard, IsReleasedOnce) {
    HLockable mutex;
    const auto owns = [&] { return HLockOwner::Owns(mutex.GetMutex()); };
    mutex.lock();
    {
        HLockGuard guard(mutex);
        guard.unlock();
    }
    EXPECT_TRUE(owns());  // the level that was there before
    { const HLockGuard guard(mutex, std::adopt_lock); }
    EXPECT_FALSE(owns());
}

}  // namespace
