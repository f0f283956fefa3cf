// Two reports in JSON beside each other, row by row.
#include "compare.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <set>
#include <vector>

namespace recorder {
namespace {

// The figures of a row that are compared, in the order of the columns.
constexpr std::size_t kFigures = 3;
using Figures = std::array<long long, kFigures>;
using Rows = std::map<std::string, Figures>;

// Names of rows by place, and the names themselves, as the later report has them.
struct LaterNames {
    std::map<std::string, std::string> by_place;
    std::set<std::string> all;
};

std::string NameOf(const HMemorySnapshot::Row& row) {
    return row.mnLine != 0 ? row.moFile + ":" + std::to_string(row.mnLine) : row.moFile;
}

LaterNames NamesOf(const Accounts& later) {
    LaterNames names;
    for (std::size_t i = 0; i < later.memory.maRows.size(); ++i) {
        names.by_place[later.places[i]] = NameOf(later.memory.maRows[i]);
        names.all.insert(NameOf(later.memory.maRows[i]));
    }
    names.by_place.erase("");
    return names;
}

// Lines above a function may have come or gone, so rows of one place in one function belong together.
Rows MemoryRows(const Accounts& accounts, const LaterNames& names) {
    Rows rows;
    for (std::size_t i = 0; i < accounts.memory.maRows.size(); ++i) {
        const HMemorySnapshot::Row& row = accounts.memory.maRows[i];
        const auto later = names.by_place.find(accounts.places[i]);
        std::string name = later != names.by_place.end() ? later->second : NameOf(row);
        // Another function has that line now.
        if (later == names.by_place.end() && !accounts.places[i].empty() && names.all.count(name) != 0)
            name += " (earlier)";
        Figures& figures = rows[name];
        figures[0] += row.mnLiveBytes;
        figures[1] += row.mnAllocated;
        figures[2] += row.mnAllocCount;
    }
    return rows;
}

Rows DiskRows(const HDiskIOSnapshot& disk) {
    Rows rows;
    for (const HDiskIOSnapshot::Row& row : disk.maRows)
        rows[row.moName] = {row.moRead.mnBytes, row.moWrite.mnBytes, row.moOpen.mnCount};
    return rows;
}

Figures SumOf(const Rows& rows) {
    Figures sum{};
    for (const auto& [name, figures] : rows)
        for (std::size_t i = 0; i < kFigures; ++i) sum[i] += figures[i];
    return sum;
}

std::string Line(const char* start, const Figures& figures, bool with_signs) {
    std::array<char, 128> line{};
    if (with_signs) {
        std::snprintf(line.data(), line.size(), "%-7s%+16lld%+15lld%+12lld", start, figures[0], figures[1],
                      figures[2]);
    } else {
        std::snprintf(line.data(), line.size(), "%-7s%16lld%15lld%12lld", start, figures[0], figures[1],
                      figures[2]);
    }
    return line.data();
}

// The figure that changed most.
long long WeightOf(const Figures& change) {
    long long weight = 0;
    for (const long long figure : change) weight = std::max(weight, std::abs(figure));
    return weight;
}

const char* KindOf(const std::string& name, const Rows& earlier, const Rows& later, const Figures& change) {
    if (earlier.count(name) == 0) return "new";
    if (later.count(name) == 0) return "gone";
    return *std::max_element(change.begin(), change.end()) > 0 ? "grew" : "shrank";
}

// The rows that differ, a line for each, the largest change first.
std::string ChangedRows(const Rows& earlier, const Rows& later) {
    Rows difference = later;
    for (const auto& [name, figures] : earlier)
        for (std::size_t i = 0; i < kFigures; ++i) difference[name][i] -= figures[i];
    std::vector<const Rows::value_type*> changed;
    for (const auto& row : difference)
        if (WeightOf(row.second) != 0) changed.push_back(&row);
    std::stable_sort(changed.begin(), changed.end(), [](const auto* one, const auto* other) {
        return WeightOf(one->second) > WeightOf(other->second);
    });
    std::string text;
    for (const auto* row : changed)
        text += Line(KindOf(row->first, earlier, later, row->second), row->second, true) + "  " + row->first +
                "\n";
    return text;
}

bool Exceeds(long long earlier, long long later, double tolerance) {
    return static_cast<double>(later - earlier) > static_cast<double>(earlier) * tolerance / 100;
}

// Adds one account to `comparison`.
void CompareRows(const char* heading, const Rows& earlier, const Rows& later, double tolerance,
                 Comparison& comparison) {
    const Figures before = SumOf(earlier);
    const Figures after = SumOf(later);
    comparison.text += heading + ChangedRows(earlier, later) + Line("before", before, false) + "\n" +
                       Line("after", after, false) + "\n";
    for (std::size_t i = 0; i < kFigures; ++i)
        comparison.grew = comparison.grew || Exceeds(before[i], after[i], tolerance);
}

}  // namespace

Comparison Compare(const Accounts& earlier, const Accounts& later, double tolerance) {
    Comparison comparison{};
    const LaterNames names = NamesOf(later);
    if (!earlier.run.empty() || !later.run.empty())
        comparison.text = "earlier: " + earlier.run + "\nlater:   " + later.run + "\n\n";
    CompareRows("memory       live bytes      allocated       calls\n", MemoryRows(earlier, names),
                MemoryRows(later, names), tolerance, comparison);
    const long long before = earlier.memory.mnPeak;
    const long long after = later.memory.mnPeak;
    comparison.text += "peak    " + std::to_string(before) + " before, " + std::to_string(after) + " after\n";
    comparison.grew = comparison.grew || Exceeds(before, after, tolerance);
    CompareRows("\ndisk         read bytes  written bytes       opens\n", DiskRows(earlier.disk),
                DiskRows(later.disk), tolerance, comparison);
    return comparison;
}

int RunCompare(const CompareOptions& options) {
    const Comparison comparison =
        Compare(ReadAccounts(options.earlier), ReadAccounts(options.later), options.tolerance);
    std::fputs(comparison.text.c_str(), stdout);
    return comparison.grew ? 1 : 0;
}

}  // namespace recorder
