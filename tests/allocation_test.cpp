// The retry loop of the allocators under an allocator that fails on demand.
#include "zanbase/allocation.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstring>
#include <new>

#include "support/run_in_child.h"

namespace {

// The first `failures` attempts fail, by null or by an exception.
int failures = 0, attempts = 0, handled = 0;
bool throws = false;

bool Fails() {
    if (++attempts > failures) return false;
    return throws ? throw std::bad_alloc() : true;
}

void Count() { ++handled; }
void CountAndLeave() { ++handled, HOutOfMemoryHandler(nullptr); }
void Throw() { throw std::bad_alloc(); }

void FailNext(int times, bool by_exception = false, void (*handler)() = Count) {
    handled = attempts = 0, failures = times, throws = by_exception;
    HOutOfMemoryHandler(handler);
}

}  // namespace

extern "C" {
void* __real_malloc(std::size_t size);
void* __real_calloc(std::size_t count, std::size_t size);
void* __real_realloc(void* ptr, std::size_t size);
void* __wrap_malloc(std::size_t size) { return Fails() ? nullptr : __real_malloc(size); }
void* __wrap_calloc(std::size_t n, std::size_t size) { return Fails() ? nullptr : __real_calloc(n, size); }
void* __wrap_realloc(void* ptr, std::size_t size) { return Fails() ? nullptr : __real_realloc(ptr, size); }
}

namespace {

// "attempts/calls of the handler", and whether a block came of them.
std::string Outcome(void* (*allocate)(), int times, bool by_exception, void (*handler)()) {
    FailNext(times, by_exception, handler);
    std::string end = " block";
    try {
        std::free(allocate());
    } catch (const std::bad_alloc&) {
        end = " none";
    }
    return std::to_string(attempts) + "/" + std::to_string(handled) + end;
}

TEST(Allocators, CallTheHandlerOnceForEachFailedAttempt) {
    void* (*const allocators[])() = {[] { return HMalloc(0); }, [] { return HCalloc(4, 10); },
                                     [] { return HRealloc(nullptr, 40); },
                                     [] { return static_cast<void*>(HString("text")); },
                                     [] { return static_cast<void*>(HString(nullptr)); }};
    for (const auto& each : allocators) {
        SCOPED_TRACE(&each - allocators);
        const bool copies = &each - allocators > 2;  // which lets an exception of the attempt itself pass
        EXPECT_EQ(Outcome(each, 3, false, Count), "4/3 block");
        EXPECT_EQ(Outcome(each, 3, false, CountAndLeave), "4/1 block");  // patience follows
        EXPECT_EQ(Outcome(each, 1, true, Count), copies ? "1/0 none" : "2/1 block");
        EXPECT_EQ(Outcome(each, 1, false, Throw), "1/0 none");
    }
}

TEST(Allocators, StopTheProcessWhenNobodyHandlesALastingShortage) {
    const ChildResult child =
        RunInChild([] { return FailNext(9999, false, nullptr), HMalloc(8) == nullptr; });
    EXPECT_EQ(child.signal, SIGABRT);
    EXPECT_EQ(child.err, "zanbase: memory exhausted and no handler installed\n");
}

TEST(Allocators, GiveTheBlocksTheyPromise) {
    FailNext(0);
    char text[] = "text";
    char* copy = HString(text);
    text[0] = 'T';
    FailNext(2);
    copy = static_cast<char*>(HRealloc(copy, 4000));
    EXPECT_STREQ(copy, "text");
    FailNext(1, true);
    EXPECT_EQ(HRealloc(copy, 0), nullptr);
    EXPECT_EQ(attempts * 10 + handled, 10);  // to free is tried once
    std::free(copy);
    char* const empty = HString(nullptr);
    EXPECT_STREQ(empty, "");
    EXPECT_STREQ(std::strcpy(empty, "fifteen letters"), "fifteen letters");  // the address sanitizer looks on
    std::free(empty);
}

}  // namespace
