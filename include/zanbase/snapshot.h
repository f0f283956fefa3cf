/// @file
/// The three accounts (tracker, disk ledger, timers) as values that can be compared, searched, added up and written.
/// Not part of zanbase/zanbase.h: a program that only records does not need it.
///
/// A snapshot is a plain value: it owns its texts, shares nothing with the account, and any code may fill one.
///
///     const HMemorySnapshot before = HMemorySnapshot::Take();
///     Work();
///     for (const auto& row : HMemorySnapshot::Take().Since(before).maRows)
///         std::printf("%s:%d %+lld bytes\n", row.moFile.c_str(), row.mnLine, row.mnLiveBytes);
///
/// `Take` copies one state of the account and changes nothing. `Since` gives the difference of two snapshots:
/// every figure is that of this snapshot less that of `earlier`, and rows without a difference are left out.
/// `Merge` adds every figure of `other`. Both match rows by the text of their key (call site, file or timer
/// name), so rows of one snapshot with equal keys become one; the rows of the result are in the order of their
/// keys. So `earlier.Merge(later.Since(earlier))` gives the figures of `later`. `Total` adds up the rows, `Find`
/// returns the row of a key. Two snapshots are equal if their accounts are; where and when they were taken does not
/// count.
///
/// Figures are signed, because differences can be negative, and wrap at 64 bits; a byte count of 2^63 or more
/// shows as a negative number. If memory runs out, `std::bad_alloc` reaches the caller, no lock stays held, and
/// the snapshots are unchanged. `Take`, `Since` and `Merge` pause the calling thread's tracking (see `HTrackerPause`),
/// so that a program whose `operator new` records does not find the snapshots in its account.
///
/// Everything here is in the header, over the plain data of zanbase/account_data.h: it works with every mode of every
/// standard library, whichever the library was built with.
#ifndef ZANBASE_SNAPSHOT_H
#define ZANBASE_SNAPSHOT_H

#include <algorithm>
#include <array>
#include <cstdlib>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "zanbase/account_data.h"
#include "zanbase/export.h"
#include "zanbase/snapshot_rows.h"
#include "zanbase/tracker_pause.h"

/// @addtogroup snapshots
/// @{

ZANBASE_MODE_BEGIN

/// @cond
// What `take` returned, released at the end of the scope.
template <class Data>
class HTakenData {
public:
    explicit HTakenData(const Data* (*take)() noexcept) : mpoData(take()) {
        if (mpoData == nullptr) ZANBASE_THROW_BAD_ALLOC();
    }
    ~HTakenData() { HReleaseData(mpoData); }
    HTakenData(const HTakenData&) = delete;
    HTakenData& operator=(const HTakenData&) = delete;

    const Data* operator->() const { return mpoData; }

    // A snapshot with the rows that `copy` makes of the data's.
    template <class Snapshot, class Copy>
    Snapshot CopyOf(Copy copy) const {
        Snapshot snapshot;
        snapshot.maRows.reserve(mpoData->mnRows);
        for (std::size_t row = 0; row < mpoData->mnRows; ++row)
            snapshot.maRows.push_back(copy(mpoData->mpoRows[row]));
        snapshot.mdTime = mpoData->mdTime;
        snapshot.mnProcess = mpoData->mnProcess;
        return snapshot;
    }

private:
    const Data* mpoData;  // owned
};

// Moves rows that were made during a pause into `rows`; the old ones are freed after it.
template <class Row>
void HReplaceRows(std::vector<Row>& rows, const std::vector<Row>& others) {
    std::vector<Row> sum = [&] {
        const HTrackerPause pause;
        return HSnapshotArithmetic::CombinedRows(rows, others, 1);
    }();
    rows.swap(sum);
}
/// @endcond

/// What the allocation tracker holds. Thread-safe for different objects, and for reading one object.
struct HMemorySnapshot {
    /// One call site. Two rows of one `Take` can have the same text and line, because a site in the tracker is
    /// the address of the text. Thread-safe, as any plain value.
    struct Row {
        std::string moFile;          ///< the file as it was recorded; any bytes
        int mnLine = 0;              ///< line in that file
        long long mnLiveBlocks = 0;  ///< blocks that are recorded and not yet freed
        long long mnLiveBytes = 0;   ///< their bytes
        long long mnAllocated = 0;   ///< bytes of all `HMemory::Alloc`
        long long mnFreed = 0;       ///< bytes of all `HMemory::Free`
        long long mnAllocCount = 0;  ///< calls of `HMemory::Alloc`
        long long mnFreeCount = 0;   ///< calls of `HMemory::Free` that found a block of this site

