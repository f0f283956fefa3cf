// Tracked memory: what is recorded at which line, and that the allocator is one in every respect.
#include "zanbase/adapters/tracked_memory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <deque>
#include <forward_list>
#include <list>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <tuple>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "zanbase/snapshot.h"

namespace {

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
struct Plain {
    long mnThird = 0;
};
struct Derived : Base, Other, Plain {
    ~Derived() override { ++destroyed; }
    static inline int destroyed = 0;
};
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

template <class T>
void ExpectDestroyedAs() {
    Derived::destroyed = 0;
    { const HTrackedPtr<T> object = HMakeTracked<Derived>({"a.cpp", 1}); }
    EXPECT_EQ(Derived::destroyed, 1);
    EXPECT_THAT(Sites(), testing::StartsWith("1:0/0 of "));
}

TEST(TrackedMemory, FollowsAnObjectThroughEachBase) {
    ExpectDestroyedAs<Derived>();
    ExpectDestroyedAs<const Other>();
    ExpectDestroyedAs<Plain>();  // not the first base, and without a virtual destructor
    EXPECT_THROW((void)HMakeTracked<Thrower>({"a.cpp", 2}), int);
    EXPECT_THAT(Sites(), testing::EndsWith("2:0/0 of 1 "));
    HMemory::Reset();
}

// Every container of the standard library, with an upstream that has no state and with one that has.
template <class T>
using Tracked = HTrackedAllocator<T>;
template <class T>
using TrackedArena = HTrackedAllocator<T, std::pmr::polymorphic_allocator<T>>;

// Fills a container, and copies, moves, assigns and swaps it with one of another site and upstream.
template <class Container, class Fill>
void ExpectConforms(typename Container::allocator_type here, typename Container::allocator_type there,
                    Fill fill) {
    Container first(here);
    fill(first);
    const Container copy(first);
    const Container copy_there(first, there);
    Container moved_there(Container(first), there);
    EXPECT_TRUE(moved_there == copy);
    EXPECT_TRUE(copy_there == copy);
    Container assigned(there);
    assigned = copy;
    EXPECT_TRUE(assigned == copy);
    assigned = Container(first);
    EXPECT_TRUE(assigned == copy);
    Container moved(std::move(assigned));
    Container other(moved.get_allocator());
    using std::swap;
    swap(moved, other);
    EXPECT_TRUE(other == copy);
    EXPECT_GT(other.max_size(), 1000U);
    EXPECT_TRUE(here == here);
    EXPECT_FALSE(here != here);
}

template <template <class> class Allocator, class... Upstream>
void ExpectContainersConform(const Upstream&... upstreams) {
    const auto here = [&](auto type) { return Allocator<decltype(type)>({"here.cpp", 1}, upstreams...); };
    const auto there = [&](auto type) { return Allocator<decltype(type)>({"there.cpp", 1}); };
    const auto sequence = [&](auto container) {
        ExpectConforms<decltype(container)>(here(int()), there(int()), [](auto& filled) {
            filled.assign({3, 1, 2, 3, 1, 2});
        });
    };
    sequence(std::vector<int, Allocator<int>>(here(int())));
    sequence(std::deque<int, Allocator<int>>(here(int())));
    sequence(std::list<int, Allocator<int>>(here(int())));
    sequence(std::forward_list<int, Allocator<int>>(here(int())));
    ExpectConforms<std::vector<bool, Allocator<bool>>>(here(true), there(true),
                                                       [](auto& filled) { filled.assign(100, true); });
    const auto insert = [](auto& filled) { filled.insert({3, 1, 2}); };
    using Sets = std::tuple<std::set<int, std::less<>, Allocator<int>>,
                            std::multiset<int, std::less<>, Allocator<int>>>;
    ExpectConforms<std::tuple_element_t<0, Sets>>(here(int()), there(int()), insert);
    ExpectConforms<std::tuple_element_t<1, Sets>>(here(int()), there(int()), insert);
    ExpectConforms<std::unordered_set<int, std::hash<int>, std::equal_to<>, Allocator<int>>>(
        here(int()), there(int()), insert);
    using Pair = std::pair<const int, int>;
    const auto insert_pair = [](auto& filled) { filled.insert({{3, 1}, {2, 2}}); };
    const Pair pair;
    ExpectConforms<std::map<int, int, std::less<>, Allocator<Pair>>>(here(pair), there(pair), insert_pair);
    ExpectConforms<std::unordered_map<int, int, std::hash<int>, std::equal_to<>, Allocator<Pair>>>(
        here(pair), there(pair), insert_pair);
    using Text = std::basic_string<char, std::char_traits<char>, Allocator<char>>;
    ExpectConforms<Text>(here('a'), there('a'),
                         [](auto& filled) { filled = "longer than a string keeps in itself"; });
    EXPECT_EQ(Text("a text", here('a')).substr(2), "text");
}

TEST(TrackedAllocator, ConformsOverTheStandardAllocator) {
    ExpectContainersConform<Tracked>();
    EXPECT_EQ(HMemorySnapshot::Take().mnTotal, 0);
    HMemory::Reset();
}

TEST(TrackedAllocator, ConformsOverAnArena) {
    std::pmr::monotonic_buffer_resource arena;
    ExpectContainersConform<TrackedArena>(std::pmr::polymorphic_allocator<int>(&arena));
    EXPECT_EQ(HMemorySnapshot::Take().mnTotal, 0);
    HMemory::Reset();
}

}  // namespace
