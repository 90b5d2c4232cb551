#include "libkpm/include/ScopeEventKinds.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <utility>

#include "tests/support/EventKinds.h"

TEST(ScopeEventKinds, EveryRowIsTheOneThatTheTestsExpect) {
    ASSERT_EQ(gcTestKinds.size(), gcScopeEventKindCount);
    for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
        const ZTSScopeEventKind& lcrKind = gcScopeEventKinds[lKind];
        const ZTSTestKind& lcrExpected = gcTestKinds[lKind];
        SCOPED_TRACE(lcrExpected.mpName);
        EXPECT_STREQ(lcrExpected.mpName, lcrKind.mpName);
        EXPECT_EQ(lcrExpected.mRegisteredCategory, lcrKind.mRegisteredCategory);
        EXPECT_EQ(lcrExpected.mRegisteredSubcategory, lcrKind.mRegisteredSubcategory);
        EXPECT_EQ(lcrExpected.mCategory, lcrKind.mDeliveredCategory);
        EXPECT_EQ(lcrExpected.mSubcategory, lcrKind.mDeliveredSubcategory);
        EXPECT_EQ(lcrExpected.mRecordSize, lcrKind.mRecordSize);
        EXPECT_EQ(lcrExpected.mAppendedSize, lcrKind.mEntrySize);
        if (lcrKind.isScope()) {
            EXPECT_EQ(lcrExpected.mMinimumLength, lcrKind.mDataSize);
        }
    }
}

TEST(ScopeEventKinds, TheDataOfTheThreeBoardEventsIsAnRscnHeaderALinkInfoAndTwoTemperatures) {
    EXPECT_EQ(4u, gcScopeEventKinds[findKindIndex("rscn").value()].mDataSize);
    EXPECT_EQ(168u, gcScopeEventKinds[findKindIndex("link").value()].mDataSize);
    EXPECT_EQ(8u, gcScopeEventKinds[findKindIndex("temperature").value()].mDataSize);
}

TEST(ScopeEventKinds, EveryNameAndEveryPairStandsOnce) {
    std::set<std::string> lNames;
    std::set<std::pair<int, int>> lRegistered;
    std::set<std::pair<int, int>> lDelivered;
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_TRUE(lNames.insert(lcrKind.mpName).second) << lcrKind.mpName;
        EXPECT_TRUE(lRegistered.insert({lcrKind.mRegisteredCategory, lcrKind.mRegisteredSubcategory}).second);
        EXPECT_TRUE(lDelivered.insert({lcrKind.mDeliveredCategory, lcrKind.mDeliveredSubcategory}).second);
    }
    EXPECT_EQ(20u, lNames.size());
}

TEST(ScopeEventKinds, OnlyTheThreeWithCallbacksOfTheirOwnAreDeliveredUnderAnotherPair) {
    std::set<std::string> lDiffering;
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        const bool lIsBoardEvent = lcrKind.mRegisteredCategory == 0;
        const bool lDiffers = lcrKind.mRegisteredCategory != lcrKind.mDeliveredCategory ||
                              lcrKind.mRegisteredSubcategory != lcrKind.mDeliveredSubcategory;
        EXPECT_EQ(lIsBoardEvent, lDiffers) << lcrKind.mpName;
        if (lDiffers) {
            lDiffering.insert(lcrKind.mpName);
        }
    }
    EXPECT_EQ((std::set<std::string>{"rscn", "link", "temperature"}), lDiffering);
}

TEST(ScopeEventKinds, FindsAKindByThePairItIsDeliveredUnder) {
    EXPECT_STREQ("plogi", findDeliveredKind(1, 0x01)->mpName);
    EXPECT_STREQ("rscn", findDeliveredKind(1, 0x20)->mpName);
    EXPECT_STREQ("link", findDeliveredKind(8, 0x02)->mpName);
    EXPECT_STREQ("temperature", findDeliveredKind(8, 0x04)->mpName);
    EXPECT_STREQ("adapter-arrival", findDeliveredKind(16, 0x01)->mpName);
}

TEST(ScopeEventKinds, FindsNothingUnderThePairsOfRegistrationAlone) {
    EXPECT_EQ(nullptr, findDeliveredKind(0, 0x01));
    EXPECT_EQ(nullptr, findDeliveredKind(0, 0x02));
    EXPECT_EQ(nullptr, findDeliveredKind(0, 0x20));
    EXPECT_EQ(nullptr, findDeliveredKind(255, 255));
}

TEST(ScopeEventKinds, EveryKindIsFoundByItsNameAndByItsRegistration) {
    for (std::size_t lKind = 0; lKind < gcScopeEventKindCount; ++lKind) {
        const ZTSScopeEventKind& lcrKind = gcScopeEventKinds[lKind];
        EXPECT_EQ(lKind, findKindIndex(lcrKind.mpName));
        EXPECT_EQ(lKind, findRegisteredKindIndex(lcrKind.mRegisteredCategory, lcrKind.mRegisteredSubcategory));
    }
}

TEST(ScopeEventKinds, WhatIsNoKindIsNotFound) {
    EXPECT_EQ(std::nullopt, findKindIndex("plog"));
    EXPECT_EQ(std::nullopt, findKindIndex(""));
    EXPECT_EQ(std::nullopt, findRegisteredKindIndex(1, 0x20));
    EXPECT_EQ(std::nullopt, findRegisteredKindIndex(0x0101, 0x01));
}
