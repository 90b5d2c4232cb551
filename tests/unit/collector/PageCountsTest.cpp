#include "sensor/collector/include/PageCounts.h"

#include <gtest/gtest.h>

static ZTSStatusSnapshot sPage() {
    ZTSStatusSnapshot lPage;
    lPage.mBoards.resize(2);
    lPage.mBoards[0].mWwpn = {0x10, 0, 0, 0, 0, 0, 0, 1};
    lPage.mBoards[1].mWwpn = {0x10, 0, 0, 0, 0, 0, 0, 2};
    lPage.mBoards[1].mWwnn = {0x20, 0, 0, 0, 0, 0, 0, 2};
    return lPage;
}

TEST(PageCounts, EachRowHasItsKindAndTheLastOneNone) {
    for (std::size_t i = 0; i < gcStatusKinds; ++i) {
        EXPECT_EQ(getKindName(getRowKind(i)), getStatusRowName(i));
    }
    EXPECT_EQ(getRowKind(gcStatusOtherRow), 0);
}

TEST(PageCounts, RowsWithoutEventsAreLeftOut) {
    EXPECT_TRUE(toPageCounts(sPage()).empty());
}

TEST(PageCounts, ARowIsCarriedOverWhole) {
    ZTSStatusSnapshot lPage = sPage();
    ZTSStatusRowCopy& lrRow = lPage.mBoards[1].mRows[9];
    lrRow.mConsolidated = 100;
    lrRow.mHandedOver = 60;
    lrRow.mDropped = 5;
    lrRow.mRefused = {1, 2, 3, 4, 5, 6, 7};
    lPage.mUnknownBoards.mRefused[ZTSR_UnknownBoard] = 9;
    const std::vector<ZTSPageCounts> lCounts = toPageCounts(lPage);
    ASSERT_EQ(lCounts.size(), 2U);
    EXPECT_FALSE(lCounts[0].mWwpn);
    EXPECT_EQ(lCounts[0].mKind, 0);
    EXPECT_EQ(lCounts[0].mReceived, 9U);
    EXPECT_EQ(lCounts[1].mWwpn->toText(), "10:00:00:00:00:00:00:02");
    EXPECT_EQ(lCounts[1].mWwnn->toText(), "20:00:00:00:00:00:00:02");
    EXPECT_EQ(lCounts[1].mKind, getRowKind(9));
    EXPECT_EQ(lCounts[1].mReceived, 128U);
    EXPECT_EQ(lCounts[1].mHeld, 35U);
    EXPECT_EQ(lCounts[1].mHandedOver, 60U);
    EXPECT_EQ(lCounts[1].mDropped, 5U);
    for (std::size_t i = 0; i < gcStatusRefusals; ++i) {
        EXPECT_EQ(lCounts[1].mRefused.at(i), i + 1);
        EXPECT_STREQ(getRefusalName(static_cast<ZTERefusal>(i)), gcStatusRefusalNames[i]);
    }
}

TEST(PageCounts, EachKindOfEachBoardHasItsState) {
    ZTSStatusSnapshot lPage = sPage();
    for (std::size_t i = 0; i < gcStatusStateNames.size(); ++i) {
        lPage.mBoards[0].mRows[i].mState = static_cast<ZTEStatusState>(i);
    }
    const std::vector<ZTSKindStateNow> lStates = toKindStates(lPage);
    ASSERT_EQ(lStates.size(), 2 * gcStatusKinds);
    for (std::size_t i = 0; i < gcStatusStateNames.size(); ++i) {
        EXPECT_STREQ(getKindStateName(lStates[i].mState), gcStatusStateNames[i]);
        EXPECT_EQ(lStates[i].mKind, getRowKind(i));
    }
}

TEST(PageCounts, WhatIsHeldIsKnownForEachInitiatorAndKind) {
    ZTSStatusSnapshot lPage = sPage();
    lPage.mBoards[1].mRows[9].mConsolidated = 1;
    const ZTSInitiator lFirst{.mWwpn = ZTSFcName{.mBytes = lPage.mBoards[0].mWwpn}, .mWwnn = {}, .mHost = {}};
    const ZTSInitiator lSecond{.mWwpn = ZTSFcName{.mBytes = lPage.mBoards[1].mWwpn}, .mWwnn = {}, .mHost = {}};
    EXPECT_TRUE(holdsNothing(lPage, lFirst, getRowKind(9)));
    EXPECT_FALSE(holdsNothing(lPage, lSecond, getRowKind(9)));
    EXPECT_TRUE(holdsNothing(lPage, lSecond, getRowKind(8)));
    EXPECT_TRUE(holdsNothing(lPage, {}, getRowKind(9)));
}
