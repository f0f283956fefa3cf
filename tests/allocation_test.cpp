// The retry loop of the allocators under an allocator that fails on demand.
#include "zanbase/allocation.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <new>

#include "support/run_in_child.h"

namespace {

// The first `failures` attempts fail, by null or by an exception.
int failures = 0, attempts = 0, handled = 0;
bool throws = false;

bool Fails() {
    ++attempts;
    if (failures == 0) return false;
    --failures;
    if (throws) throw std::bad_alloc();
    return true;
}

void FailNext(int times, bool by_exception = false) {
    handled = attempts = 0;
    failures = times;
    throws = by_exception;
}

void Count() { ++handled; }
void Throw() { throw std::bad_alloc(); }
void CountAndLeave() { ++handled, HOutOfMemoryHandler(nullptr); }

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

const struct {
    const char* name;
    void* (*allocate)();
    bool passes_bad_alloc;  // one out of the attempt itself
} kAllocators[] = {{"HMalloc", [] { return HMalloc(0); }, false},
                   {"HCalloc", [] { return HCalloc(4, 10); }, false},
                   {"HRealloc", [] { return HRealloc(nullptr, 40); }, false},
                   {"HString", [] { return static_cast<void*>(HString("text")); }, true},
                   {"HString(null)", [] { return static_cast<void*>(HString(nullptr)); }, true}};

TEST(Allocators, CallTheHandlerOnceForEachFailedAttempt) {
    for (const auto& [name, allocate, passes_bad_alloc] : kAllocators) {
        SCOPED_TRACE(name);
        for (void (*const handler)() :
             {Count, CountAndLeave}) {  // who leaves is called once, and patience follows
            HOutOfMemoryHandler(handler);
            FailNext(3);
            std::free(allocate());
            EXPECT_EQ(attempts, 4);
            EXPECT_EQ(handled, handler == Count ? 3 : 1);
        }
        HOutOfMemoryHandler(Count);
        FailNext(1, true);
        if (passes_bad_alloc) {
            EXPECT_THROW(allocate(), std::bad_alloc);
        } else {
            std::free(allocate());
        }
        EXPECT_EQ(handled, passes_bad_alloc ? 0 : 1);
        HOutOfMemoryHandler(Throw);
        FailNext(1);
        EXPECT_THROW(allocate(), std::bad_alloc);
        EXPECT_EQ(attempts, 1);
    }
}

TEST(Allocators, StopTheProcessWhenNobodyHandlesALastingShortage) {
    const ChildResult child = RunInChild([] {
        HOutOfMemoryHandler(nullptr);
        FailNext(1000000);
        return HMalloc(8) == nullptr ? 1 : 2;
    });
    EXPECT_EQ(child.signal, SIGABRT);
    EXPECT_EQ(child.err, "zanbase: memory exhausted and no handler installed\n");
}

TEST(HRealloc, KeepsTheOldBlockUntilAnAttemptSucceedsAndAsksOnceForNothing) {
    HOutOfMemoryHandler(Count);
    FailNext(0);
    char* block = static_cast<char*>(HMalloc(4));
    std::memcpy(block, "abc", 4);
    FailNext(2);
    block = static_cast<char*>(HRealloc(block, 4000));
    EXPECT_STREQ(block, "abc");
    for (const bool by_exception : {false, true}) {
        FailNext(2, by_exception);
        EXPECT_EQ(HRealloc(block, 0), nullptr);
        EXPECT_EQ(attempts, 1);
        EXPECT_EQ(handled, 0);
    }
    FailNext(0);
    std::free(block);
}

TEST(HString, HasABlockOfItsOwn) {
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

}  // namespace
