#include "sensor/agentcommon/include/ScopeEvent.h"

#include <gtest/gtest.h>

TEST(ScopeEvent, KeepsItsCategoryAndSubcategory) {
    const ZTCScopeEvent lEvent(16, 0x40);
    EXPECT_EQ(16, lEvent.getCategory());
    EXPECT_EQ(0x40, lEvent.getSubcategory());
}

TEST(ScopeEvent, KeyFormHasTheCategoryInTheHighByteForEveryPair) {
    for (unsigned lCategory = 0; lCategory < 256; ++lCategory) {
        for (unsigned lSubcategory = 0; lSubcategory < 256; ++lSubcategory) {
            const ZTCScopeEvent lEvent(static_cast<unsigned char>(lCategory), static_cast<unsigned char>(lSubcategory));
            ASSERT_EQ(lCategory * 256 + lSubcategory, lEvent.getKeyForm());
        }
    }
}
