// The second run through the sections leaves a block.
#define CATCH_CONFIG_MAIN
#include <zanbase/integrations/catch2_budgets.h>

#include <zanbase/memory.h>

namespace {

void Limits(HTestBudgets& budgets) { budgets.GetMemory().LimitUnfreedBytes(0); }
using Budgets = HCatch2Budgets<Limits>;
CATCH_REGISTER_LISTENER(Budgets)

TEST_CASE("sections") {
    static char block[8];
    SECTION("kept") { SUCCEED(); }
    SECTION("exceeded") { HMemory::Alloc(block, 8, "a.cpp", 1); }
    SECTION("kept again") { HMemory::Free(block); }
}

}  // namespace
