// Start, end, restart, kill and faults of threads, and what a thread leaves behind.
#include "zanbase/thread.h"

#include <gtest/gtest.h>

#include <thread>

#include "support/run_in_child.h"

namespace {

TEST(ThreadNumber, IsOneForEachLivingThreadAndForkedProcess) {
    const unsigned long long mine = HThread::GetCurrentThreadId();
    unsigned long long other = 0;
    std::thread([&] { other = HThread::GetCurrentThreadId(); }).join();
    EXPECT_EQ(HThread::GetCurrentThreadId(), mine);
    EXPECT_NE(other, mine);
    EXPECT_LT(mine | other, 1ULL << 32U);
    EXPECT_EQ(RunInChild([] {
                  return HThread::GetCurrentThreadId() == static_cast<unsigned>(getpid()) ? 0 : 1;
              }).exit_code,
              0);
}

}  // namespace
