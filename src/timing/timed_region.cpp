// The regions: for each thread that is in one, a row of slots that it alone writes.
//
// A row is owned by one thread from its first region to the end of its last one, and then free for any thread. So there
// are as many rows as threads were in regions at once; a thread that is killed in a region keeps its row. Rows are never
// deleted.
//
// A slot has its state in one word, which a snapshot reads while the owner writes it:
//
//   closed   2 * (sum of finished intervals)
//   open     2 * (sum of finished intervals - start of the open one) + 1
//
// so the sum up to any time is exact: it neither misses nor counts twice an interval that is being finished.
#include "zanbase/timed_region.h"

#include <atomic>
#include <new>
#include <string>
#include <vector>

#include "timing/row_table.h"
#include "timing/timer_clock.h"
#include "timing/timer_rows.h"
#include "zanbase/openmp.h"
#include "zanbase/tracker_pause.h"

namespace {

class RegionSlot {
public:
    struct Reading {
        long long closed, open;  // microseconds
        int thread;              // OpenMP number
    };

    // By the owner.
    void Enter(long long now, int thread) noexcept {
        if (mnDepth++ != 0) return;
        const long long closed = mnClosed.load(std::memory_order_relaxed);
        mnThread.store(thread, std::memory_order_relaxed);
        mnState.store(2 * (closed - now) + 1, std::memory_order_release);  // pairs with Read
    }

    // By the owner. After a reset there is no open interval.
    void Leave(long long now) noexcept {
        if (--mnDepth != 0) return;
        const long long state = mnState.load(std::memory_order_relaxed);
        if (!IsOpen(state)) return;
        const long long closed = Sum(state) + now;
        mnClosed.store(closed, std::memory_order_relaxed);
        mnState.store(2 * closed, std::memory_order_release);  // pairs with Read
    }

    // By any thread. If the owner finishes the interval meanwhile, it is in either figure, and once.
    [[nodiscard]] Reading Read() const noexcept {
        const long long state = mnState.load(std::memory_order_acquire);  // pairs with every store
        const int thread = mnThread.load(std::memory_order_relaxed);
        if (!IsOpen(state)) return {Sum(state), 0, thread};
        const long long closed = mnClosed.load(std::memory_order_relaxed);
        const long long total = Sum(state) + static_cast<long long>(ReadTimerClock());
        return {closed, total > closed ? total - closed : 0, thread};
    }

    // Requires: the owner neither enters nor leaves meanwhile.
    void Reset() noexcept {
        mnClosed.store(0, std::memory_order_relaxed);
        mnState.store(0, std::memory_order_release);  // pairs with Read
    }

    [[nodiscard]] bool IsEntered() const noexcept { return mnDepth != 0; }

private:
    static bool IsOpen(long long state) noexcept { return (state & 1) != 0; }
    static long long Sum(long long state) noexcept { return state >> 1; }

