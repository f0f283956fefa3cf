/// @file
/// The budgets of one test, for the listeners of test frameworks.
#ifndef ZANBASE_INTEGRATIONS_TEST_BUDGETS_H
#define ZANBASE_INTEGRATIONS_TEST_BUDGETS_H

#include <optional>
#include <string>

#include "zanbase/budget.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// The three budgets of a test, from its start to its end. Not thread-safe: one thread at a time uses an object.
class HTestBudgets {
public:
    /// Sets the limits of a test.
    using Limits = void (*)(HTestBudgets& budgets);

    /// Starts to count, within the limits that `limits` sets.
    explicit HTestBudgets(Limits limits) { limits(*this); }

    /// Of the allocation tracker.
    [[nodiscard]] HMemoryBudget& GetMemory() { return moMemory; }
    /// Of the disk ledger.
    [[nodiscard]] HDiskIOBudget& GetDiskIO() { return moDiskIO; }
    /// Of the timers.
    [[nodiscard]] HTimerBudget& GetTimers() { return moTimers; }

    /// Whether every limit is kept so far.
    [[nodiscard]] HBudgetResult Check() {
        // Each is checked, so that the text has all limits.
        const HBudgetResult results[] = {moMemory.Check(), moDiskIO.Check(), moTimers.Check()};
        return HBudgetResult(results[0].GetText() + results[1].GetText() + results[2].GetText());
    }

private:
    HMemoryBudget moMemory;
    HDiskIOBudget moDiskIO;
    HTimerBudget moTimers;
};

ZANBASE_MODE_END

/// @}

#endif
