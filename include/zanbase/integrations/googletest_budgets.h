/// @file
/// Gives each test of a GoogleTest program a budget of its own. Requires GoogleTest.
///
///     int main(int argc, char** argv) {
///         testing::InitGoogleTest(&argc, argv);
///         HGoogleTestBudgets::Install([](HTestBudgets& budgets) { budgets.GetMemory().LimitUnfreedBytes(0); });
///         return RUN_ALL_TESTS();
///     }
#ifndef ZANBASE_INTEGRATIONS_GOOGLETEST_BUDGETS_H
#define ZANBASE_INTEGRATIONS_GOOGLETEST_BUDGETS_H

#include <optional>

#include <gtest/gtest.h>

#include "zanbase/integrations/test_budgets.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// A listener: starts the budgets before each test, and adds a failure with their text after one that exceeded them.
/// Not thread-safe: GoogleTest calls it on the thread that runs the tests.
class HGoogleTestBudgets : public testing::EmptyTestEventListener {
public:
    /// `limits` is called at the start of each test, set-up included.
    explicit HGoogleTestBudgets(HTestBudgets::Limits limits) : mpfnLimits(limits) {}

    /// Adds a listener to the program's, which own it. Call it before `RUN_ALL_TESTS`.
    static void Install(HTestBudgets::Limits limits) {
        testing::UnitTest::GetInstance()->listeners().Append(new HGoogleTestBudgets(limits));
    }

private:
    void OnTestStart(const testing::TestInfo&) override { moBudgets.emplace(mpfnLimits); }

    void OnTestEnd(const testing::TestInfo&) override {
        const HBudgetResult result = moBudgets->Check();
        moBudgets.reset();
        if (!result) ADD_FAILURE() << result;
    }

    HTestBudgets::Limits mpfnLimits;
    std::optional<HTestBudgets> moBudgets;  // of the test that runs
};

ZANBASE_MODE_END

/// @}

#endif
