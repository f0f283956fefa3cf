// The timers: rows of slots, and the list of names. Only the addition of rows acquires a lock.
//
// A slot is running exactly while moStart has a value:
//
//   stopped -> running   Toggle: moStart = clock
//   running -> stopped   Toggle: mnElapsed += clock - moStart      any -> stopped   ResetAll: mnElapsed = 0
#include "zanbase/global_timer.h"

#include <algorithm>
#include <atomic>
#include <iostream>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

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
    // Timers are a list that only grows, newest first. Numbers count up from 0 along it.
    struct Timer {
        std::string moName;
        unsigned long long mnId;
        const Timer* mpoOlder;
    };

    Impl() : moRows(static_cast<std::size_t>(OMPGetMaxThreads())) {}

    // At exit no caller is left to receive an exception.
    ~Impl() {
        try {
            Report();
        } catch (...) {
        }
        for (const Timer* timer = mpoNewest; timer != nullptr;) delete std::exchange(timer, timer->mpoOlder);
    }

    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    // Publishes the timer once its slots are made. Of threads that register at once, the later ones take the next
    // number.
    unsigned long long Register(std::string name) {
        auto timer = std::make_unique<Timer>();
        timer->moName = std::move(name);
        const Timer* newest = mpoNewest.load(std::memory_order_acquire);
        do {
            timer->mpoOlder = newest;
            timer->mnId = newest != nullptr ? newest->mnId + 1 : 0;
            moRows.AddSlot(timer->mnId);
        } while (!mpoNewest.compare_exchange_weak(newest, timer.get(), std::memory_order_acq_rel));
        return timer.release()->mnId;
    }

    std::size_t TimerCount() const {
        const Timer* const newest = mpoNewest.load(std::memory_order_acquire);
        return newest != nullptr ? newest->mnId + 1 : 0;
    }

    // All timers in order of registration.
    std::vector<const Timer*> Timers() const {
        const Timer* timer = mpoNewest.load(std::memory_order_acquire);
        std::vector<const Timer*> timers(timer != nullptr ? timer->mnId + 1 : 0);
        for (; timer != nullptr; timer = timer->mpoOlder) timers[timer->mnId] = timer;
        return timers;
    }

    double Elapsed(std::size_t row, unsigned long long id) const {
        const TimerSlot* const slot = moRows.Find(row, id);
        return slot != nullptr ? static_cast<double>(slot->mnElapsed) : 0.0;
    }

    // In microseconds.
    double TotalOf(unsigned long long id) const {
        double total = 0.0;
        for (std::size_t row = 0; row < moRows.RowCount(); ++row) total += Elapsed(row, id);
        return total;
    }

    // Rows in order of registration.
    GlobalTimerSnapshot Snapshot() const {
        GlobalTimerSnapshot snapshot;
        const std::vector<const Timer*> timers = Timers();
        snapshot.maRows.reserve(timers.size());
        for (const Timer* const timer : timers) {
            GlobalTimerSnapshot::Row& row = snapshot.maRows.emplace_back();
            row.moName = timer->moName;
            row.mdSeconds = TotalOf(timer->mnId) / 1000000.0;
            for (std::size_t thread = 0; thread < moRows.RowCount(); ++thread)
                row.maThreadSeconds.push_back(Elapsed(thread, timer->mnId) / 1000000.0);
        }
        return snapshot;
    }

    // Sorted by the total and not by the seconds, in which two large totals may be equal. Timers with equal totals
    // come in order of registration.
    void Report() const {
        const std::vector<const Timer*> timers = Timers();
        std::vector<std::pair<const std::string*, double>> totals;
        totals.reserve(timers.size());
        for (const Timer* const timer : timers) totals.emplace_back(&timer->moName, TotalOf(timer->mnId));
        std::stable_sort(totals.begin(), totals.end(),
                         [](const auto& left, const auto& right) { return left.second < right.second; });
        for (const auto& [name, total] : totals) std::cout << *name << ": " << total / 1000000.0 << '\n';
        std::cout << std::flush;
    }

    RowTable<TimerSlot> moRows;  // row t belongs to OpenMP thread number t; slot i of each to timer i
    std::atomic<const Timer*> mpoNewest{
        nullptr};  // null: no timer. Release when a timer is added, acquire to read
};

GlobalTimer& GlobalTimer::GetInstance() {
    static GlobalTimer instance;
    return instance;
}

GlobalTimer::GlobalTimer() : mpoImpl(new Impl) {}

GlobalTimer::~GlobalTimer() { delete mpoImpl; }

GlobalTimer& GlobalTimer::operator=(const GlobalTimer&) = default;

unsigned long long GlobalTimer::RegisterNewTimer(std::string name) {
    return mpoImpl->Register(std::move(name));
}

void GlobalTimer::Toggle(unsigned long long id) {
    RowTable<TimerSlot>& rows = mpoImpl->moRows;
    const auto thread = static_cast<std::size_t>(OMPGetThreadNum());
    if (thread >= rows.RowCount()) {
        const HMutexLock lock(&goTimerGrowthMutex);
        rows.AddRows(thread + 1, mpoImpl->TimerCount());
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
    RowTable<TimerSlot>& rows = mpoImpl->moRows;
    const std::size_t timers = mpoImpl->TimerCount();
    for (std::size_t row = 0; row < rows.RowCount(); ++row) {
        for (std::size_t id = 0; id < timers; ++id) {
            if (TimerSlot* const slot = rows.Find(row, id)) *slot = TimerSlot();
        }
    }
}

GlobalTimerSnapshot GlobalTimerSnapshot::Take() { return GlobalTimer::GetInstance().mpoImpl->Snapshot(); }
