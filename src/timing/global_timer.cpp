// The timers: rows of slots, and the list of names. Only the addition of rows acquires a lock.
//
// States of a slot:
//
//   stopped -> running   Toggle: mnStart = clock
//   running -> stopped   Toggle: mnElapsed += clock - mnStart      any -> stopped   ResetAll: mnElapsed = 0
#include "zanbase/global_timer.h"

#include <algorithm>
#include <atomic>
#include <iostream>
#include <memory>
#include <utility>
#include <vector>

#include "timing/row_table.h"
#include "timing/timer_clock.h"
#include "timing/timer_rows.h"
#include "zanbase/openmp.h"
#include "zanbase/tracker_pause.h"

// Written by the thread of its row and read by snapshots. The end of an interval is stored before the sum that contains
// it, and read after the sum: a snapshot may miss an interval that is being finished, and never counts it twice.
struct GlobalTimer::TimerSlot {
    void Toggle(unsigned long long now) {
        const unsigned long long start = mnStart.load(std::memory_order_relaxed);
        if (mbRunning.load(std::memory_order_relaxed)) {
            mbRunning.store(false, std::memory_order_relaxed);
            const unsigned long long elapsed = mnElapsed.load(std::memory_order_relaxed);
            mnElapsed.store(elapsed + (now - start), std::memory_order_release);  // pairs with Elapsed
        } else {
            mnStart.store(now, std::memory_order_relaxed);
            mbRunning.store(true, std::memory_order_release);  // pairs with Open
        }
    }

    void Reset() {
        mbRunning.store(false, std::memory_order_relaxed);
        mnElapsed.store(0, std::memory_order_relaxed);
    }

    [[nodiscard]] double Elapsed() const {
        return static_cast<double>(mnElapsed.load(std::memory_order_acquire));
    }
    // Requires: Elapsed was called before.
    [[nodiscard]] double Open() const {
        if (!mbRunning.load(std::memory_order_acquire)) return 0.0;
        const auto open = static_cast<long long>(ReadTimerClock() - mnStart.load(std::memory_order_relaxed));
        return open > 0 ? static_cast<double>(open) : 0.0;
    }

private:
    std::atomic<unsigned long long> mnElapsed{0};  // microseconds, of finished intervals
    std::atomic<unsigned long long> mnStart{0};    // microseconds; when the open interval began
    std::atomic<bool> mbRunning{false};            // an interval is open
};

struct GlobalTimer::Impl {
    // Timers are a list that only grows, newest first. Numbers count up from 0 along it.
    struct Timer {
        std::string moName;
        bool mbShared;  // registered once for its name
        unsigned long long mnId;
        const Timer* mpoOlder;
    };

    Impl() : moRows(static_cast<std::size_t>(OMPGetMaxThreads())) {}

    // At exit no caller is left to receive an exception.
    ~Impl() {
        try {
            if (IsExitReportWanted()) Report();
        } catch (...) {
        }
        for (const Timer* timer = mpoNewest; timer != nullptr;) delete std::exchange(timer, timer->mpoOlder);
    }

    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    // Publishes the timer once its slots are made. Of threads that register at once, the later ones take the next
    // number, or of a shared timer the number that it has got meanwhile. The exchange pairs with every load of mpoNewest:
    // a thread that finds a timer finds it and its slots complete.
    unsigned long long Register(std::string name, bool is_shared) {
        auto timer = std::make_unique<Timer>();
        timer->moName = std::move(name);
        timer->mbShared = is_shared;
        const Timer* searched = nullptr;
        const Timer* newest = mpoNewest.load(std::memory_order_acquire);
        do {
            const Timer* const known = is_shared ? FindShared(newest, searched, timer->moName) : nullptr;
            if (known != nullptr) return known->mnId;
            searched = timer->mpoOlder = newest;
            timer->mnId = newest != nullptr ? newest->mnId + 1 : 0;
            moRows.AddSlot(timer->mnId);
        } while (!mpoNewest.compare_exchange_weak(newest, timer.get(), std::memory_order_acq_rel));
        return timer.release()->mnId;
    }

    // A shared timer called `name` from `timer` on to `end`, which is not looked at; null if there is none.
    static const Timer* FindShared(const Timer* timer, const Timer* end, const std::string& name) {
        while (timer != end && !(timer->mbShared && timer->moName == name)) timer = timer->mpoOlder;
        return timer != end ? timer : nullptr;
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

    // In microseconds.
    double TotalOf(unsigned long long id) const {
        double total = 0.0;
        for (std::size_t row = 0; row < moRows.RowCount(); ++row)
            if (const TimerSlot* const slot = moRows.Find(row, id)) total += slot->Elapsed();
        return total + RegionTotal(id);
    }

    // In order of registration.
    std::vector<TimerTotals> Totals() const {
        std::vector<TimerTotals> totals;
        const std::size_t rows = moRows.RowCount();
        for (const Timer* const timer : Timers()) {
            TimerTotals& total = totals.emplace_back();
            total.moName = timer->moName;
            total.maThreads.resize(rows);
            for (std::size_t row = 0; row < rows; ++row) {
                const TimerSlot* const slot = moRows.Find(row, timer->mnId);
                if (slot == nullptr) continue;
                total.maThreads[row] = slot->Elapsed();
                total.mdOpen += slot->Open();
            }
        }
        AddRegionTotals(totals);
        return totals;
    }

    // Sorted by the total and not by the seconds, in which two large totals may be equal. Timers with equal totals
    // come in order of registration.
    void Report() const {
        const HTrackerPause pause;
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
    std::atomic<const Timer*> mpoNewest{nullptr};  // null: no timer
};

GlobalTimer& GlobalTimer::GetInstance() {
    static GlobalTimer instance;
    return instance;
}

GlobalTimer::GlobalTimer() : mpoImpl(new Impl) {}

GlobalTimer::~GlobalTimer() { delete mpoImpl; }

GlobalTimer& GlobalTimer::operator=(const GlobalTimer&) = default;

unsigned long long GlobalTimer::RegisterNewTimer(std::string name) {
    return mpoImpl->Register(std::move(name), false);
}

void GlobalTimer::Toggle(unsigned long long id) {
    RowTable<TimerSlot>& rows = mpoImpl->moRows;
    const auto thread = static_cast<std::size_t>(OMPGetThreadNum());
    if (thread >= rows.RowCount()) {
        const HMutexLock lock(&goTimerGrowthMutex);
        rows.AddRows(thread + 1, mpoImpl->TimerCount());
    }
    const unsigned long long now = ReadTimerClock();
    rows.At(thread, id).Toggle(now);
}

void GlobalTimer::Report() const { mpoImpl->Report(); }

void GlobalTimer::ResetAll() {
    RowTable<TimerSlot>& rows = mpoImpl->moRows;
    const std::size_t timers = mpoImpl->TimerCount();
    for (std::size_t row = 0; row < rows.RowCount(); ++row) {
        for (std::size_t id = 0; id < timers; ++id) {
            if (TimerSlot* const slot = rows.Find(row, id)) slot->Reset();
        }
    }
    ResetRegions();
}

unsigned long long GlobalTimerAccess::SharedTimer(std::string name) {
    return GlobalTimer::GetInstance().mpoImpl->Register(std::move(name), true);
}

std::vector<TimerTotals> GlobalTimerAccess::Totals() { return GlobalTimer::GetInstance().mpoImpl->Totals(); }
