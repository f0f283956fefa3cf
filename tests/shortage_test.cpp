// Every allocation of every operation fails in turn, wherever it is made: in `operator new`, which this program
// replaces, or in the C library's allocators, which the library's calls reach through here.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <new>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/runner.h"
#include "zanbase/adapters/tracked_memory.h"
#include "zanbase/budget.h"
#include "zanbase/snapshot_text.h"
#include "zanbase/zanbase.h"

namespace {

std::atomic<int> allocations_left{-1};  // until one fails; negative: none does
std::atomic<long> live_blocks{0};

bool Fails() { return allocations_left >= 0 && --allocations_left < 0; }

void* Counted(void* block) {
    if (block != nullptr) ++live_blocks;
    return block;
}

}  // namespace

extern "C" {
void* __real_malloc(std::size_t size);
void* __real_calloc(std::size_t count, std::size_t size);
void __real_free(void* block);
void* __wrap_malloc(std::size_t size) { return Fails() ? nullptr : Counted(__real_malloc(size)); }
void* __wrap_calloc(std::size_t count, std::size_t size) {
    return Fails() ? nullptr : Counted(__real_calloc(count, size));
}
void __wrap_free(void* block) {
    if (block != nullptr) --live_blocks;
    __real_free(block);
}
}

void* BlockOrThrow(void* block) { return block != nullptr ? block : throw std::bad_alloc(); }
void* operator new(std::size_t size) { return BlockOrThrow(__wrap_malloc(size)); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return __wrap_malloc(size); }
void* operator new(std::size_t size, std::align_val_t alignment) {
    return BlockOrThrow(Fails() ? nullptr : Counted(std::aligned_alloc(std::size_t(alignment), size)));
}
void operator delete(void* block) noexcept { __wrap_free(block); }
void operator delete(void* block, std::size_t) noexcept { __wrap_free(block); }
void operator delete(void* block, std::align_val_t) noexcept { __wrap_free(block); }
void operator delete(void* block, std::size_t, std::align_val_t) noexcept { __wrap_free(block); }
// As the C++ library has it; the address sanitizer's does not call the one above.
void* operator new[](std::size_t size, std::align_val_t alignment) { return operator new(size, alignment); }
void operator delete[](void* block, std::align_val_t) noexcept { __wrap_free(block); }
void operator delete[](void* block, std::size_t, std::align_val_t) noexcept { __wrap_free(block); }

