// Limits of a run.
#include "budgets.h"

#include <algorithm>
#include <functional>
#include <utility>
#include <vector>

namespace recorder {
namespace {

using Shares = std::vector<std::pair<long long, std::string>>;

Shares MemoryShares(const HMemorySnapshot& memory, long long HMemorySnapshot::Row::*figure) {
    Shares shares;
    for (const HMemorySnapshot::Row& row : memory.maRows)
        shares.emplace_back(row.*figure,
                            row.mnLine != 0 ? row.moFile + ":" + std::to_string(row.mnLine) : row.moFile);
    return shares;
}

Shares DiskShares(const HDiskIOSnapshot& disk, HDiskIOSnapshot::Operation HDiskIOSnapshot::Row::*operation,
                  long long HDiskIOSnapshot::Operation::*figure) {
    Shares shares;
    for (const HDiskIOSnapshot::Row& row : disk.maRows)
        shares.emplace_back(row.*operation.*figure, row.moName);
    return shares;
}

long long SumOf(const Shares& shares) {
    long long sum = 0;
    for (const auto& [share, name] : shares) sum += share;
    return sum;
}

std::string Line(const char* what, long long figure, long long limit, Shares shares) {
    constexpr std::size_t kNamed = 3;
    if (limit < 0 || figure <= limit) return {};
    std::sort(shares.begin(), shares.end(), std::greater<>());
    std::string line =
        std::string(what) + ": " + std::to_string(figure) + " exceed the budget of " + std::to_string(limit);
    for (std::size_t i = 0; i < std::min(kNamed, shares.size()) && shares[i].first > 0; ++i)
        line +=
            (i == 0 ? "; most: " : ", ") + shares[i].second + " (" + std::to_string(shares[i].first) + ")";
    return line + "\n";
}

}  // namespace

std::string BrokenBudgets(const Budgets& budgets, const HMemorySnapshot& memory,
                          const HDiskIOSnapshot& disk) {
    using Row = HMemorySnapshot::Row;
    using DiskRow = HDiskIOSnapshot::Row;
    using Operation = HDiskIOSnapshot::Operation;
    const Shares live = MemoryShares(memory, &Row::mnLiveBytes);
    const Shares calls = MemoryShares(memory, &Row::mnAllocCount);
    const Shares read = DiskShares(disk, &DiskRow::moRead, &Operation::mnBytes);
    const Shares opens = DiskShares(disk, &DiskRow::moOpen, &Operation::mnCount);
    return Line("bytes leaked", memory.mnTotal, budgets.leaked_bytes, live) +
           Line("bytes live at the peak", memory.mnPeak, budgets.peak_bytes,
                MemoryShares(memory, &Row::mnAllocated)) +
           Line("allocations", SumOf(calls), budgets.allocations, calls) +
           Line("bytes read", SumOf(read), budgets.read_bytes, read) +
           Line("files opened", SumOf(opens), budgets.opens, opens);
}

}  // namespace recorder
