// What the tracker's operations leave in its tables, read as a deriving class reads them.
#include "zanbase/memory.h"

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <thread>
#include <vector>

#include "support/run_in_child.h"
#include "support/written_text.h"
#include "zanbase/memory_tables.h"

namespace {

const char kA[] = "same";
const char kB[] = "same";

void* At(std::uintptr_t address) { return reinterpret_cast<void*>(address); }

class Tables : public HMemory {
public:
    static bool Exist() {
        return mpoFileMap != nullptr && mpoMemoryMap != nullptr && mpoMemoryStack != nullptr;
    }
    static bool Missing() {
        return mpoFileMap == nullptr && mpoMemoryMap == nullptr && mpoMemoryStack == nullptr;
    }
    static std::size_t Blocks() { return mpoMemoryMap->size(); }

    static std::string Site(const CallSite& site) {
        return (site.first == kA ? "a" : "b") + std::to_string(site.second);
    }

    // Blocks as address=size@site, sites as site+count/bytes-count/bytes, then total, peak and saved states.
    static std::string State() {
        const HMutexLock lock(&moMutex);
        std::map<void*, std::string> blocks;
        for (const auto& [address, block] : *mpoMemoryMap)
            blocks[address] = std::to_string(reinterpret_cast<std::uintptr_t>(address)) + "=" +
                              std::to_string(block.mnSize) + "@" + Site({block.mpcFile, block.mnLine});
        std::map<std::string, std::string> sites;
        for (const auto& [site, usage] : *mpoFileMap)
            sites[Site(site)] = "+" + std::to_string(usage.mnAllocCount) + "/" +
                                std::to_string(usage.mnAllocated) + "-" + std::to_string(usage.mnFreeCount) +
                                "/" + std::to_string(usage.mnFreed);
        std::string text;
        for (const auto& [address, block] : blocks) text += block + " ";
        for (const auto& [site, usage] : sites) text += site + usage + " ";
        return text + "total " + std::to_string(mnTotalMemory) + " peak " + std::to_string(mnPeekMemory) +
               " saved " + std::to_string(mpoMemoryStack->size());
    }

    static void Clear() {
        HMemory::Alloc(At(1), 1, kA, 1);
        mpoMemoryStack->clear();
        HMemory::Reset();
    }
};

struct Case {
    const char* name;
    void (*run)();
    const char* state;
};

class Tracker : public testing::TestWithParam<Case> {};

TEST_P(Tracker, LeavesItsTablesAsTold) {
    Tables::Clear();
    GetParam().run();
    EXPECT_EQ(Tables::State(), GetParam().state);
}

const Case kCases[] = {
    {"Alloc",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Alloc(At(2), 20, kA, 2);
         HMemory::Alloc(At(3), 0, kB, 1);
         HMemory::Alloc(At(0), 5, kA, 1);
     },
     "0=5@a1 1=10@a1 2=20@a2 3=0@b1 a1+2/15-0/0 a2+1/20-0/0 b1+1/0-0/0 total 35 peak 35 saved 0"},
    {"Free",
     [] {
         HMemory::Alloc(At(0), 10, kA, 1);
         HMemory::Alloc(At(2), 20, kA, 1);
         for (const int address : {0, 0, 7}) HMemory::Free(At(static_cast<std::uintptr_t>(address)));
         HMemory::Alloc(At(3), 5, kA, 1);
     },
     "2=20@a1 3=5@a1 a1+3/35-1/10 total 25 peak 30 saved 0"},
    {"AllocAtAnAddressThatIsHeld",
     [] {
         HMemory::Alloc(At(9), 1, kA, 9);
         HMemory::Free(At(9));  // leaves a node that the second record could take
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Alloc(At(1), 30, kB, 2);
         HMemory::Alloc(At(1), 30, kB, 2);
         HMemory::Free(At(1));
     },
     "a1+1/10-1/10 a9+1/1-1/1 b2+2/60-0/0 total 60 peak 70 saved 0"},
    {"UsageResetKeepsBlocks",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Alloc(At(2), 20, kA, 1);
         HMemory::UsageReset();
         HMemory::Free(At(1));
     },
     "2=20@a1 a1+0/0-1/10 total 20 peak 30 saved 0"},
    {"ResetForgetsBlocks",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Reset();
         HMemory::Free(At(1));
     },
     "total 0 peak 0 saved 0"},
    {"PushStartsAfresh",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Push();
         HMemory::Free(At(1));
         HMemory::Alloc(At(2), 99, kA, 1);
     },
     "2=99@a1 a1+1/99-0/0 total 99 peak 99 saved 1"},
    {"PopRestores",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Push();
         HMemory::Alloc(At(1), 99, kA, 1);
         HMemory::Free(At(1));
         HMemory::Alloc(At(2), 99, kB, 1);
         HMemory::Reset();
         HMemory::Pop();
         HMemory::Free(At(2));
         HMemory::Alloc(At(3), 1, kA, 1);
     },
     "1=10@a1 3=1@a1 a1+2/11-0/0 total 11 peak 11 saved 0"},
    {"NestedPushesRestoreInReverse",
     [] {
         HMemory::Push();
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Push();
         HMemory::Alloc(At(2), 20, kA, 1);
         HMemory::Push();
         HMemory::Pop();
         HMemory::Pop();
         HMemory::Free(At(1));
     },
     "a1+1/10-1/10 total 0 peak 10 saved 1"},
    {"PopWithNothingSavedKeepsAll",
     [] {
         HMemory::Alloc(At(1), 10, kA, 1);
         HMemory::Pop();
     },
     "1=10@a1 a1+1/10-0/0 total 10 peak 10 saved 0"},
};

