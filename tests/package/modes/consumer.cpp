// A program in one mode of the standard library, with a plug-in of its own: what both record is one account.
#include <zanbase/adapters/lockable.h>
#include <zanbase/adapters/scope_timer.h>
#include <zanbase/adapters/tracked_memory.h>
#include <zanbase/budget.h>
#include <zanbase/snapshot_text.h>

#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

#include "plug_in.h"

namespace {

int failures = 0;

void Expect(bool holds, const char* what) {
    if (holds) return;
    std::printf("does not hold: %s\n", what);
    ++failures;
}
#define EXPECT(condition) Expect(condition, #condition)

void RecordAndRead() {
    const HMemorySnapshot before = HMemorySnapshot::Take();
    HMemoryBudget memory_budget;
    HDiskIOBudget disk_budget;
    std::vector<int, HTrackedAllocator<int>> numbers(
        10, HCallSite{"a file with a name that needs a block.cpp", 7});
    const auto text = HMakeTracked<std::string>({"b.cpp", 8}, "another text that needs a block of its own");
    HMemorySnapshot later = HMemorySnapshot::Take();
    const auto* const row = later.Find("a file with a name that needs a block.cpp", 7);
    EXPECT(row != nullptr && row->mnLiveBytes == 40);
    EXPECT(later.Since(before).maRows.size() == 2 && later != before);
    const HBudgetResult result = memory_budget.LimitLiveBytes(39).Check();
    EXPECT(!result && result.GetText().find("block.cpp:7: 40") != std::string::npos);
    EXPECT(disk_budget.LimitOpens(0).Check());
    std::ostringstream stream;
    const HDiskIOSnapshot disk = HDiskIOSnapshot::Take();
    const GlobalTimerSnapshot timers = GlobalTimerSnapshot::Take();
    EXPECT(HWriteJson(stream, &later, &disk, &timers) && HWriteCsv(stream, later) &&
           HWriteFoldedStacks(stream, later));
    EXPECT(HWriteOpenMetrics(stream, &later, &disk, &timers) && HWriteChromeTrace(stream, timers));
    EXPECT(stream.str().find("\"live_bytes\":40,") != std::string::npos);
    later.Merge(before);
}

void ShareWithThePlugIn() {
    {
        HTimedRegion("shared");
        TimeInPlugIn("shared");
    }
    std::size_t timers = 0;
    for (const auto& row : GlobalTimerSnapshot::Take().maRows) timers += row.moName == "shared" ? 1 : 0;
    EXPECT(timers == 1);
    const HMemorySnapshot before = HMemorySnapshot::Take();
    {
        const HTrackerPause pause;
        EXPECT(IsPausedInPlugIn());
        RecordInPlugIn();
    }
    EXPECT(HMemorySnapshot::Take() == before);
    RecordInPlugIn();
    EXPECT(HMemorySnapshot::Take().Since(before).mnTotal == 240);
}

void Lock() {
    HSharedLockable writers_first;
    HReadPrefSharedLockable readers_first;
    const HLockGuard write(writers_first);
    const HSharedLockGuard read(readers_first);
}

}  // namespace

int main() {
    HReportTimersAtExit(false);
    RecordAndRead();
    ShareWithThePlugIn();
    Lock();
    return failures;
}
