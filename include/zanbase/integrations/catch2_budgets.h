/// @file
/// Gives each test case of a Catch2 program a budget of its own, each run through its sections. Requires Catch2 version 2;
/// include it in the file that has the program's `main`.
///
///     #define CATCH_CONFIG_MAIN
///     #include <zanbase/integrations/catch2_budgets.h>
///
///     void Limits(HTestBudgets& budgets) { budgets.GetMemory().LimitUnfreedBytes(0); }
///     using Budgets = HCatch2Budgets<Limits>;
///     CATCH_REGISTER_LISTENER(Budgets)
#ifndef ZANBASE_INTEGRATIONS_CATCH2_BUDGETS_H
#define ZANBASE_INTEGRATIONS_CATCH2_BUDGETS_H

#ifndef CATCH_CONFIG_EXTERNAL_INTERFACES
#define CATCH_CONFIG_EXTERNAL_INTERFACES
#endif
#include <catch2/catch.hpp>

#include <optional>

#include "zanbase/integrations/test_budgets.h"

/// @addtogroup integrations
/// @{

ZANBASE_MODE_BEGIN

/// A listener: starts the budgets before each run through a test case, and fails an assertion with their text after one
/// that exceeded them. `limits` is called at each start. Not thread-safe: Catch2 calls it on the thread that runs the
/// tests.
template <HTestBudgets::Limits limits>
class HCatch2Budgets : public Catch::TestEventListenerBase {
public:
    /// Catch2 makes the listener.
    using Catch::TestEventListenerBase::TestEventListenerBase;

private:
    // The outermost section is the test case.
    void sectionStarting(const Catch::SectionInfo& info) override {
        TestEventListenerBase::sectionStarting(info);
        if (mnDepth++ == 0) moBudgets.emplace(limits);
    }

    void sectionEnded(const Catch::SectionStats& stats) override {
        if (--mnDepth == 0) {
            const HBudgetResult result = moBudgets->Check();
            moBudgets.reset();
            if (!result) CHECK(result);
        }
        TestEventListenerBase::sectionEnded(stats);
    }

    int mnDepth = 0;                        // of sections
    std::optional<HTestBudgets> moBudgets;  // of the run that is in progress
};

ZANBASE_MODE_END

/// @}

#endif