        /// The order of file, byte by byte, and line.
        [[nodiscard]] bool KeyLess(const Row& other) const {
            return std::tie(moFile, mnLine) < std::tie(other.moFile, other.mnLine);
        }
        /// The call site alone.
        [[nodiscard]] Row WithoutFigures() const {
            Row key;
            key.moFile = moFile;
            key.mnLine = mnLine;
            return key;
        }
        /// Adds the figures of `other`, or subtracts them if `sign` is -1.
        void Add(const Row& other, int sign = 1) {
            for (const auto figure : Figures())
                this->*figure = HSnapshotArithmetic::Combined(this->*figure, other.*figure, sign);
        }
        /// True if a figure is not 0.
        [[nodiscard]] bool HasFigures() const {
            const auto figures = Figures();
            return std::any_of(figures.begin(), figures.end(),
                               [this](auto figure) { return this->*figure != 0; });
        }
        /// True if call site and figures are equal.
        friend bool operator==(const Row& one, const Row& other) {
            const auto figures = Figures();
            return one.moFile == other.moFile && one.mnLine == other.mnLine &&
                   std::all_of(figures.begin(), figures.end(),
                               [&](auto figure) { return one.*figure == other.*figure; });
        }

    private:
        static constexpr std::array<long long Row::*, 6> Figures() {
            return {&Row::mnLiveBlocks, &Row::mnLiveBytes,  &Row::mnAllocated,
                    &Row::mnFreed,      &Row::mnAllocCount, &Row::mnFreeCount};
        }
    };

    std::vector<Row> maRows;  ///< after `Take` in the order of file, line and figures
    long long mnTotal = 0;    ///< bytes recorded and not yet freed
    long long mnPeak = 0;     ///< the highest total; of merged snapshots an upper bound
    double mdTime = 0;        ///< when it was taken, in seconds since 1970-01-01 UTC; 0 if unknown
    long long mnProcess = 0;  ///< the number of the process; 0 if unknown

    /// The tracker's state, copied under its mutex; empty before the first `HMemory::Alloc`. Thread-safe.
    [[nodiscard]] static HMemorySnapshot Take() {
        const HTrackerPause pause;
        const HTakenData data(HTakeMemoryData);
        auto snapshot = data.CopyOf<HMemorySnapshot>([](const HMemorySiteData& site) {
            return Row{{site.moFile.mpcBytes, site.moFile.mnBytes},
                       site.mnLine,
                       site.mnLiveBlocks,
                       site.mnLiveBytes,
                       site.mnAllocated,
                       site.mnFreed,
                       site.mnAllocCount,
                       site.mnFreeCount};
        });
        snapshot.mnTotal = data->mnTotal;
        snapshot.mnPeak = data->mnPeak;
        return snapshot;
    }
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] HMemorySnapshot Since(const HMemorySnapshot& earlier) const {
        const HTrackerPause pause;
        return {HSnapshotArithmetic::RowsSince(maRows, earlier.maRows),
                HSnapshotArithmetic::Combined(mnTotal, earlier.mnTotal, -1),
                HSnapshotArithmetic::Combined(mnPeak, earlier.mnPeak, -1), mdTime, mnProcess};
    }
    /// Adds `other` to this snapshot; see above. The time is the later one.
    void Merge(const HMemorySnapshot& other) {
        HReplaceRows(maRows, other.maRows);
        mnTotal = HSnapshotArithmetic::Combined(mnTotal, other.mnTotal, 1);
        mnPeak = HSnapshotArithmetic::Combined(mnPeak, other.mnPeak, 1);
        mdTime = std::max(mdTime, other.mdTime);
        if (mnProcess != other.mnProcess) mnProcess = 0;
    }
    /// The first row of `file`, spelled as it was recorded, and `line`; null if there is none.
    [[nodiscard]] const Row* Find(std::string_view file, int line) const {
        const auto row = std::find_if(maRows.begin(), maRows.end(), [&](const Row& candidate) {
            return candidate.mnLine == line && candidate.moFile == file;
        });
        return row != maRows.end() ? &*row : nullptr;
    }
    /// The sums of all rows, without file and line.
    [[nodiscard]] Row Total() const {
        Row total;
        for (const Row& row : maRows) total.Add(row);
        return total;
    }
    /// True if all rows, the total and the peak are equal.
    friend bool operator==(const HMemorySnapshot& one, const HMemorySnapshot& other) {
        return one.maRows == other.maRows && one.mnTotal == other.mnTotal && one.mnPeak == other.mnPeak;
    }
    /// The opposite.
    friend bool operator!=(const HMemorySnapshot& one, const HMemorySnapshot& other) {
        return !(one == other);
    }
};

