// What the tables are after `operator new` failed, at each of the calls that an operation makes in turn. Not
// part of the thread sanitizer's build, whose runtime brings its own `operator new`.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <new>
#include <thread>

#include "support/run_in_child.h"
#include "zanbase/memory_tables.h"

namespace {

thread_local long calls_left = -1;  // of operator new on this thread, until one fails; negative: none does

// Runs `body` again and again: the first call of `operator new` fails, then the second, and so on until
// `body` comes through. After each failure it calls `check`. Returns how many there were.
template <class Body, class Check>
int FailAtEachCall(Body body, Check check) {
    for (int failures = 0;; ++failures) {
        calls_left = failures;
        try {
            body();
            calls_left = -1;
            return failures;
        } catch (const std::bad_alloc&) {
            calls_left = -1;
            check();
        }
    }
}

}  // namespace

void* operator new(std::size_t size) {
    if (calls_left == 0) throw std::bad_alloc();
    if (calls_left > 0) --calls_left;
    if (void* const block = std::malloc(size)) return block;
    throw std::bad_alloc();
}
__attribute__((noinline)) void operator delete(void* block) noexcept { std::free(block); }
__attribute__((noinline)) void operator delete(void* block, std::size_t) noexcept { std::free(block); }

namespace {

void* At(std::uintptr_t address) { return reinterpret_cast<void*>(address); }

class Tables : public HMemory {
public:
    static bool Missing() { return mpoFileMap == nullptr; }
    static std::size_t Blocks() { return Missing() ? 0 : mpoMemoryMap->size(); }
    static std::size_t Total() { return mnTotalMemory; }
    static std::size_t Peak() { return mnPeekMemory; }

    static bool FreeForOthers() {
        bool taken = false;
        std::thread([&] {
            taken = moMutex.TryLock();
            if (taken) moMutex.Unlock();
        }).join();
        return taken;
    }
};

void ExpectTracked(std::size_t blocks, std::size_t bytes) {
    EXPECT_TRUE(Tables::FreeForOthers());
    EXPECT_EQ(Tables::Blocks(), blocks);
    EXPECT_EQ(Tables::Total(), bytes);
    EXPECT_EQ(Tables::Peak(), bytes);
}

TEST(HMemory, StaysSoundWhenItsOwnMemoryRunsOut) {
    const ChildResult child = RunInChild([] {
        const auto alloc = [](std::uintptr_t address) {
            HMemory::Alloc(At(address), 10, __FILE__, __LINE__);
        };
        const int failures = FailAtEachCall([&] { alloc(1); },
                                            [] {
                                                HMemory::Free(At(1));  // finds nothing, tables or not
                                                ExpectTracked(0, 0);
                                            });
        EXPECT_GT(failures, 4);  // the tables, and then an entry in each
        FailAtEachCall([] { HMemory::Push(); }, [] { ExpectTracked(1, 10); });
        for (std::uintptr_t address = 2; address < 300; ++address) alloc(address);
        for (std::uintptr_t address = 2; address < 300; ++address) HMemory::Free(At(address));
        FailAtEachCall([] { HMemory::Pop(); }, [] { FAIL() << "a pop needs no memory"; });
        // The nodes of the freed blocks serve again, but the table has to grow.
        for (std::uintptr_t address = 2; address < 60; ++address)
            FailAtEachCall([&] { alloc(address); }, [&] { ExpectTracked(address - 1, 10 * (address - 1)); });
        ExpectTracked(59, 590);
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.out;
}

}  // namespace
