#include "libkpm/linux/src/Boards.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>

using testing::Test;

static ZTSLinuxHost sHost(std::uint32_t aNumber, std::uint8_t aName) {
    ZTSLinuxHost lHost;
    lHost.mNumber = aNumber;
    lHost.mPortName.wwn[7] = aName;
    return lHost;
}

using ZTCBoardNumbers = std::vector<std::uint32_t>;

TEST(Boards, HostsGetBoardsInTheOrderOfTheirNumbers) {
    ZTCLinuxBoards lBoards;
    const auto lChanges = lBoards.update({sHost(2, 12), sHost(5, 15), sHost(11, 21)});
    EXPECT_EQ(lChanges.mArrived, (ZTCBoardNumbers{0, 1, 2}));
    EXPECT_TRUE(lChanges.mLeft.empty());
    EXPECT_EQ(lBoards.findHost(11), 2u);
    EXPECT_EQ(lBoards.getHosts(), (ZTCBoardNumbers{2, 5, 11}));
}

TEST(Boards, WhatStaysIsNoChange) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(2, 12)});
    const auto lChanges = lBoards.update({sHost(2, 12)});
    EXPECT_TRUE(lChanges.mArrived.empty() && lChanges.mLeft.empty() && lChanges.mRenamed.empty());
}

TEST(Boards, AHostThatComesLaterGetsTheNextBoardWhateverItsNumber) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(5, 15), sHost(6, 16)});
    EXPECT_EQ(lBoards.update({sHost(1, 11), sHost(5, 15), sHost(6, 16)}).mArrived, ZTCBoardNumbers{2});
    EXPECT_EQ(lBoards.findHost(1), 2u);
    EXPECT_EQ(lBoards.findHost(5), 0u);
}

TEST(Boards, AHostThatLeavesLeavesItsBoardEmptyAndTheCountAsItIs) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(0, 10), sHost(1, 11)});
    EXPECT_EQ(lBoards.update({sHost(1, 11)}).mLeft, ZTCBoardNumbers{0});
    EXPECT_EQ(lBoards.size(), 2u);
    EXPECT_EQ(lBoards.findHost(1), 1u);
    EXPECT_FALSE(lBoards.get(0).mHost.has_value());
    EXPECT_EQ(lBoards.update({sHost(1, 11), sHost(2, 12)}).mArrived, ZTCBoardNumbers{2}) << "no board is given twice";
}

TEST(Boards, APortThatComesBackUnderAnotherHostNumberGetsItsOwnBoard) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(0, 10), sHost(1, 11)});
    lBoards.update({sHost(1, 11)});
    EXPECT_EQ(lBoards.update({sHost(1, 11), sHost(7, 10)}).mArrived, ZTCBoardNumbers{0});
    EXPECT_EQ(lBoards.findHost(7), 0u);
    EXPECT_EQ(lBoards.size(), 2u);
}

TEST(Boards, ANameThatChangesKeepsTheBoardAndTheFormerNameIsKnown) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(0, 10)});
    const auto lChanges = lBoards.update({sHost(0, 20)});
    EXPECT_EQ(lChanges.mRenamed, ZTCBoardNumbers{0});
    EXPECT_TRUE(lChanges.mLeft.empty());
    EXPECT_TRUE(lChanges.mArrived.empty());
    EXPECT_EQ(lBoards.get(0).mPortName.wwn[7], 20);
    EXPECT_TRUE(lBoards.get(0).hasName(sHost(0, 10).mPortName));
    EXPECT_TRUE(lBoards.get(0).hasName(sHost(0, 20).mPortName));
    EXPECT_FALSE(lBoards.get(0).hasName(sHost(0, 30).mPortName));
    // And back again: the list of former names does not grow for ever.
    for (int lTimes = 0; lTimes < 10; ++lTimes) {
        lBoards.update({sHost(0, 10)});
        lBoards.update({sHost(0, 20)});
    }
    EXPECT_LE(lBoards.get(0).mFormerNames.size(), 2u);
}

TEST(Boards, HostsThatHaveChangedTheirNumbersKeepTheirBoards) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(0, 10), sHost(1, 11)});
    const auto lChanges = lBoards.update({sHost(0, 11), sHost(1, 10)});
    EXPECT_EQ(lChanges.mLeft, (ZTCBoardNumbers{0, 1}));
    EXPECT_EQ(lChanges.mArrived, (ZTCBoardNumbers{1, 0}));
    EXPECT_EQ(lBoards.findHost(0), 1u);
    EXPECT_EQ(lBoards.findHost(1), 0u);
    EXPECT_EQ(lBoards.size(), 2u);
}

TEST(Boards, AHostWithoutANameIsHeldBackOnceUntilItHasOne) {
    for (const std::uint8_t lNone : {std::uint8_t{0}, std::uint8_t{0xFF}}) {
        ZTSLinuxHost lUnnamed;
        std::fill(std::begin(lUnnamed.mPortName.wwn), std::end(lUnnamed.mPortName.wwn), lNone);
        ZTCLinuxBoards lBoards;
        EXPECT_EQ(lBoards.update({lUnnamed, sHost(1, 11)}).mHeldBack, ZTCBoardNumbers{0});
        EXPECT_EQ(lBoards.size(), 1u);
        EXPECT_FALSE(lBoards.findHost(0).has_value());
        EXPECT_EQ(lBoards.getHosts(), ZTCBoardNumbers{1});
        EXPECT_TRUE(lBoards.update({lUnnamed, sHost(1, 11)}).mHeldBack.empty()) << "told once";
        EXPECT_EQ(lBoards.update({sHost(0, 10), sHost(1, 11)}).mArrived, ZTCBoardNumbers{1});
        EXPECT_EQ(lBoards.findHost(0), 1u);
    }
}

TEST(Boards, AHostThatWasHeldBackAndLeftIsToldAgainWhenItComesBack) {
    ZTCLinuxBoards lBoards;
    EXPECT_EQ(lBoards.update({sHost(0, 0)}).mHeldBack, ZTCBoardNumbers{0});
    EXPECT_TRUE(lBoards.update({}).mLeft.empty());
    EXPECT_EQ(lBoards.update({sHost(0, 0)}).mHeldBack, ZTCBoardNumbers{0});
}

TEST(Boards, ANameThatCannotBeReadForAMomentChangesNothing) {
    ZTCLinuxBoards lBoards;
    lBoards.update({sHost(0, 10)});
    const auto lChanges = lBoards.update({sHost(0, 0)});
    EXPECT_TRUE(lChanges.mLeft.empty() && lChanges.mRenamed.empty() && lChanges.mHeldBack.empty());
    EXPECT_EQ(lBoards.get(0).mPortName.wwn[7], 10);
}
