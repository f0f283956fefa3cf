/// @file
/// Budgets for tests: scopes that check whether memory, disk operations or times stayed within a limit, and name the
/// call sites, files or timers that exceeded it.
///
/// A budget counts from its construction. `Check` returns a result that is true or false and has the reason as text,
/// so a budget works with any test framework:
///
///     HMemoryBudget budget;
///     budget.LimitLiveBytes(0).LimitAllocations(100);
///     ParseFile("big.txt");
///     EXPECT_TRUE(budget.Check()) << budget.GetText();
///
///     live bytes: 640, limit 0
///       src/parse.cpp:57: 640
///
/// Limits are in bytes or calls; a figure equal to its limit is within it. A limit that was not set is not
/// checked. The accounts belong to the whole process: what other threads record counts too. What is not recorded
/// does not count. `Check` takes a snapshot; see zanbase/snapshot.h for what that requires. Headers that give every
/// test a budget are in zanbase/integrations.
///
/// Requires: within the scope nothing calls `Push`, `Pop` or a reset of the account.
#ifndef ZANBASE_BUDGET_H
#define ZANBASE_BUDGET_H

#include <algorithm>
#include <cstdlib>
#include <map>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "zanbase/account_data.h"
#include "zanbase/export.h"
#include "zanbase/snapshot.h"

/// @addtogroup snapshots
/// @{

ZANBASE_MODE_BEGIN

/// A limit that nothing exceeds.
constexpr long long kNoLimit = 0x7FFFFFFFFFFFFFFF;

/// What a check found. A value: it does not depend on the budget. Thread-safe, as any plain value.
class HBudgetResult {
public:
    /// All limits are kept.
    HBudgetResult() = default;
    /// Limits are exceeded, as `text` says; if it is empty, all are kept.
    explicit HBudgetResult(std::string text) : moText(std::move(text)) {}

    /// True if all limits are kept.
    operator bool() const { return moText.empty(); }
    /// A line for each limit that is exceeded, and below it the worst call sites, files or timers; empty if all are
    /// kept.
    [[nodiscard]] const std::string& GetText() const { return moText; }

    /// Prints the text, or that all limits are kept.
    friend std::ostream& operator<<(std::ostream& stream, const HBudgetResult& result) {
        return stream << (result.moText.empty() ? "all limits are kept" : result.moText);
    }

private:
    std::string moText;
};

/// @cond
// Collects the texts of exceeded limits.
class HBudgetText {
public:
    // "WHAT: FIGURE, limit LIMIT" and a line for each of the largest shares above 0; nothing if the limit is kept.
    template <class Number>
    void Add(const char* what, Number figure, Number limit,
             std::vector<std::pair<std::string, Number>> shares) {
        constexpr std::size_t kShown = 3;
        if (figure <= limit) return;
        std::stable_sort(shares.begin(), shares.end(),
                         [](const auto& one, const auto& other) { return one.second > other.second; });
        moText +=
            std::string(what) + ": " + std::to_string(figure) + ", limit " + std::to_string(limit) + "\n";
        for (std::size_t index = 0; index < std::min(kShown, shares.size()); ++index) {
            const auto& [name, share] = shares[index];
            if (share > 0) moText += "  " + name + ": " + std::to_string(share) + "\n";
        }
    }

    [[nodiscard]] HBudgetResult Result() && { return HBudgetResult(std::move(moText)); }

private:
    std::string moText;
};
/// @endcond

/// Watches the allocation tracker. Not thread-safe: one thread at a time uses an object.
///
/// To measure the peak within the scope, the constructor sets the tracker's peak to the current total; the
/// destructor sets it to the higher one of the old and the new peak. So a usage report within the scope shows
/// the scope's peak.
/// Requires: budgets for memory are destroyed in the reverse order of their construction, and `Check` is called
/// for the latest one only.
class HMemoryBudget {
public:
    /// Starts to count.
    HMemoryBudget() : moStart(HMemorySnapshot::Take()), mnOldPeak(HRestartMemoryPeak(&mnStartTotal)) {}
    ~HMemoryBudget() { HRaiseMemoryPeak(mnOldPeak); }
    HMemoryBudget(const HMemoryBudget&) = delete;
    HMemoryBudget& operator=(const HMemoryBudget&) = delete;

