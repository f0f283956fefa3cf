// The retry loop of the allocators under an allocator that fails on demand.
#include "zanbase/allocation.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <new>

#include "support/run_in_child.h"

namespace {

// How the next attempts of this thread go: the first `failures` of them fail, by null or by an exception.
thread_local int failures = 0;
thread_local bool throws = false;
thread_local int attempts = 0;

bool Fails() {
    ++attempts;
    if (failures == 0) return false;
    --failures;
    if (throws) throw std::bad_alloc();
    return true;
}

int handled = 0;
void CountingHandler() { ++handled; }
void OtherHandler() { handled += 100; }
void ThrowingHandler() { throw std::bad_alloc(); }
void RemovingHandler() {
    ++handled;
    HOutOfMemoryHandler(nullptr);
}

}  // namespace

extern "C" {
void* __real_malloc(std::size_t size);
void* __real_calloc(std::size_t count, std::size_t size);
void* __real_realloc(void* ptr, std::size_t size);
void* __wrap_malloc(std::size_t size) { return Fails() ? nullptr : __real_malloc(size); }
void* __wrap_calloc(std::size_t count, std::size_t size) {
    return Fails() ? nullptr : __real_calloc(count, size);
}
void* __wrap_realloc(void* ptr, std::size_t size) { return Fails() ? nullptr : __real_realloc(ptr, size); }
}

namespace {

struct Allocator {
    const char* name;
    void* (*allocate)();
    bool passes_bad_alloc;  // a std::bad_alloc out of the attempt itself
};

class Allocators : public testing::TestWithParam<Allocator> {
protected:
    void SetUp() override { HOutOfMemoryHandler(CountingHandler); }
    void TearDown() override { HOutOfMemoryHandler(nullptr); }

    static void* AllocateFailing(int times, bool by_exception = false) {
        handled = attempts = 0;
        failures = times;
        throws = by_exception;
        void* const block = GetParam().allocate();
        failures = 0;
        throws = false;
        return block;
    }
};

TEST_P(Allocators, CallTheHandlerOnceForEachFailedAttempt) {
    for (const int times : {0, 1, 2, 7}) {
        void* const block = AllocateFailing(times);
        EXPECT_NE(block, nullptr);
        EXPECT_EQ(handled, times);
        EXPECT_EQ(attempts, times + 1);
        std::free(block);
    }
}

TEST_P(Allocators, TakeABadAllocOfTheAttemptForANull) {
    if (GetParam().passes_bad_alloc) {
        EXPECT_THROW(AllocateFailing(1, true), std::bad_alloc);
        EXPECT_EQ(handled, 0);
        failures = 0;
        throws = false;
    } else {
        void* const block = AllocateFailing(2, true);
        EXPECT_NE(block, nullptr);
        EXPECT_EQ(handled, 2);
        std::free(block);
    }
}

TEST_P(Allocators, PassOnWhatTheHandlerThrows) {
    HOutOfMemoryHandler(ThrowingHandler);
    EXPECT_THROW(AllocateFailing(1), std::bad_alloc);
    EXPECT_EQ(attempts, 1);
}

TEST_P(Allocators, SurviveAShortageAfterTheHandlerTookItselfAway) {
    HOutOfMemoryHandler(RemovingHandler);
    void* const block = AllocateFailing(3);
    EXPECT_NE(block, nullptr);
    EXPECT_EQ(handled, 1);
    EXPECT_EQ(attempts, 4);
    std::free(block);
}

TEST_P(Allocators, StopTheProcessWhenNobodyHandlesALastingShortage) {
    const ChildResult child = RunInChild([] {
        HOutOfMemoryHandler(nullptr);
        AllocateFailing(1000000);
        return 0;
    });
    EXPECT_EQ(child.signal, SIGABRT);
    EXPECT_EQ(child.err, "zanbase: memory exhausted and no handler installed\n");
}

INSTANTIATE_TEST_SUITE_P(
    All, Allocators,
    testing::Values(Allocator{"HMalloc", [] { return HMalloc(40); }, false},
                    Allocator{"HMallocZero", [] { return HMalloc(0); }, false},
                    Allocator{"HCalloc", [] { return HCalloc(4, 10); }, false},
                    Allocator{"HReallocFresh", [] { return HRealloc(nullptr, 40); }, false},
                    Allocator{"HString", [] { return static_cast<void*>(HString("text")); }, true},
                    Allocator{"HStringNull", [] { return static_cast<void*>(HString(nullptr)); }, true}),
    [](const auto& test) { return test.param.name; });

TEST(HRealloc, KeepsTheOldBlockUntilAnAttemptSucceeds) {
    HOutOfMemoryHandler(CountingHandler);
    char* block = static_cast<char*>(HMalloc(4));
    std::memcpy(block, "abc", 4);
    failures = 2;
    block = static_cast<char*>(HRealloc(block, 4000));
    EXPECT_STREQ(block, "abc");
    handled = attempts = 0;
    failures = 1;
    EXPECT_EQ(HRealloc(block, 0), nullptr);  // one attempt, its null handed on, no handler
    EXPECT_EQ(attempts, 1);
    EXPECT_EQ(handled, 0);
    std::free(block);
    HOutOfMemoryHandler(nullptr);
}

TEST(HCalloc, ZeroFills) {
    void* const dirty = HMalloc(64);
    std::memset(dirty, 0xff, 64);
    std::free(dirty);
    char* const block = static_cast<char*>(HCalloc(8, 8));
    EXPECT_EQ(std::string(block, 64), std::string(64, '\0'));
    std::free(block);
}

TEST(HString, CopiesIntoABlockOfItsOwn) {
    char source[] = "text";
    char* const copy = HString(source);
    source[0] = 'T';
    EXPECT_STREQ(copy, "text");
    std::free(copy);
    char* const empty = HString(nullptr);
    EXPECT_EQ(empty[0], '\0');
    std::memset(empty, 'x', 16);  // sixteen bytes are there; the address sanitizer looks on
    std::free(empty);
}

TEST(HHandleOutOfMemory, CallsTheNewestHandlerOnly) {
    handled = 0;
    HHandleOutOfMemory();
    HOutOfMemoryHandler(OtherHandler);
    HOutOfMemoryHandler(CountingHandler);
    HHandleOutOfMemory();
    EXPECT_EQ(handled, 1);
    HOutOfMemoryHandler(nullptr);
    HHandleOutOfMemory();
    EXPECT_EQ(handled, 1);
}

}  // namespace
