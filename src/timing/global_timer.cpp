// The timers: rows of slots, and the names.
//
// A slot is running exactly while moStart has a value:
//
//   stopped -> running   Toggle: moStart = clock
//   running -> stopped   Toggle: mnElapsed += clock - moStart      any -> stopped   ResetAll: mnElapsed = 0
#include "zanbase/global_timer.h"

#include <algorithm>
#include <iostream>
#include <map>
#include <optional>
#include <utility>

#include "platform/clock.h"
#include "timing/row_table.h"
#include "zanbase/openmp.h"
#include "zanbase/snapshot.h"

namespace {

// The value of GetMicroSeconds as a whole number. A double would be exact until the year 2255, but a toggle
// would take a seventh longer. Differences are right modulo 2^64, also for a clock before 1970.
unsigned long long ReadClock() {
    const WallClock now = ReadWallClock();
    return static_cast<unsigned long long>(now.seconds) * 1000000 + now.milliseconds * 1000ULL;
}

}  // namespace

struct GlobalTimer::TimerSlot {
    unsigned long long mnElapsed = 0;           // microseconds, of finished intervals
    std::optional<unsigned long long> moStart;  // microseconds; when the open interval began
};

struct GlobalTimer::Impl {
    Impl() : moRows(static_cast<std::size_t>(OMPGetMaxThreads())) {}

    // At exit no caller is left to receive an exception.
    ~Impl() {
        try {
            Report();
        } catch (...) {
        }
    }

    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    double TotalOf(unsigned long long id) const {
        double total = 0.0;
        for (std::size_t row = 0; row < moRows.RowCount(); ++row)
            total += static_cast<double>(moRows.At(row, id).mnElapsed);
        return total;
    }

    // Rows in order of registration.
    GlobalTimerSnapshot Snapshot() const {
        GlobalTimerSnapshot snapshot;
        const HMutexLock lock(&goTimerGrowthMutex);
        snapshot.maRows.reserve(moNames.size());
        for (const auto& [id, name] : moNames) {
            GlobalTimerSnapshot::Row& row = snapshot.maRows.emplace_back();
            row.moName = name;
            row.mdSeconds = TotalOf(id) / 1000000.0;
            for (std::size_t thread = 0; thread < moRows.RowCount(); ++thread) {
                const auto microseconds = static_cast<double>(moRows.At(thread, id).mnElapsed);
                row.maThreadSeconds.push_back(microseconds / 1000000.0);
            }
        }
        return snapshot;
    }

    // Timers with equal totals come in order of registration.
    void Report() const {
        GlobalTimerSnapshot timers = Snapshot();
        std::stable_sort(timers.maRows.begin(), timers.maRows.end(), [](const auto& left, const auto& right) {
            return left.mdSeconds < right.mdSeconds;
        });
        for (const auto& row : timers.maRows) std::cout << row.moName << ": " << row.mdSeconds << '\n';
        std::cout << std::flush;
    }

    RowTable<TimerSlot> moRows;  // row t belongs to OpenMP thread number t; slot i of each to timer i
    std::map<unsigned long long, std::string> moNames;  // guarded by goTimerGrowthMutex
};

GlobalTimer& GlobalTimer::GetInstance() {
    static GlobalTimer instance;
    return instance;
}

GlobalTimer::GlobalTimer() : mpoImpl(new Impl) {}

GlobalTimer::~GlobalTimer() { delete mpoImpl; }

GlobalTimer& GlobalTimer::operator=(const GlobalTimer&) = default;

unsigned long long GlobalTimer::RegisterNewTimer(std::string name) {
    const HMutexLock lock(&goTimerGrowthMutex);
    const unsigned long long id = mpoImpl->moNames.size();
    mpoImpl->moRows.GrowTo(mpoImpl->moRows.RowCount(), id + 1);
    mpoImpl->moNames.emplace(id, std::move(name));
    return id;
}

void GlobalTimer::Toggle(unsigned long long id) {
    RowTable<TimerSlot>& rows = mpoImpl->moRows;
    const auto thread = static_cast<std::size_t>(OMPGetThreadNum());
    if (thread >= rows.RowCount()) {
        const HMutexLock lock(&goTimerGrowthMutex);
        rows.GrowTo(thread + 1, mpoImpl->moNames.size());
    }
    const unsigned long long now = ReadClock();
    TimerSlot& slot = rows.At(thread, id);
    if (slot.moStart.has_value()) {
        slot.mnElapsed += now - *slot.moStart;
        slot.moStart.reset();
    } else {
        slot.moStart = now;
    }
}

void GlobalTimer::Report() const { mpoImpl->Report(); }

void GlobalTimer::ResetAll() {
    const HMutexLock lock(&goTimerGrowthMutex);
    const RowTable<TimerSlot>& rows = mpoImpl->moRows;
    for (std::size_t row = 0; row < rows.RowCount(); ++row)
        for (const auto& [id, name] : mpoImpl->moNames) rows.At(row, id) = TimerSlot();
}

GlobalTimerSnapshot GlobalTimerSnapshot::Take() { return GlobalTimer::GetInstance().mpoImpl->Snapshot(); }
