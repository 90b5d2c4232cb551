#include "libkpm/linux/src/KindSources.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

TEST(KindSources, EveryRowNamesAKind) {
    std::set<std::string_view> lNames;
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        lNames.insert(lrKind.mpName);
    }
    for (const ZTSLinuxKindSource& lrRow : gcLinuxKindSources) {
        EXPECT_TRUE(lNames.contains(lrRow.mName)) << lrRow.mName;
        EXPECT_NE(lrRow.mSource, ZTLSO_None);
    }
}

TEST(KindSources, ThirteenKindsHaveNoSource) {
    std::size_t lNone = 0;
    for (std::size_t lKind = 0; lKind < gcLinuxKindCount; ++lKind) {
        lNone += getLinuxSource(lKind) == ZTLSO_None ? 1 : 0;
    }
    EXPECT_EQ(lNone, 13u);
}

TEST(KindSources, ItsKindsAreThoseOfTheirRegistrations) {
    EXPECT_EQ(findRegisteredKindIndex(4, 1), gcLinuxQueueFull);
    EXPECT_EQ(findRegisteredKindIndex(4, 2), gcLinuxDeviceBusy);
    EXPECT_EQ(findRegisteredKindIndex(4, 4), gcLinuxCheckCondition);
    EXPECT_EQ(findRegisteredKindIndex(4, 0x40), gcLinuxQueueDepth);
    EXPECT_EQ(findRegisteredKindIndex(16, 1), gcLinuxAdapterArrival);
    EXPECT_EQ(findRegisteredKindIndex(0, 1), gcLinuxLink);
    EXPECT_EQ(findRegisteredKindIndex(0, 2), gcLinuxRscn);
    EXPECT_FALSE(findRegisteredKindIndex(1, 0x20).has_value());
    EXPECT_FALSE(findRegisteredKindIndex(0x104, 1).has_value());
}
