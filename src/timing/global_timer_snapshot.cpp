// The arithmetic of the timers' snapshots; `Take` is beside the timers, whose rows only they know.
#include <algorithm>
#include <cstddef>

#include "snapshot/snapshot_rows.h"
#include "zanbase/snapshot.h"

namespace {

struct TimerRules {
    using Row = GlobalTimerSnapshot::Row;

    static bool KeyLess(const Row& left, const Row& right) { return left.moName < right.moName; }

    static Row WithoutFigures(const Row& row) { return {row.moName, 0, {}}; }

    static void Add(Row& row, const Row& other, int sign) {
        row.mdSeconds = Combined(row.mdSeconds, other.mdSeconds, sign);
        row.maThreadSeconds.resize(std::max(row.maThreadSeconds.size(), other.maThreadSeconds.size()));
        for (std::size_t thread = 0; thread < other.maThreadSeconds.size(); ++thread) {
            double& seconds = row.maThreadSeconds[thread];
            seconds = Combined(seconds, other.maThreadSeconds[thread], sign);
        }
    }

    static bool IsZero(const Row& row) {
        return row.mdSeconds == 0 && std::all_of(row.maThreadSeconds.begin(), row.maThreadSeconds.end(),
                                                 [](double seconds) { return seconds == 0; });
    }
};

}  // namespace

GlobalTimerSnapshot GlobalTimerSnapshot::Since(const GlobalTimerSnapshot& earlier) const {
    return {RowsSince<TimerRules>(maRows, earlier.maRows)};
}

void GlobalTimerSnapshot::Merge(const GlobalTimerSnapshot& other) {
    maRows = CombinedRows<TimerRules>(maRows, other.maRows, 1);
}
