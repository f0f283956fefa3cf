// The timers as plain data.
#include <deque>
#include <vector>

#include "snapshot/taken_data.h"
#include "timing/timer_rows.h"

namespace {

struct TakenTimers : TakenData<HTimerData, HTimerRowData> {
    std::deque<std::vector<double>> maThreads;  // its elements don't move
};

constexpr double kMicroseconds = 1000000.0;

}  // namespace

const HTimerData* HTakeTimerData() noexcept {
    return Take<TakenTimers>([](TakenTimers& taken) {
        for (TimerTotals& timer : GlobalTimerAccess::Totals()) {
            const double total = timer.Total();
            std::vector<double>& threads = taken.maThreads.emplace_back(std::move(timer.maThreads));
            for (double& seconds : threads) seconds /= kMicroseconds;
            taken.maRows.push_back({taken.Keep(timer.moName), total / kMicroseconds, threads.data(),
                                    threads.size(), timer.mdOpen / kMicroseconds});
        }
    });
}

void HReleaseData(const HTimerData* data) noexcept { Release<TakenTimers>(data); }