namespace {

unsigned long long timer;

// The three accounts as one text. A failed `Alloc` may have counted the usage of its site, and nothing else.
std::string Accounts() {
    HMemorySnapshot memory;
    memory.Merge(HMemorySnapshot::Take());  // in the order of the sites
    auto& rows = memory.maRows;
    rows.erase(
        std::remove_if(rows.begin(), rows.end(), [](const auto& row) { return row.mnLiveBlocks == 0; }),
        rows.end());
    for (HMemorySnapshot::Row& row : rows) row.mnAllocated = row.mnAllocCount = 0;
    HDiskIOSnapshot files = HDiskIOSnapshot::Take();
    GlobalTimerSnapshot timers = GlobalTimerSnapshot::Take();
    memory.mdTime = files.mdTime = timers.mdTime = 0;
    for (GlobalTimerSnapshot::Row& row : timers.maRows) row.mdOpenSeconds = 0;
    std::ostringstream text;
    HWriteJson(text, &memory, &files, &timers);
    return text.str();
}

// A lock that stayed held would keep this thread for ever.
void TakeEveryLockOnAnotherThread() {
    std::thread([] {
        HMemory::Free(nullptr);
        HDiskIOSeek(nullptr, 0);
        static_cast<void>(GlobalTimerSnapshot::Take());
        [[maybe_unused]] const char* const text = _("text");
    }).join();
}

struct Operation {
    const char* name;
    std::function<void()> run;
    int times = 1;  // a table that grows allocates at some of them
    std::function<void()> undo = [] {};
};

// Runs `operation` with its allocation number `number` failing; false if it makes fewer.
bool RunShort(const Operation& operation, int number) {
    allocations_left = number;
    try {
        operation.run();
    } catch (const std::bad_alloc&) {
    }
    return allocations_left.exchange(-1) < 0;
}

// Adds one row: rows that were made before the failure stay, as room for the next attempt.
void ToggleInTeam() {
    static const int new_row = OMPGetMaxThreads();
    std::exception_ptr failure;
#pragma omp parallel num_threads(new_row + 1)
    if (OMPGetThreadNum() == new_row) {
        try {
            GlobalTimer::GetInstance().Toggle(timer);
        } catch (...) {
            failure = std::current_exception();
        }
    }
    if (failure) std::rethrow_exception(failure);
}

const std::string kName(100, 'n');  // longer than a string keeps in itself
char blocks[64];

// After a shortage in `ReadLock` a read-write lock can't be used, as its header says; so it ends with its row.
const Operation kOperations[] = {
    {"Alloc",
     [] {
         static int block = 0;
         HMemory::Alloc(&blocks[block + 1], 10, "new", block);
         ++block;
     },
     60},
    {"HMemory::Push", HMemory::Push, 1, HMemory::Pop},
    {"LeakReport", [] { HMemory::LeakReport(stderr); }},
    {"UsageReport", [] { HMemory::UsageReport(stderr); }},
    {"HMemorySnapshot::Take", [] { static_cast<void>(HMemorySnapshot::Take()); }},
    {"HMemorySnapshot::Since", [] { static_cast<void>(HMemorySnapshot::Take().Since({})); }},
    {"HMemoryBudget", [] { static_cast<void>(HMemoryBudget().LimitLiveBytes(-1).Check()); }},
    {"HWriteCsv", [] { HWriteCsv(std::cout, HMemorySnapshot::Take()); }},
    {"HTrackedAllocator", [] { std::vector<int, HTrackedAllocator<int>>(9, HCallSite::Here()); }},
    {"HDiskIOOpen", [] { HDiskIOOpen("a new " + kName, &blocks[1], 1); }},
    {"_HDiskIOMapFD", [] { _HDiskIOMapFD("another " + kName, &blocks[2]); }},
    {"HDiskIOPush", HDiskIOPush, 1, HDiskIOPop},
    {"HDiskIOGetFilename", [] { static_cast<void>(HDiskIOGetFilename(&blocks[0])); }},
    {"HDiskIOReportFile", [] { HDiskIOReportFile(stderr, kName); }},
    {"HDiskIOUsageReport", [] { HDiskIOUsageReport(stderr); }},
    {"HDiskIOSnapshot::Take", [] { static_cast<void>(HDiskIOSnapshot::Take()); }},
    {"HDiskIOSnapshot::Since", [] { static_cast<void>(HDiskIOSnapshot::Take().Since({})); }},
    {"HDiskIOBudget", [] { static_cast<void>(HDiskIOBudget().LimitOpens(-1).Check()); }},
    {"HDiskIOSummaryReport", [] { HDiskIOSummaryReport(stderr); }},
    {"RegisterNewTimer", [] { GlobalTimer::GetInstance().RegisterNewTimer(kName); }, 9},
    {"Toggle", ToggleInTeam},
    {"GlobalTimerSnapshot::Take", [] { static_cast<void>(GlobalTimerSnapshot::Take()); }},
    {"GlobalTimerSnapshot::Since", [] { static_cast<void>(GlobalTimerSnapshot::Take().Since({})); }},
    {"Report", [] { GlobalTimer::GetInstance().Report(); }},
    {"HWriteChromeTrace", [] { HWriteChromeTrace(std::cout, GlobalTimerSnapshot::Take()); }},
    {"HMutex", [] { const HMutex mutex; }},
    {"HCondVar", [] { const HCondVar condition; }},
    {"HSemaphore", [] { const HSemaphore semaphore(1); }},
    {"HReadPrefMutex, ReadLock",
     [] {
         const HReadPrefMutex mutex;
         const HReaderLock lock(&mutex);
     }},
    {"Start", [] { Runner([] {}).RunToEnd(); }},
    {"OMPNested", [] { const OMPNested nested(true); }},
    {"MkString", [] { static_cast<void>(MkString("%s", kName.c_str())); }},
    {"MkTokenString", [] { static_cast<void>(MkTokenString(kName.c_str(), "token", nullptr)); }},
    {"GetTimeAsString",
     [] { static_cast<void>(MkString("%s, %s", HTimer().GetTimeAsString().c_str(), kName.c_str())); }},
    {"_", [] { static_cast<void>(_("a text of its own")); }},
};

// Fails each allocation of `operation` twice; returns their number. Afterwards the operation has succeeded.
int FailEachAllocation(const Operation& operation) {
    const std::string before = Accounts();
    for (int number = 0;; ++number) {
        if (!RunShort(operation, number)) return number;
        TakeEveryLockOnAnotherThread();
        EXPECT_EQ(Accounts(), before) << "after allocation " << number;
        const long live = live_blocks;
        // What a failed run leaves behind, as room in a table, it leaves once.
        if (!RunShort(operation, number)) return number + 1;
        EXPECT_EQ(live_blocks, live) << "leaked at allocation " << number;
    }
}

TEST(Shortages, LeaveTheDocumentedStateNoLockHeldAndNoLeak) {
    SetIntlTest(true);
    HMemory::Alloc(&blocks[0], 10, "old", 1);
    HDiskIOOpen(kName, &blocks[0], 1);
    timer = GlobalTimer::GetInstance().RegisterNewTimer("timer");
    int failed = 0;
    for (const Operation& operation : kOperations) {
        SCOPED_TRACE(operation.name);
        int number = 0;
        for (int time = 0; time < operation.times; ++time) number += FailEachAllocation(operation);
        operation.undo();
        EXPECT_GE(number, 1) << "allocates nothing";
        failed += number;
    }
    std::printf("allocations failed in turn: %d of %zu operations\n", failed, std::size(kOperations));
}

}  // namespace
