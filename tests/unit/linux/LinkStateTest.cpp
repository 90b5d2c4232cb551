#include "libkpm/linux/src/LinkState.h"

#include <gtest/gtest.h>

#include <string>

/// "down#1" and so on.
static std::string sTold(const std::vector<ZTSLinuxLinkChange>& acrChanges) {
    std::string lText;
    for (const ZTSLinuxLinkChange& lrChange : acrChanges) {
        EXPECT_EQ(lrChange.mTag, lrChange.mUp + lrChange.mDown);
        lText += (lText.empty() ? "" : " ") + std::string(lrChange.mIsUp ? "up#" : "down#") +
                 std::to_string(lrChange.mIsUp ? lrChange.mUp : lrChange.mDown);
    }
    return lText;
}

class LinkState : public testing::Test {
protected:
    LinkState() { mLink.noteReading(ZTLK_Up); }

    std::string read(ZTELinuxLink aState) { return sTold(mLink.noteReading(aState)); }
    std::string told(bool aIsUp, ZTELinuxLink aState) {
        mLink.noteMessage(aIsUp);
        return read(aState);
    }

    ZTCLinuxLinkState mLink;
};

TEST_F(LinkState, TheFirstKnownStateIsNoChange) {
    ZTCLinuxLinkState lLink;
    EXPECT_EQ(sTold(lLink.noteReading(ZTLK_Unknown)), "");
    lLink.noteMessage(true);
    EXPECT_EQ(sTold(lLink.noteReading(ZTLK_Down)), "");
    EXPECT_EQ(sTold(lLink.noteReading(ZTLK_Up)), "up#1");
}

TEST_F(LinkState, EveryChangeIsToldOnce) {
    EXPECT_EQ(read(ZTLK_Up), "");
    EXPECT_EQ(read(ZTLK_Down), "down#1");
    EXPECT_EQ(read(ZTLK_Down), "");
    EXPECT_EQ(read(ZTLK_Up), "up#1");
    EXPECT_EQ(read(ZTLK_Down), "down#2");
}

TEST_F(LinkState, AStateThatCannotBeReadChangesNothing) {
    EXPECT_EQ(read(ZTLK_Unknown), "");
    EXPECT_EQ(read(ZTLK_Up), "");
    EXPECT_TRUE(mLink.isUp());
}

TEST_F(LinkState, HoweverManyMessagesTellOfAChangeItIsOne) {
    EXPECT_EQ(told(false, ZTLK_Down), "down#1");
    EXPECT_EQ(told(false, ZTLK_Down), "");
    EXPECT_EQ(told(true, ZTLK_Up), "up#1");
    EXPECT_EQ(told(true, ZTLK_Up), "");
    EXPECT_EQ(told(true, ZTLK_Up), "");
}

TEST_F(LinkState, AMessageAheadOfTheStateIsNoChangeByItself) {
    EXPECT_EQ(told(false, ZTLK_Up), "");
    EXPECT_EQ(read(ZTLK_Down), "down#1");
    EXPECT_EQ(told(true, ZTLK_Down), "");
    EXPECT_EQ(read(ZTLK_Up), "up#1");
    EXPECT_EQ(read(ZTLK_Up), "");
}

TEST_F(LinkState, AFlapBetweenTwoReadingsIsBothChanges) {
    EXPECT_EQ(told(false, ZTLK_Up), "");
    EXPECT_EQ(told(true, ZTLK_Up), "down#1 up#1");
    EXPECT_EQ(read(ZTLK_Up), "");
    EXPECT_EQ(told(true, ZTLK_Up), "");
}

TEST_F(LinkState, AFlapAndAChangeAreThree) {
    EXPECT_EQ(told(false, ZTLK_Up), "");
    EXPECT_EQ(told(true, ZTLK_Down), "down#1 up#1 down#2");
}

TEST_F(LinkState, MessagesOfAChangeThatTheReadingIsAheadOfAreNoFlap) {
    EXPECT_EQ(told(false, ZTLK_Down), "down#1");
    EXPECT_EQ(told(true, ZTLK_Up), "up#1");
    // The link has gone down while messages of its going up are still to be read.
    EXPECT_EQ(told(true, ZTLK_Down), "down#2");
    EXPECT_EQ(told(true, ZTLK_Down), "");
    EXPECT_EQ(told(false, ZTLK_Down), "");
    EXPECT_EQ(told(false, ZTLK_Down), "");
    // And up again, before a message of its going down was read.
    EXPECT_EQ(read(ZTLK_Up), "up#2");
    EXPECT_EQ(read(ZTLK_Down), "down#3");
    EXPECT_EQ(told(true, ZTLK_Down), "");
    EXPECT_EQ(told(false, ZTLK_Down), "");
    EXPECT_EQ(told(true, ZTLK_Up), "up#3");
}

TEST_F(LinkState, WhateverTheOrderOfReadingsAndMessagesEachChangeIsToldOnce) {
    // Each change has two messages, and every pattern of how many of them each reading sees is tried.
    static constexpr unsigned scChanges = 4;
    static constexpr unsigned scSteps = 3 * scChanges;
    for (unsigned lPattern = 0; lPattern < 1u << scSteps; ++lPattern) {
        ZTCLinuxLinkState lLink;
        lLink.noteReading(ZTLK_Up);
        unsigned lHappened = 0;
        unsigned lSent = 0;
        std::vector<ZTSLinuxLinkChange> lTold;
        const auto lRead = [&] {
            for (const ZTSLinuxLinkChange& lrChange : lLink.noteReading(lHappened % 2 == 0 ? ZTLK_Up : ZTLK_Down)) {
                lTold.push_back(lrChange);
            }
        };
        for (unsigned lStep = 0; lStep < scSteps; ++lStep) {
            if ((lPattern >> lStep & 1) != 0 && lHappened < scChanges) {
                ++lHappened;
            } else if (lSent < 2 * lHappened) {
                lLink.noteMessage(lSent / 2 % 2 == 1);
                ++lSent;
                lRead();
            }
        }
        for (; lSent < 2 * lHappened; ++lSent) {
            lLink.noteMessage(lSent / 2 % 2 == 1);
            lRead();
        }
        ASSERT_EQ(lTold.size(), lHappened) << "pattern " << lPattern;
        for (unsigned lChange = 0; lChange < lHappened; ++lChange) {
            ASSERT_EQ(lTold[lChange].mIsUp, lChange % 2 == 1) << "pattern " << lPattern;
        }
    }
}

TEST_F(LinkState, AStrayMessageIsForgottenWithTheNextLook) {
    EXPECT_EQ(told(false, ZTLK_Up), "");
    mLink.forgetMessages();
    EXPECT_EQ(told(true, ZTLK_Up), "");
}

TEST_F(LinkState, AReadingAheadOfAMessageThatNeverComesHidesNoLaterFlap) {
    EXPECT_EQ(read(ZTLK_Down), "down#1");
    mLink.forgetMessages();
    EXPECT_EQ(told(true, ZTLK_Down), "");
    EXPECT_EQ(told(false, ZTLK_Down), "up#1 down#2");
}
