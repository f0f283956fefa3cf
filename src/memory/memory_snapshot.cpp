// The tracker as a value.
#include <algorithm>
#include <cstddef>
#include <functional>
#include <iterator>
#include <memory_resource>
#include <tuple>
#include <utility>

#include "snapshot/snapshot_rows.h"
#include "zanbase/memory_tables.h"
#include "zanbase/snapshot.h"

namespace {

struct MemoryRules {
    using Row = HMemorySnapshot::Row;

    static bool KeyLess(const Row& left, const Row& right) {
        return std::tie(left.moFile, left.mnLine) < std::tie(right.moFile, right.mnLine);
    }

    static Row WithoutFigures(const Row& row) {
        Row key;
        key.moFile = row.moFile;
        key.mnLine = row.mnLine;
        return key;
    }

    static void Add(Row& row, const Row& other, int sign) {
        for (const auto figure : kFigures) row.*figure = Combined(row.*figure, other.*figure, sign);
    }

    static bool IsZero(const Row& row) {
        return std::all_of(std::begin(kFigures), std::end(kFigures),
                           [&row](auto figure) { return row.*figure == 0; });
    }

private:
    static constexpr long long Row::*kFigures[] = {&Row::mnLiveBlocks, &Row::mnLiveBytes,  &Row::mnAllocated,
                                                   &Row::mnFreed,      &Row::mnAllocCount, &Row::mnFreeCount};
};

// Reads the tracker's tables; moMutex is held from start to end.
class TableReader : public HMemory {
public:
    using Row = HMemorySnapshot::Row;

    static HMemorySnapshot Copy() {
        HMemorySnapshot snapshot;
        const HMutexLock lock(&moMutex);
        if (mpoFileMap == nullptr) return snapshot;
        snapshot.mnTotal = static_cast<long long>(mnTotalMemory);
        snapshot.mnPeak = static_cast<long long>(mnPeekMemory);
        // A fifth faster than an allocation for each node. Not over the default resource: that is the program's,
        // and may record its blocks in the tables that are read here.
        std::pmr::monotonic_buffer_resource nodes(std::pmr::new_delete_resource());
        Indices indices(mpoFileMap->size(), boost::hash<CallSite>(), std::equal_to<CallSite>(), &nodes);
        snapshot.maRows.reserve(mpoFileMap->size());
        for (const auto& [site, usage] : *mpoFileMap) AddUsage(RowOf(snapshot, indices, site), usage);
        for (const auto& [address, block] : *mpoMemoryMap) {
            Row& row = RowOf(snapshot, indices, {block.mpcFile, block.mnLine});
            ++row.mnLiveBlocks;
            row.mnLiveBytes = Combined(row.mnLiveBytes, static_cast<long long>(block.mnSize), 1);
        }
        return snapshot;
    }

private:
    using Indices = boost::unordered::unordered_map<
        CallSite, std::size_t, boost::hash<CallSite>, std::equal_to<CallSite>,
        std::pmr::polymorphic_allocator<std::pair<const CallSite, std::size_t>>>;

    static Row& RowOf(HMemorySnapshot& snapshot, Indices& indices, const CallSite& site) {
        const auto [entry, is_new] = indices.try_emplace(site, snapshot.maRows.size());
        if (is_new) {
            Row& row = snapshot.maRows.emplace_back();
            row.moFile = site.first;
            row.mnLine = site.second;
        }
        return snapshot.maRows[entry->second];
    }

    static void AddUsage(Row& row, const MemoryUsage& usage) {
        row.mnAllocated = static_cast<long long>(usage.mnAllocated);
        row.mnFreed = static_cast<long long>(usage.mnFreed);
        row.mnAllocCount = usage.mnAllocCount;
        row.mnFreeCount = usage.mnFreeCount;
    }
};

}  // namespace

HMemorySnapshot HMemorySnapshot::Take() { return TableReader::Copy(); }

HMemorySnapshot HMemorySnapshot::Since(const HMemorySnapshot& earlier) const {
    return {RowsSince<MemoryRules>(maRows, earlier.maRows), Combined(mnTotal, earlier.mnTotal, -1),
            Combined(mnPeak, earlier.mnPeak, -1)};
}

void HMemorySnapshot::Merge(const HMemorySnapshot& other) {
    maRows = CombinedRows<MemoryRules>(maRows, other.maRows, 1);
    mnTotal = Combined(mnTotal, other.mnTotal, 1);
    mnPeak = Combined(mnPeak, other.mnPeak, 1);
}
