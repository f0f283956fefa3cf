// What the tables are after `operator new` failed, at each of the calls that an operation makes in turn. Not
// part of the thread sanitizer's build, whose runtime brings its own `operator new`.
#include <gtest/gtest.h>
#include <omp.h>

#include <cstdint>
#include <cstdlib>
#include <new>
#include <string>
#include <thread>

#include "diskio/ledger.h"
#include "support/run_in_child.h"
#include "zanbase/disk_io.h"
#include "zanbase/memory_tables.h"
#include "zanbase/openmp.h"

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

bool FreeForOthers(const HMutex& mutex) {
    bool taken = false;
    std::thread([&] {
        taken = mutex.TryLock();
        if (taken) mutex.Unlock();
    }).join();
    return taken;
}

class Tables : public HMemory {
public:
    static bool Missing() { return mpoFileMap == nullptr; }
    static std::size_t Blocks() { return Missing() ? 0 : mpoMemoryMap->size(); }
    static std::size_t Total() { return mnTotalMemory; }
    static std::size_t Peak() { return mnPeekMemory; }
    static const HMutex& Mutex() { return moMutex; }
};

void ExpectTracked(std::size_t blocks, std::size_t bytes) {
    EXPECT_TRUE(FreeForOthers(Tables::Mutex()));
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

TEST(OMPNested, LeavesTheSettingsWhenMemoryRunsOut) {
    OMPSetMaxThreads(3);
    omp_set_num_threads(2);
    const int failures = FailAtEachCall([] { OMPNested(true); },
                                        [] {
                                            EXPECT_EQ(omp_get_max_active_levels(), 1);
                                            EXPECT_EQ(omp_get_max_threads(), 2);
                                        });
    EXPECT_GT(failures, 0);
}

// Counted opens of `name` and how often a read on `handle` reaches its record.
void ExpectRecorded(const std::string& name, void* handle, unsigned int opens, unsigned int reads) {
    ASSERT_NE(LedgerMutexIfMade(), nullptr);
    EXPECT_TRUE(FreeForOthers(*LedgerMutexIfMade()));
    HDiskIORead(handle, 0, 0);
    const auto file = mpoDiskIOFileMap->find(name);
    ASSERT_NE(file, mpoDiskIOFileMap->end());
    EXPECT_EQ(file->second.mnOpenCount, opens);
    EXPECT_EQ(file->second.mnReadCount, reads);
}

TEST(DiskIO, StaysSoundWhenMemoryRunsOut) {
    const ChildResult child = RunInChild([] {
        const std::string first(40, 'a');  // long enough for a block of its own
        const std::string second(40, 'b');
        FailAtEachCall([&] { HDiskIOOpen(first, At(1), 1); },
                       [&] {
                           if (LedgerMutexIfMade() == nullptr) return;
                           EXPECT_TRUE(FreeForOthers(*LedgerMutexIfMade()));
                           HDiskIORead(At(1), 1, 1);  // bound or not, there is nothing to credit
                           EXPECT_TRUE(mpoDiskIOFileMap->empty());
                       });
        ExpectRecorded(first, At(1), 1, 1);
        const auto bound_before = [&] { return HDiskIOGetFilename(At(1)) == first; };
        unsigned int reads = 1;
        FailAtEachCall([&] { HDiskIOOpen(second, At(1), 1); },
                       [&] { ExpectRecorded(first, At(1), 1, bound_before() ? ++reads : reads); });
        ExpectRecorded(second, At(1), 1, 1);
        FailAtEachCall([] { HDiskIOPush(); },
                       [&, reads = 1U]() mutable { ExpectRecorded(second, At(1), 1, ++reads); });
        FailAtEachCall([] { HDiskIOPop(); }, [] { FAIL() << "a pop needs no memory"; });
        EXPECT_EQ(mpoDiskIOFileMap->size(), 2U);
        EXPECT_TRUE(mpoDiskIOStack->empty());
        return testing::Test::HasFailure() ? 1 : 0;
    });
    EXPECT_EQ(child.exit_code, 0) << child.out;
}

}  // namespace
