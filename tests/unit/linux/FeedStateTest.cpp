#include "libkpm/linux/src/FeedState.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <vector>

static constexpr ZTEFeedState scStates[] = {ZTFS_Idle,     ZTFS_Working, ZTFS_Resting,
                                            ZTFS_NoRights, ZTFS_Failed,  ZTFS_Closed};
static constexpr ZTEFeedHappening scHappenings[] = {ZTFH_HostFound,   ZTFH_Opened, ZTFH_NotGranted, ZTFH_Broken,
                                                    ZTFH_NothingRead, ZTFH_Look,   ZTFH_Stop};

static bool sIsOpen(ZTEFeedState aState) {
    return aState == ZTFS_Working || aState == ZTFS_Resting;
}

TEST(FeedState, AStopClosesWhateverTheStateAndNothingOpensAfterIt) {
    for (const ZTEFeedState lState : scStates) {
        EXPECT_EQ(getFeedStep(lState, ZTFH_Stop).mNext, ZTFS_Closed);
        EXPECT_EQ(getFeedStep(lState, ZTFH_Stop).mAction, sIsOpen(lState) ? ZTFA_Close : ZTFA_None);
    }
    for (const ZTEFeedHappening lHappening : scHappenings) {
        const ZTSFeedStep lStep = getFeedStep(ZTFS_Closed, lHappening);
        EXPECT_EQ(lStep.mNext, ZTFS_Closed);
        EXPECT_EQ(lStep.mAction, ZTFA_None);
        EXPECT_FALSE(lStep.mIsToTell);
    }
}

TEST(FeedState, OnlyAnOpenSourceIsClosedAndOnlyAClosedOneIsOpened) {
    for (const ZTEFeedState lState : scStates) {
        for (const ZTEFeedHappening lHappening : scHappenings) {
            const ZTSFeedStep lStep = getFeedStep(lState, lHappening);
            EXPECT_EQ(lStep.mAction == ZTFA_Close, sIsOpen(lState) && !sIsOpen(lStep.mNext)) << lState << lHappening;
            if (lStep.mAction == ZTFA_Open) {
                EXPECT_FALSE(sIsOpen(lState));
                EXPECT_EQ(lStep.mNext, lState) << "it changes when the outcome is known";
            }
            EXPECT_EQ(!sIsOpen(lState) && sIsOpen(lStep.mNext),
                      lHappening == ZTFH_Opened && lState != ZTFS_Closed && !sIsOpen(lState));
        }
    }
}

TEST(FeedState, ASourceIsOpenedWithTheFirstHostAndTriedAgainWithTheLooks) {
    EXPECT_EQ(getFeedStep(ZTFS_Idle, ZTFH_HostFound).mAction, ZTFA_Open);
    EXPECT_EQ(getFeedStep(ZTFS_Idle, ZTFH_Look).mAction, ZTFA_None);
    for (const ZTEFeedState lState : {ZTFS_NoRights, ZTFS_Failed}) {
        EXPECT_EQ(getFeedStep(lState, ZTFH_HostFound).mAction, ZTFA_None);
        EXPECT_EQ(getFeedStep(lState, ZTFH_Look).mAction, ZTFA_Open);
        EXPECT_EQ(getFeedStep(lState, ZTFH_Opened).mNext, ZTFS_Working);
    }
}

TEST(FeedState, ASourceThatIsReadableWithNothingToReadRestsUntilTheNextLook) {
    EXPECT_EQ(getFeedStep(ZTFS_Working, ZTFH_NothingRead).mNext, ZTFS_Resting);
    EXPECT_EQ(getFeedStep(ZTFS_Resting, ZTFH_Look).mNext, ZTFS_Working);
    EXPECT_FALSE(getFeedStep(ZTFS_Working, ZTFH_NothingRead).mIsToTell);
}

TEST(FeedState, AChangeIsToldOnceForEachReason) {
    ZTCFeedState lState;
    EXPECT_TRUE(lState.happen(ZTFH_NotGranted, "no right").mIsToTell);
    EXPECT_EQ(lState.get(), ZTFS_NoRights);
    EXPECT_EQ(lState.getReason(), "no right");
    EXPECT_FALSE(lState.happen(ZTFH_NotGranted, "no right").mIsToTell);
    EXPECT_TRUE(lState.happen(ZTFH_NotGranted, "another").mIsToTell);
    EXPECT_TRUE(lState.happen(ZTFH_Broken, "another").mIsToTell) << "another state";
    EXPECT_EQ(lState.getChanges(), 3u);
    EXPECT_TRUE(lState.happen(ZTFH_Opened).mIsToTell);
    EXPECT_TRUE(lState.isOpen());
    EXPECT_EQ(lState.getReason(), "");
    EXPECT_FALSE(lState.happen(ZTFH_NothingRead).mIsToTell);
    EXPECT_TRUE(lState.isOpen());
    EXPECT_EQ(lState.happen(ZTFH_Broken, "lost").mAction, ZTFA_Close);
    EXPECT_FALSE(lState.isOpen());
    EXPECT_EQ(lState.getChanges(), 5u);
}

TEST(FeedState, WhatAHostDoesNotGrantIsToldFromWhatFails) {
    for (const int lError : {EPERM, EACCES, EROFS}) {
        EXPECT_EQ(judgeFeedError(lError), ZTFH_NotGranted) << lError;
    }
    for (const int lError : {ENOENT, ENOMEM, EMFILE, EINVAL, 0}) {
        EXPECT_EQ(judgeFeedError(lError), ZTFH_Broken) << lError;
    }
}

TEST(FeedState, RetriesComeAtTheNextLookThenAfterTwoFourAndSoOnUpToThirtyTwo) {
    ZTCRetryPause lPause;
    std::vector<unsigned> lPauses;
    for (unsigned lLook = 1, lLast = 0; lPauses.size() < 8; ++lLook) {
        if (lPause.isDue()) {
            lPauses.push_back(lLook - lLast);
            lLast = lLook;
        }
    }
    EXPECT_EQ(lPauses, (std::vector<unsigned>{1, 2, 4, 8, 16, 32, 32, 32}));
    lPause.reset();
    EXPECT_TRUE(lPause.isDue());
}