    std::atomic<long long> mnState{0};
    std::atomic<long long> mnClosed{0};  // the sum of finished intervals
    std::atomic<int> mnThread{0};        // the owner's OpenMP number in its latest region
    unsigned int mnDepth = 0;            // accessed by the owner alone
};

// Rows lie on pairs of cache lines of their own, because processors fetch lines in pairs.
struct alignas(128) RegionRow {
    GrowingArray<RegionSlot, 64> moSlots;
    std::atomic<bool> mbOwned{true};
    unsigned int mnOpenTimers = 0;  // slots that are entered; accessed by the owner alone
    RegionRow* mpoOlder = nullptr;  // constant once the row is in the list
};

// The exchange in FindRow pairs with every load: a thread that finds a row finds it complete.
std::atomic<RegionRow*> gpoNewestRow{nullptr};
std::atomic<bool> gbExitReport{true};

// The row that the thread owns or has owned last. Nothing is to be done when the thread ends.
struct ThreadRow {
    RegionRow* mpoRow;
    bool mbOwned;
};
thread_local ThreadRow toThreadRow{nullptr, false};

// Acquire: what the last owner wrote to the slots. Pairs with DisownRow.
bool TryOwn(RegionRow& row) noexcept {
    return !row.mbOwned.load(std::memory_order_relaxed) &&
           !row.mbOwned.exchange(true, std::memory_order_acquire);
}

void DisownRow(ThreadRow& mine) noexcept {
    mine.mbOwned = false;
    mine.mpoRow->mbOwned.store(false, std::memory_order_release);  // pairs with TryOwn
}

// A free row, or a new one.
RegionRow& FindRow() {
    const HTrackerPause pause;
    RegionRow* newest = gpoNewestRow.load(std::memory_order_acquire);
    for (RegionRow* row = newest; row != nullptr; row = row->mpoOlder)
        if (TryOwn(*row)) return *row;
    RegionRow* const row = new RegionRow;
    do {
        row->mpoOlder = newest;
    } while (!gpoNewestRow.compare_exchange_weak(newest, row, std::memory_order_acq_rel));
    return *row;
}

// Makes the calling thread own a row.
void OwnRow(ThreadRow& mine) {
    if (mine.mbOwned) return;
    if (mine.mpoRow == nullptr || !TryOwn(*mine.mpoRow)) mine.mpoRow = &FindRow();
    mine.mbOwned = true;
}

RegionSlot& SlotOf(RegionRow& row, unsigned long long id) {
    if (RegionSlot* const slot = row.moSlots.Find(id)) return *slot;
    const HTrackerPause pause;
    return row.moSlots.At(id);
}

template <class Visit>
void ForEachRow(Visit visit) {
    for (RegionRow* row = gpoNewestRow.load(std::memory_order_acquire); row != nullptr; row = row->mpoOlder)
        visit(*row);
}

}  // namespace

bool HTimerIdOf(const char* name, std::size_t length, unsigned long long* id) noexcept {
    const HTrackerPause pause;
    try {
        *id = GlobalTimerAccess::SharedTimer(std::string(name, length));
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

bool HEnterTimedRegion(unsigned long long id) noexcept {
    ThreadRow& mine = toThreadRow;
    try {
        OwnRow(mine);
        RegionSlot& slot = SlotOf(*mine.mpoRow, id);
        if (!slot.IsEntered()) ++mine.mpoRow->mnOpenTimers;
        slot.Enter(static_cast<long long>(ReadTimerClock()), OMPGetThreadNum());
        return true;
    } catch (const std::bad_alloc&) {
        if (mine.mbOwned && mine.mpoRow->mnOpenTimers == 0) DisownRow(mine);
        return false;
    }
}

void HLeaveTimedRegion(unsigned long long id) noexcept {
    ThreadRow& mine = toThreadRow;
    RegionSlot* const slot = mine.mbOwned ? mine.mpoRow->moSlots.Find(id) : nullptr;
    if (slot == nullptr || !slot->IsEntered()) return;
    slot->Leave(static_cast<long long>(ReadTimerClock()));
    if (!slot->IsEntered() && --mine.mpoRow->mnOpenTimers == 0) DisownRow(mine);
}

void HReportTimersAtExit(bool wanted) noexcept { gbExitReport.store(wanted); }

bool IsExitReportWanted() noexcept { return gbExitReport.load(); }

double RegionTotal(unsigned long long id) {
    double total = 0.0;
    ForEachRow([&](const RegionRow& row) {
        if (const RegionSlot* const slot = row.moSlots.Find(id))
            total += static_cast<double>(slot->Read().closed);
    });
    return total;
}

void AddRegionTotals(std::vector<TimerTotals>& timers) {
    ForEachRow([&](const RegionRow& row) {
        for (std::size_t id = 0; id < timers.size(); ++id) {
            const RegionSlot* const slot = row.moSlots.Find(id);
            if (slot == nullptr) continue;
            const RegionSlot::Reading reading = slot->Read();
            if (reading.closed != 0) timers[id].Add(reading.thread, static_cast<double>(reading.closed));
            timers[id].mdOpen += static_cast<double>(reading.open);
        }
    });
}

void ResetRegions() {
    ForEachRow([](RegionRow& row) { row.moSlots.ForEach([](RegionSlot& slot) { slot.Reset(); }); });
}
