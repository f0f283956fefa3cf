// What the timers have added up, for reports and snapshots: by toggles for each OpenMP thread number, and by regions for
// each thread.
#ifndef ZANBASE_TIMING_TIMER_ROWS_H
#define ZANBASE_TIMING_TIMER_ROWS_H

#include <cstddef>
#include <string>
#include <vector>

// One timer, in microseconds.
struct TimerTotals {
    std::string moName;
    std::vector<double> maThreads;  // finished intervals by OpenMP thread number
    double mdOpen = 0;              // intervals that are open

    void Add(int thread, double microseconds) {
        const auto index = static_cast<std::size_t>(thread);
        if (maThreads.size() <= index) maThreads.resize(index + 1);
        maThreads[index] += microseconds;
    }
    [[nodiscard]] double Total() const {
        double total = 0.0;
        for (const double microseconds : maThreads) total += microseconds;
        return total;
    }
};

struct GlobalTimerAccess {
    // The timer that was registered by this function under `name`, now if there is none. Thread-safe.
    static unsigned long long SharedTimer(std::string name);
    // All timers in order of registration. Thread-safe.
    static std::vector<TimerTotals> Totals();
};

// Adds to each timer what its regions have added up. Thread-safe.
void AddRegionTotals(std::vector<TimerTotals>& timers);

// What the regions of timer `id` have finished, in microseconds. Thread-safe.
double RegionTotal(unsigned long long id);

// Drops what all regions have added up, and their open intervals. Requires: no region begins or ends meanwhile.
void ResetRegions();

// Whether the timers print their report at exit.
bool IsExitReportWanted() noexcept;

#endif
