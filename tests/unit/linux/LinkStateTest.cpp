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

TEST_F(LinkState, AStrayMessageIsForgottenWithTheNextLook) {
    EXPECT_EQ(told(false, ZTLK_Up), "");
    mLink.forgetMessages();
    EXPECT_EQ(told(true, ZTLK_Up), "");
}
