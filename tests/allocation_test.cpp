// The retry loop of the allocators under an allocator that fails on demand.
#include "zanbase/allocation.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstring>

#include "support/run_in_child.h"

namespace {

int attempts = 0, attempts_to_fail = 0, handled = 0;
bool fails_by_exception = false;

bool Fails() {
    ++attempts;
    if (attempts_to_fail == 0) return false;
    --attempts_to_fail;
    if (fails_by_exception) throw std::bad_alloc();
    return true;
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

void Count() { ++handled; }
void CountAndLeave() {
    ++handled;
    HOutOfMemoryHandler(nullptr);
}
void Throw() { throw std::bad_alloc(); }

void FailNext(int times, void (*handler)(), bool by_exception = false) {
    attempts = handled = 0;
    attempts_to_fail = times;
    fails_by_exception = by_exception;
    HOutOfMemoryHandler(handler);
}

using Allocator = void* (*)();

std::string OutcomeOf(Allocator allocate) {
    std::string end = "block";
    try {
        std::free(allocate());
    } catch (const std::bad_alloc&) {
        end = "exception";
    }
    return std::to_string(attempts) + " attempts, " + std::to_string(handled) + " handled, " + end;
}

class Allocators : public testing::TestWithParam<Allocator> {};

TEST_P(Allocators, CallTheHandlerOnceForEachFailedAttempt) {
    FailNext(3, Count);
    EXPECT_EQ(OutcomeOf(GetParam()), "4 attempts, 3 handled, block");
    FailNext(3, CountAndLeave);  // pauses follow
    EXPECT_EQ(OutcomeOf(GetParam()), "4 attempts, 1 handled, block");
    FailNext(1, Throw);
    EXPECT_EQ(OutcomeOf(GetParam()), "1 attempts, 0 handled, exception");
}

void* CopyText() { return HString("text"); }

INSTANTIATE_TEST_SUITE_P(All, Allocators,
                         testing::Values([] { return HMalloc(0); }, [] { return HCalloc(4, 10); },
                                         [] { return HRealloc(nullptr, 40); }, CopyText,
                                         []() -> void* { return HString(nullptr); }));

TEST(Allocator, TakesAnExceptionForAFailedAttemptExceptInHString) {
    FailNext(1, Count, true);
    EXPECT_EQ(OutcomeOf([] { return HMalloc(1); }), "2 attempts, 1 handled, block");
    FailNext(1, Count, true);
    EXPECT_EQ(OutcomeOf(CopyText), "1 attempts, 0 handled, exception");
}

TEST(Allocator, EndsTheProcessIfAShortageLastsAndNoHandlerIsInstalled) {
    const ChildResult child = RunInChild([] {
        FailNext(9999, nullptr);
        return HMalloc(8) == nullptr ? 1 : 0;
    });
    EXPECT_EQ(child.signal, SIGABRT);
    EXPECT_EQ(child.err, "zanbase: memory exhausted and no handler installed: 8 bytes requested\n");
}

TEST(Allocator, GivesTheBlocksItPromises) {
    static char text[20] = "text";
    char* copy = HString(text);
    text[0] = 'T';
    FailNext(2, Count);
    copy = static_cast<char*>(HRealloc(copy, 4000));
    EXPECT_STREQ(copy, "text");
    FailNext(1, Count, true);
    EXPECT_EQ(HRealloc(copy, 0), nullptr);
    EXPECT_EQ(attempts, 1);
    EXPECT_EQ(handled, 0);
    std::free(copy);
    FailNext(1, [] { std::strcpy(text, "a longer text"); });
    copy = HString(text);
    EXPECT_STREQ(copy, "a longer text");
    std::free(copy);
    char* const empty = HString(nullptr);
    EXPECT_STREQ(empty, "");
    EXPECT_STREQ(std::strcpy(empty, "fifteen letters"),
                 "fifteen letters");  // the address sanitizer checks 16 bytes
    std::free(empty);
}

}  // namespace