    /// Bytes live at the check, less those live at the start.
    HMemoryBudget& LimitLiveBytes(long long limit) {
        mnLiveBytesLimit = limit;
        return *this;
    }
    /// Bytes that were allocated in the scope and not freed: the growth of each call site whose live bytes grew. What
    /// other sites freed in the scope does not make up for it, as it does for `LimitLiveBytes`.
    HMemoryBudget& LimitUnfreedBytes(long long limit) {
        mnUnfreedBytesLimit = limit;
        return *this;
    }
    /// The highest number of live bytes in the scope, less those live at the start.
    HMemoryBudget& LimitPeakBytes(long long limit) {
        mnPeakBytesLimit = limit;
        return *this;
    }
    /// Blocks recorded in the scope.
    HMemoryBudget& LimitAllocations(long long limit) {
        mnAllocationsLimit = limit;
        return *this;
    }

    /// Whether every limit is kept so far. May be called more than once.
    [[nodiscard]] HBudgetResult Check() {
        using Row = HMemorySnapshot::Row;
        const HTrackerPause pause;
        const HMemorySnapshot now = HMemorySnapshot::Take();
        const HMemorySnapshot scope = now.Since(moStart);
        long long unfreed = 0;
        for (const Row& row : scope.maRows) unfreed += std::max(row.mnLiveBytes, 0LL);
        HBudgetText text;
        text.Add("live bytes", scope.mnTotal, mnLiveBytesLimit, Shares(scope, &Row::mnLiveBytes));
        text.Add("bytes not freed", unfreed, mnUnfreedBytesLimit, Shares(scope, &Row::mnLiveBytes));
        text.Add("peak bytes", now.mnPeak - mnStartTotal, mnPeakBytesLimit, Shares(scope, &Row::mnAllocated));
        text.Add("allocations", scope.Total().mnAllocCount, mnAllocationsLimit,
                 Shares(scope, &Row::mnAllocCount));
        return moResult = std::move(text).Result();
    }

    /// The text of the last check; empty if there was none.
    [[nodiscard]] const std::string& GetText() const { return moResult.GetText(); }

private:
    static std::vector<std::pair<std::string, long long>> Shares(const HMemorySnapshot& memory,
                                                                 long long HMemorySnapshot::Row::*figure) {
        std::vector<std::pair<std::string, long long>> shares;
        for (const auto& row : memory.maRows)
            shares.emplace_back(row.moFile + ":" + std::to_string(row.mnLine), row.*figure);
        return shares;
    }

    HMemorySnapshot moStart;
    long long mnStartTotal = 0;  // bytes live when the peak was restarted
    long long mnOldPeak;         // of the tracker, at the start
    long long mnLiveBytesLimit = kNoLimit;
    long long mnUnfreedBytesLimit = kNoLimit;
    long long mnPeakBytesLimit = kNoLimit;
    long long mnAllocationsLimit = kNoLimit;
    HBudgetResult moResult;
};

/// Watches the disk ledger. Not thread-safe: one thread at a time uses an object.
class HDiskIOBudget {
public:
    /// Starts to count.
    HDiskIOBudget() : moStart(HDiskIOSnapshot::Take()) {}
    HDiskIOBudget(const HDiskIOBudget&) = delete;
    HDiskIOBudget& operator=(const HDiskIOBudget&) = delete;

    /// Opens in the scope.
    HDiskIOBudget& LimitOpens(long long limit) { return Limit(kOpens, limit); }
    /// Reads in the scope.
    HDiskIOBudget& LimitReads(long long limit) { return Limit(kReads, limit); }
    /// Bytes read in the scope.
    HDiskIOBudget& LimitBytesRead(long long limit) { return Limit(kBytesRead, limit); }
    /// Writes in the scope.
    HDiskIOBudget& LimitWrites(long long limit) { return Limit(kWrites, limit); }
    /// Bytes written in the scope.
    HDiskIOBudget& LimitBytesWritten(long long limit) { return Limit(kBytesWritten, limit); }

