// Budgets over the tracker.
#include <algorithm>
#include <cstddef>
#include <string>
#include <vector>

#include "snapshot/budget_text.h"
#include "zanbase/budget.h"
#include "zanbase/memory.h"

namespace {

// The tracker's peak, which only an Alloc raises.
class Peak : public HMemory {
public:
    // Sets it to the current total and returns what it was.
    static long long Restart() {
        const HMutexLock lock(&moMutex);
        const std::size_t old_peak = mnPeekMemory;
        mnPeekMemory = mnTotalMemory;
        return static_cast<long long>(old_peak);
    }

    static void Raise(long long peak) {
        const HMutexLock lock(&moMutex);
        mnPeekMemory = std::max(mnPeekMemory, static_cast<std::size_t>(peak));
    }
};

std::vector<BudgetShare> Shares(const HMemorySnapshot& memory, long long HMemorySnapshot::Row::*figure) {
    std::vector<BudgetShare> shares;
    shares.reserve(memory.maRows.size());
    for (const auto& row : memory.maRows)
        shares.emplace_back(row.moFile + ":" + std::to_string(row.mnLine), row.*figure);
    return shares;
}

}  // namespace

HMemoryBudget::HMemoryBudget() : moStart(HMemorySnapshot::Take()), mnOldPeak(Peak::Restart()) {}

HMemoryBudget::~HMemoryBudget() { Peak::Raise(mnOldPeak); }

HMemoryBudget& HMemoryBudget::LimitLiveBytes(long long limit) {
    mnLiveBytesLimit = limit;
    return *this;
}

HMemoryBudget& HMemoryBudget::LimitPeakBytes(long long limit) {
    mnPeakBytesLimit = limit;
    return *this;
}

HMemoryBudget& HMemoryBudget::LimitAllocations(long long limit) {
    mnAllocationsLimit = limit;
    return *this;
}

bool HMemoryBudget::Check() {
    using Row = HMemorySnapshot::Row;
    const HMemorySnapshot now = HMemorySnapshot::Take();
    const HMemorySnapshot scope = now.Since(moStart);
    long long allocations = 0;
    for (const Row& row : scope.maRows) allocations += row.mnAllocCount;
    moText = ExceededText("live bytes", scope.mnTotal, mnLiveBytesLimit, Shares(scope, &Row::mnLiveBytes)) +
             ExceededText("peak bytes", now.mnPeak - moStart.mnTotal, mnPeakBytesLimit,
                          Shares(scope, &Row::mnAllocated)) +
             ExceededText("allocations", allocations, mnAllocationsLimit, Shares(scope, &Row::mnAllocCount));
    return moText.empty();
}
