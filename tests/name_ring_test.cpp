// Names in the ring: which slot they take, how long they last, and where they are cut.
#include "zanbase/name_ring.h"

#include <gtest/gtest.h>

#include <string>

#include "text/name_ring.h"

// First in the file, and under ctest in a process of its own: no slot is taken yet.
TEST(NameRing, StartsAtSlotZeroAndKeepsANameFor255Takes) {
    for (int take = 0; take <= 512; ++take) ASSERT_EQ(MkName("kept"), goNameRing.maSlots[take % 256]);
    for (int take = 1; take < 256; ++take) {
        const char* const end_of_slot = goNameRing.maSlots[take] + 4095;
        ASSERT_EQ(MkName(take) + std::to_string(take).size(), end_of_slot);
    }
    EXPECT_STREQ(goNameRing.maSlots[0], "kept");
}

TEST(NameRing, CutsTextsAtTheEndOfASlot) {
    const std::string full(4095, 'x'), more = full + "y";
    EXPECT_EQ(MkNameC("%s", more.c_str()), full);
    EXPECT_EQ(MkTokenName(more.c_str(), nullptr), full);
    EXPECT_STREQ(MkTokenName("a", "bc", nullptr), "a|bc");
    EXPECT_STREQ(MkName(1e70, 2), "10000000000000000725314363815292351261583744096465219555182101554790400");
}
