// The tracker as plain data.
#include <algorithm>
#include <cstdint>
#include <functional>
#include <memory_resource>
#include <tuple>
#include <utility>
#include <vector>

#include "snapshot/taken_data.h"
#include "zanbase/memory_tables.h"

namespace {

using TakenMemory = TakenData<HMemoryData, HMemorySiteData>;

auto Figures(const HMemorySiteData& row) {
    return std::tie(row.mnLiveBlocks, row.mnLiveBytes, row.mnAllocated, row.mnFreed, row.mnAllocCount,
                    row.mnFreeCount);
}

// Reads the tracker's tables. The index lies in a buffer of its own, which is a fifth faster than an allocation for
// each node; not over the default resource, which is the program's and may record its blocks in these tables.
class TableReader : public HMemory {
public:
    explicit TableReader(TakenMemory& taken) : moTaken(taken) {}

    // The rows in no order; their texts are still the program's, which owns them until moMutex is released. So their
    // copies are made here, one for each address.
    void Copy() {
        const HMutexLock lock(&moMutex);
        if (mpoFileMap == nullptr) return;
        moTaken.mnTotal = static_cast<long long>(mnTotalMemory);
        moTaken.mnPeak = static_cast<long long>(mnPeekMemory);
        moTaken.maRows.reserve(mpoFileMap->size());
        moIndices.reserve(mpoFileMap->size());
        for (const auto& [site, usage] : *mpoFileMap) AddUsage(RowOf(site), usage);
        for (const auto& [address, block] : *mpoMemoryMap) {
            HMemorySiteData& row = RowOf({block.mpcFile, block.mnLine});
            ++row.mnLiveBlocks;
            const std::size_t live_bytes = static_cast<std::size_t>(row.mnLiveBytes) + block.mnSize;
            row.mnLiveBytes = static_cast<long long>(live_bytes);
        }
        for (HMemorySiteData& row : moTaken.maRows) {
            const auto [text, is_new] = moTexts.try_emplace(row.moFile.mpcBytes, moTaken.maTexts.size());
            if (is_new) moTaken.Keep(row.moFile.mpcBytes);
            maTextOfRow.push_back(static_cast<std::uint32_t>(text->second));
        }
    }

    // Brings the rows into the order of text, line and figures, so that equal accounts give equal rows. Texts are
    // compared once for each address; after that the order is one of numbers.
    void Sort() {
        const std::vector<std::uint32_t> ranks = RanksOfTexts();
        std::vector<std::pair<std::uint64_t, std::size_t>> order;
        order.reserve(moTaken.maRows.size());
        for (std::size_t row = 0; row < moTaken.maRows.size(); ++row) {
            const std::uint64_t rank = ranks[maTextOfRow[row]];
            const auto line = static_cast<std::uint32_t>(moTaken.maRows[row].mnLine) ^ 0x80000000U;
            order.emplace_back(rank << 32U | line, row);
        }
        std::sort(order.begin(), order.end(), [this](const auto& left, const auto& right) {
            if (left.first != right.first) return left.first < right.first;
            return Figures(moTaken.maRows[left.second]) < Figures(moTaken.maRows[right.second]);
        });
        std::vector<HMemorySiteData> sorted;
        sorted.reserve(order.size());
        for (const auto& [key, row] : order) {
            const std::string& text = moTaken.maTexts[maTextOfRow[row]];
            sorted.push_back(moTaken.maRows[row]);
            sorted.back().moFile = {text.data(), text.size()};
        }
        moTaken.maRows = std::move(sorted);
    }

private:
    template <class Key>
    using Indices =
        boost::unordered::unordered_map<Key, std::size_t, boost::hash<Key>, std::equal_to<Key>,
                                        std::pmr::polymorphic_allocator<std::pair<const Key, std::size_t>>>;

    HMemorySiteData& RowOf(const CallSite& site) {
        const auto [entry, is_new] = moIndices.try_emplace(site, moTaken.maRows.size());
        if (is_new) moTaken.maRows.push_back({{site.first, 0}, site.second, 0, 0, 0, 0, 0, 0});
        return moTaken.maRows[entry->second];
    }

    static void AddUsage(HMemorySiteData& row, const MemoryUsage& usage) {
        row.mnAllocated = static_cast<long long>(usage.mnAllocated);
        row.mnFreed = static_cast<long long>(usage.mnFreed);
        row.mnAllocCount = usage.mnAllocCount;
        row.mnFreeCount = usage.mnFreeCount;
    }

    // The place of each text in their order; equal texts have the same.
    [[nodiscard]] std::vector<std::uint32_t> RanksOfTexts() const {
        const auto& texts = moTaken.maTexts;
        std::vector<std::uint32_t> order(texts.size());
        for (std::size_t text = 0; text < order.size(); ++text)
            order[text] = static_cast<std::uint32_t>(text);
        std::sort(order.begin(), order.end(),
                  [&](std::uint32_t left, std::uint32_t right) { return texts[left] < texts[right]; });
        std::vector<std::uint32_t> ranks(texts.size());
        for (std::size_t place = 1; place < order.size(); ++place) {
            ranks[order[place]] =
                ranks[order[place - 1]] + (texts[order[place - 1]] != texts[order[place]] ? 1U : 0U);
        }
        return ranks;
    }

    TakenMemory& moTaken;
    std::pmr::monotonic_buffer_resource moNodes{std::pmr::new_delete_resource()};
    Indices<CallSite> moIndices{&moNodes};   // of a row, by its site
    Indices<const char*> moTexts{&moNodes};  // of a text, by its address in the program
    std::vector<std::uint32_t> maTextOfRow;  // the index of each row's text
};

}  // namespace

const HMemoryData* HTakeMemoryData() noexcept {
    return Take<TakenMemory>([](TakenMemory& taken) {
        TableReader reader(taken);
        reader.Copy();
        reader.Sort();
    });
}

void HReleaseData(const HMemoryData* data) noexcept { Release<TakenMemory>(data); }
