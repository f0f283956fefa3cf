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
    {
        HLockGuard guard(mutex);
        guard.unlock();
    }
    EXPECT_TRUE(owns());  // the first level: the guard released its own level, once
    EXPECT_FALSE(AnswerOfAnother(owns));
    { const HLockGuard guard(mutex, std::adopt_lock); }
    EXPECT_FALSE(owns());
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

}  // namespace
