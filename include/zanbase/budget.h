/// @file
/// Budgets for tests: scopes that tell whether memory or disk operations stayed within a limit, and which call
/// sites or files exceeded it.
///
/// A budget counts from its construction. `Check` returns true or false and `GetText` tells why, so a budget
/// works with any test framework:
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
/// does not count. `Check` takes a snapshot; see zanbase/snapshot.h for what that requires.
///
/// Requires: within the scope nothing calls `Push`, `Pop` or a reset of the account.
#ifndef ZANBASE_BUDGET_H
#define ZANBASE_BUDGET_H

#include <string>

#include "zanbase/export.h"
#include "zanbase/snapshot.h"

/// @addtogroup snapshots
/// @{

/// A limit that nothing exceeds.
constexpr long long kNoLimit = 0x7FFFFFFFFFFFFFFF;

/// Watches the allocation tracker. Not thread-safe: one thread at a time uses an object.
///
/// To measure the peak within the scope, the constructor sets the tracker's peak to the current total; the
/// destructor sets it to the higher one of the old and the new peak. So a usage report within the scope shows
/// the scope's peak.
/// Requires: budgets for memory are destroyed in the reverse order of their construction, and `Check` is called
/// for the latest one only.
class ZANBASE_API HMemoryBudget {
public:
    /// Starts to count.
    HMemoryBudget();
    ~HMemoryBudget();
    HMemoryBudget(const HMemoryBudget&) = delete;
    HMemoryBudget& operator=(const HMemoryBudget&) = delete;

    /// Bytes live at the check, less those live at the start.
    HMemoryBudget& LimitLiveBytes(long long limit);
    /// The highest number of live bytes in the scope, less those live at the start.
    HMemoryBudget& LimitPeakBytes(long long limit);
    /// Blocks recorded in the scope.
    HMemoryBudget& LimitAllocations(long long limit);

    /// True if every limit is kept so far. May be called more than once.
    [[nodiscard]] bool Check();

    /// A line for each limit that the last check found exceeded, and below it the worst call sites; empty if
    /// all were kept.
    [[nodiscard]] const std::string& GetText() const { return moText; }

private:
    HMemorySnapshot moStart;
    long long mnOldPeak = 0;  // of the tracker, at the start
    long long mnLiveBytesLimit = kNoLimit;
    long long mnPeakBytesLimit = kNoLimit;
    long long mnAllocationsLimit = kNoLimit;
    std::string moText;
};

/// Watches the disk ledger. Not thread-safe: one thread at a time uses an object.
class ZANBASE_API HDiskIOBudget {
public:
    /// Starts to count.
    HDiskIOBudget();
    HDiskIOBudget(const HDiskIOBudget&) = delete;
    HDiskIOBudget& operator=(const HDiskIOBudget&) = delete;

    /// Opens in the scope.
    HDiskIOBudget& LimitOpens(long long limit);
    /// Reads in the scope.
    HDiskIOBudget& LimitReads(long long limit);
    /// Bytes read in the scope.
    HDiskIOBudget& LimitBytesRead(long long limit);

    /// True if every limit is kept so far. May be called more than once.
    [[nodiscard]] bool Check();

    /// A line for each limit that the last check found exceeded, and below it the worst files; empty if all
    /// were kept.
    [[nodiscard]] const std::string& GetText() const { return moText; }

private:
    HDiskIOSnapshot moStart;
    long long mnOpensLimit = kNoLimit;
    long long mnReadsLimit = kNoLimit;
    long long mnBytesReadLimit = kNoLimit;
    std::string moText;
};

/// @}

#endif
