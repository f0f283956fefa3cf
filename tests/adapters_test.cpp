// The adapters of memory: what they record, and what they do when the tracker fails.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>
#include <vector>

#include "zanbase/adapters/tracked_memory.h"
#include "zanbase/snapshot.h"

namespace {

using testing::ElementsAre;

// Live blocks and bytes of each site that has any, and calls so far.
std::string Sites() {
    std::ostringstream text;
    for (const auto& row : HMemorySnapshot::Take().maRows)
        text << row.mnLine << ':' << row.mnLiveBlocks << '/' << row.mnLiveBytes << " of " << row.mnAllocCount
             << ' ';
    return text.str();
}

struct Base {
    virtual ~Base() = default;
    long mnFirst = 0;
};
struct Other {
    virtual ~Other() = default;
    long mnSecond = 0;
};
struct Derived : Base, Other {};
struct Thrower {
    Thrower() { throw 1; }
};

TEST(TrackedMemory, RecordsAtTheLineOfTheCall) {
    const int line = __LINE__ + 1;
    HTrackedResource memory;
    std::vector<int, HTrackedAllocator<int>> numbers(HCallSite::Here());
    numbers.reserve(4);
    void* const block = memory.allocate(8);
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line) + ":1/8 of 1 "));
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line + 1) + ":1/16 of 1 "));
    memory.deallocate(block, 8);
    EXPECT_THAT(Sites(), testing::HasSubstr(std::to_string(line) + ":0/0 of 1 "));
    HMemory::Reset();
}

TEST(TrackedMemory, FollowsAnObjectThroughItsSecondBase) {
    {
        const HTrackedPtr<const Other> object = HMakeTracked<Derived>({"a.cpp", 1});
        EXPECT_EQ(Sites(), "1:1/32 of 1 ");
    }
    EXPECT_EQ(Sites(), "1:0/0 of 1 ");
    EXPECT_THROW((void)HMakeTracked<Thrower>({"a.cpp", 1}), int);
    EXPECT_EQ(Sites(), "1:0/0 of 2 ");
    HMemory::Reset();
}

TEST(TrackedMemory, CopiesAContainerWithTheUpstreamForCopies) {
    std::pmr::monotonic_buffer_resource arena;
    using Allocator = HTrackedAllocator<int, std::pmr::polymorphic_allocator<int>>;
    const std::vector<int, Allocator> numbers(Allocator(HCallSite::Here(), &arena));
    const auto copy = numbers;
    EXPECT_EQ(copy.get_allocator().GetUpstream().resource(), std::pmr::get_default_resource());
}

TEST(TrackedMemory, GivesBackWhatWasNeverRecorded) {
    HTrackedResource memory(std::pmr::new_delete_resource(), {"a.cpp", 1});
    void* block = nullptr;
    {
        const HTrackerPause pause;
        block = memory.allocate(8);
    }
    EXPECT_EQ(Sites(), "");
    memory.deallocate(block, 8);  // the address sanitizer finds it otherwise
    EXPECT_EQ(Sites(), "");
}

}  // namespace