    /// Whether every limit is kept so far. May be called more than once.
    [[nodiscard]] HBudgetResult Check() {
        using Row = HDiskIOSnapshot::Row;
        using Operation = HDiskIOSnapshot::Operation;
        const struct {
            const char* what;
            Operation Row::*operation;
            long long Operation::*figure;
        } figures[kFigures] = {{"files opened", &Row::moOpen, &Operation::mnCount},
                               {"reads", &Row::moRead, &Operation::mnCount},
                               {"bytes read", &Row::moRead, &Operation::mnBytes},
                               {"writes", &Row::moWrite, &Operation::mnCount},
                               {"bytes written", &Row::moWrite, &Operation::mnBytes}};
        const HTrackerPause pause;
        const HDiskIOSnapshot scope = HDiskIOSnapshot::Take().Since(moStart);
        HBudgetText text;
        for (int number = 0; number < kFigures; ++number) {
            const auto& [what, operation, figure] = figures[number];
            std::vector<std::pair<std::string, long long>> shares;
            for (const Row& row : scope.maRows) shares.emplace_back(row.moName, row.*operation.*figure);
            text.Add(what, scope.Total().*operation.*figure, maLimits[number], std::move(shares));
        }
        return moResult = std::move(text).Result();
    }

    /// The text of the last check; empty if there was none.
    [[nodiscard]] const std::string& GetText() const { return moResult.GetText(); }

private:
    enum { kOpens, kReads, kBytesRead, kWrites, kBytesWritten, kFigures };

    HDiskIOBudget& Limit(int figure, long long limit) {
        maLimits[figure] = limit;
        return *this;
    }

    HDiskIOSnapshot moStart;
    long long maLimits[kFigures] = {kNoLimit, kNoLimit, kNoLimit, kNoLimit, kNoLimit};
    HBudgetResult moResult;
};

/// Watches the timers, outside continuous integration: the times of shared machines there are too noisy to fail a
/// test. Not thread-safe: one thread at a time uses an object.
class HTimerBudget {
public:
    /// Starts to count.
    HTimerBudget() : moStart(GlobalTimerSnapshot::Take()) {}
    HTimerBudget(const HTimerBudget&) = delete;
    HTimerBudget& operator=(const HTimerBudget&) = delete;

    /// Seconds that the timers called `name` add up in the scope, over all threads, open intervals included.
    HTimerBudget& LimitSeconds(std::string_view name, double limit) {
        maLimits[std::string(name)] = limit;
        return *this;
    }

    /// True if the environment variable `CI` is set and not empty, as services of continuous integration do.
    [[nodiscard]] static bool IsSkipped() {
        const char* const value = std::getenv("CI");
        return value != nullptr && *value != '\0';
    }

    /// Whether every limit is kept so far; true without a look at the timers if `IsSkipped`. May be called more than
    /// once.
    [[nodiscard]] HBudgetResult Check() { return IsSkipped() ? moResult = HBudgetResult() : CheckAlways(); }

    /// As `Check`, also in continuous integration.
    [[nodiscard]] HBudgetResult CheckAlways() {
        const HTrackerPause pause;
        const GlobalTimerSnapshot scope = GlobalTimerSnapshot::Take().Since(moStart);
        HBudgetText text;
        for (const auto& [name, limit] : maLimits) {
            const auto* const row = scope.Find(name);
            const double seconds = row != nullptr ? row->mdSeconds + row->mdOpenSeconds : 0;
            text.Add(("seconds of " + name).c_str(), seconds, limit, {});
        }
        return moResult = std::move(text).Result();
    }

    /// The text of the last check; empty if there was none.
    [[nodiscard]] const std::string& GetText() const { return moResult.GetText(); }

private:
    GlobalTimerSnapshot moStart;
    std::map<std::string, double> maLimits;
    HBudgetResult moResult;
};

ZANBASE_MODE_END

/// @}

#endif