INSTANTIATE_TEST_SUITE_P(All, Tracker, testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST(HMemory, DoesNothingBeforeTheFirstAlloc) {
    const ChildResult child = RunInChild([] {
        HMemory::Free(nullptr);
        HMemory::Pop();
        HMemory::Reset();
        HMemory::UsageReset();
        HMemory::Push();
        EXPECT_TRUE(Tables::Missing());
        HMemory::Alloc(At(1), 10, kA, 1);
        HMemory::Pop();  // the push saved nothing
        EXPECT_EQ(Tables::State(), "1=10@a1 a1+1/10-0/0 total 10 peak 10 saved 0");
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.out;
}

// Blocks come and go in bursts, past what is kept of nodes and sites.
TEST(HMemory, CountsBurstsOverManySites) {
    Tables::Clear();
    constexpr int kBlocks = 3000;
    constexpr int kRounds = 4;
    for (int round = 0; round < kRounds; ++round) {
        for (int i = 1; i <= kBlocks; ++i)
            HMemory::Alloc(At(16U * static_cast<unsigned int>(i)), 8, kA, i % 700);
        EXPECT_EQ(Tables::Blocks(), static_cast<std::size_t>(kBlocks));
        for (int i = kBlocks; i >= 1; --i) HMemory::Free(At(16U * static_cast<unsigned int>(i)));
        EXPECT_EQ(Tables::Blocks(), 0U);
    }
    const std::string state = Tables::State();
    EXPECT_NE(state.find("a7+20/160-20/160 "), std::string::npos);
    EXPECT_NE(state.find(" total 0 peak 24000 "), std::string::npos);
}

TEST(HMemory, CountsOfManyThreadsAddUp) {
    Tables::Clear();
    constexpr int kThreads = 4;
    constexpr int kRounds = 3000;
    std::vector<std::thread> threads;
    for (int thread = 0; thread < kThreads; ++thread) {
        threads.emplace_back([thread] {
            for (int round = 0; round < kRounds; ++round) {
                HMemory::Alloc(At(1U + static_cast<unsigned int>(thread)), 2, kA, 1);
                if (round + 1 < kRounds) HMemory::Free(At(1U + static_cast<unsigned int>(thread)));
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    const std::string state = Tables::State();
    EXPECT_EQ(state.substr(0, state.find(" peak")),
              "1=2@a1 2=2@a1 3=2@a1 4=2@a1 a1+12000/24000-11996/23992 total 8");
}

}  // namespace