/// What the disk ledger holds. Thread-safe for different objects, and for reading one object.
struct HDiskIOSnapshot {
    using Operation = HDiskIOOperation;  ///< one kind of operation

    /// One file. Thread-safe, as any plain value.
    struct Row {
        std::string moName;  ///< the name as it was recorded; any bytes
        Operation moOpen;    ///< opens
        Operation moClose;   ///< closes
        Operation moSeek;    ///< seeks
        Operation moRead;    ///< reads
        Operation moWrite;   ///< writes

        /// The order of the names, byte by byte.
        [[nodiscard]] bool KeyLess(const Row& other) const { return moName < other.moName; }
        /// The name alone.
        [[nodiscard]] Row WithoutFigures() const {
            Row key;
            key.moName = moName;
            return key;
        }
        /// Adds the figures of `other`, or subtracts them if `sign` is -1.
        void Add(const Row& other, int sign = 1) {
            for (const auto operation : Operations()) {
                Operation& sum = this->*operation;
                const Operation& term = other.*operation;
                sum.mnCount = HSnapshotArithmetic::Combined(sum.mnCount, term.mnCount, sign);
                sum.mdSeconds = HSnapshotArithmetic::Combined(sum.mdSeconds, term.mdSeconds, sign);
                sum.mnBytes = HSnapshotArithmetic::Combined(sum.mnBytes, term.mnBytes, sign);
            }
        }
        /// True if a figure is not 0.
        [[nodiscard]] bool HasFigures() const {
            const auto operations = Operations();
            return std::any_of(operations.begin(), operations.end(), [this](auto member) {
                const Operation& operation = this->*member;
                return operation.mnCount != 0 || operation.mdSeconds != 0 || operation.mnBytes != 0;
            });
        }
        /// True if name and figures are equal.
        friend bool operator==(const Row& one, const Row& other) {
            const auto operations = Operations();
            return one.moName == other.moName &&
                   std::all_of(operations.begin(), operations.end(), [&](auto member) {
                       const Operation& left = one.*member;
                       const Operation& right = other.*member;
                       return left.mnCount == right.mnCount && left.mdSeconds == right.mdSeconds &&
                              left.mnBytes == right.mnBytes;
                   });
        }

    private:
        static constexpr std::array<Operation Row::*, 5> Operations() {
            return {&Row::moOpen, &Row::moClose, &Row::moSeek, &Row::moRead, &Row::moWrite};
        }
    };

    std::vector<Row> maRows;  ///< in the order of the names, byte by byte
    double mdTime = 0;        ///< when it was taken, in seconds since 1970-01-01 UTC; 0 if unknown
    long long mnProcess = 0;  ///< the number of the process; 0 if unknown

    /// The ledger's state, copied under its mutex; empty before the first recording. Thread-safe.
    [[nodiscard]] static HDiskIOSnapshot Take() {
        const HTrackerPause pause;
        return HTakenData(HTakeDiskIOData).CopyOf<HDiskIOSnapshot>([](const HDiskIOFileData& file) {
            return Row{{file.moName.mpcBytes, file.moName.mnBytes},
                       file.moOpen,
                       file.moClose,
                       file.moSeek,
                       file.moRead,
                       file.moWrite};
        });
    }
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] HDiskIOSnapshot Since(const HDiskIOSnapshot& earlier) const {
        const HTrackerPause pause;
        return {HSnapshotArithmetic::RowsSince(maRows, earlier.maRows), mdTime, mnProcess};
    }
    /// Adds `other` to this snapshot; see above. The time is the later one.
    void Merge(const HDiskIOSnapshot& other) {
        HReplaceRows(maRows, other.maRows);
        mdTime = std::max(mdTime, other.mdTime);
        if (mnProcess != other.mnProcess) mnProcess = 0;
    }
    /// The row of the file called `name`, spelled as it was recorded; null if there is none.
    [[nodiscard]] const Row* Find(std::string_view name) const {
        const auto row = std::find_if(maRows.begin(), maRows.end(),
                                      [&](const Row& candidate) { return candidate.moName == name; });
        return row != maRows.end() ? &*row : nullptr;
    }
    /// The sums of all rows, without a name.
    [[nodiscard]] Row Total() const {
        Row total;
        for (const Row& row : maRows) total.Add(row);
        return total;
    }
    /// True if all rows are equal.
    friend bool operator==(const HDiskIOSnapshot& one, const HDiskIOSnapshot& other) {
        return one.maRows == other.maRows;
    }
    /// The opposite.
    friend bool operator!=(const HDiskIOSnapshot& one, const HDiskIOSnapshot& other) {
        return !(one == other);
    }
};

/// What the timers have added up. Thread-safe for different objects, and for reading one object.
struct GlobalTimerSnapshot {
    /// One timer. Thread-safe, as any plain value.
    struct Row {
        std::string moName;    ///< the name as it was registered; any bytes
        double mdSeconds = 0;  ///< finished intervals, summed over all threads
        std::vector<double>
            maThreadSeconds;       ///< the same by OpenMP thread number; threads of one number are summed
        double mdOpenSeconds = 0;  ///< intervals that are open, up to the time of the snapshot

        /// The order of the names, byte by byte.
        [[nodiscard]] bool KeyLess(const Row& other) const { return moName < other.moName; }
        /// The name alone.
        [[nodiscard]] Row WithoutFigures() const {
            Row key;
            key.moName = moName;
            return key;
        }
        /// Adds the figures of `other`, or subtracts them if `sign` is -1.
        void Add(const Row& other, int sign = 1) {
            mdSeconds = HSnapshotArithmetic::Combined(mdSeconds, other.mdSeconds, sign);
            mdOpenSeconds = HSnapshotArithmetic::Combined(mdOpenSeconds, other.mdOpenSeconds, sign);
            maThreadSeconds.resize(std::max(maThreadSeconds.size(), other.maThreadSeconds.size()));
            for (std::size_t thread = 0; thread < other.maThreadSeconds.size(); ++thread) {
                double& seconds = maThreadSeconds[thread];
                seconds = HSnapshotArithmetic::Combined(seconds, other.maThreadSeconds[thread], sign);
            }
        }
        /// True if a figure is not 0.
        [[nodiscard]] bool HasFigures() const {
            return mdSeconds != 0 || mdOpenSeconds != 0 ||
                   std::any_of(maThreadSeconds.begin(), maThreadSeconds.end(),
                               [](double seconds) { return seconds != 0; });
        }
        /// True if name and figures are equal.
        friend bool operator==(const Row& one, const Row& other) {
            return one.moName == other.moName && one.mdSeconds == other.mdSeconds &&
                   one.maThreadSeconds == other.maThreadSeconds && one.mdOpenSeconds == other.mdOpenSeconds;
        }
    };

    std::vector<Row> maRows;  ///< in order of registration after `Take`
    double mdTime = 0;        ///< when it was taken, in seconds since 1970-01-01 UTC; 0 if unknown
    long long mnProcess = 0;  ///< the number of the process; 0 if unknown

    /// The timers' state. Creates the instance if there is none. Thread-safe, also while other threads register,
    /// toggle and are in regions: an interval is then counted as open or as finished.
    [[nodiscard]] static GlobalTimerSnapshot Take() {
        const HTrackerPause pause;
        return HTakenData(HTakeTimerData).CopyOf<GlobalTimerSnapshot>([](const HTimerRowData& timer) {
            return Row{{timer.moName.mpcBytes, timer.moName.mnBytes},
                       timer.mdSeconds,
                       {timer.mpdThreadSeconds, timer.mpdThreadSeconds + timer.mnThreads},
                       timer.mdOpenSeconds};
        });
    }
    /// This snapshot less `earlier`; see above.
    [[nodiscard]] GlobalTimerSnapshot Since(const GlobalTimerSnapshot& earlier) const {
        const HTrackerPause pause;
        return {HSnapshotArithmetic::RowsSince(maRows, earlier.maRows), mdTime, mnProcess};
    }
    /// Adds `other` to this snapshot; see above. The time is the later one.
    void Merge(const GlobalTimerSnapshot& other) {
        HReplaceRows(maRows, other.maRows);
        mdTime = std::max(mdTime, other.mdTime);
        if (mnProcess != other.mnProcess) mnProcess = 0;
    }
    /// The first row of the timer called `name`; null if there is none.
    [[nodiscard]] const Row* Find(std::string_view name) const {
        const auto row = std::find_if(maRows.begin(), maRows.end(),
                                      [&](const Row& candidate) { return candidate.moName == name; });
        return row != maRows.end() ? &*row : nullptr;
    }
    /// The sums of all rows, without a name.
    [[nodiscard]] Row Total() const {
        Row total;
        for (const Row& row : maRows) total.Add(row);
        return total;
    }
    /// True if all rows are equal.
    friend bool operator==(const GlobalTimerSnapshot& one, const GlobalTimerSnapshot& other) {
        return one.maRows == other.maRows;
    }
    /// The opposite.
    friend bool operator!=(const GlobalTimerSnapshot& one, const GlobalTimerSnapshot& other) {
        return !(one == other);
    }
};

ZANBASE_MODE_END

/// @}

#endif
