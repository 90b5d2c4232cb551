#include "sensor/collector/include/LiveStateJson.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

using testing::ElementsAre;

class LiveStateJsonTest : public testing::Test {
protected:
    LiveStateJsonTest() {
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        lpPage->mStartId = "00ff";
        lpPage->mHeldBytes = 40;
        lpPage->mAdaptersNow = 1;
        lpPage->mBoards.resize(1);
        lpPage->mBoards[0].mWwpn = {0x10, 0, 0, 0, 0, 0, 0, 1};
        lpPage->mBoards[0].mRows[5].mState = ZTSS_NoRights;
        lpPage->mBoards[0].mRows[5].mStateReason = "needs more";
        lpPage->mBoards[0].mRows[9].mLastEvent = 1700000000000000;
        mFacts.mpPage = lpPage;
        mFacts.mNow = mFacts.mSince = fromMicroseconds(1700000000000000);
        mFacts.mLosses.mSince = mFacts.mNow;
        mFacts.mPorts.mInitiators.push_back(
            {.mHost = "host7", .mWwpn = ZTSFcName{.mBytes = lpPage->mBoards[0].mWwpn}, .mState = "Online"});
    }
    nlohmann::json read() const {
        const std::string lText = toLiveStateJson(mFacts);
        EXPECT_EQ(lText.find('\n'), std::string::npos);
        return nlohmann::json::parse(lText);
    }

    ZTSLiveFacts mFacts;
};

TEST_F(LiveStateJsonTest, WhatIsNotKnownIsNullAndNeverZero) {
    mFacts.mpPage = nullptr;
    const nlohmann::json lState = read();
    for (const char* lpMember : {"adapters", "kinds", "storeId"}) {
        EXPECT_TRUE(lState.at(lpMember).is_null()) << lpMember;
    }
    EXPECT_TRUE(lState["keeper"]["state"].is_null());
    EXPECT_TRUE(lState["collector"]["lastRetrieval"].is_null());
    EXPECT_TRUE(lState["collector"]["lastEvent"].is_null());
    EXPECT_FALSE(lState["agent"].contains("heldBytes"));
    EXPECT_TRUE(lState["agent"]["pid"].is_null());
}

TEST_F(LiveStateJsonTest, TheLedgerIsThatOfAllAgentsUpToNow) {
    EXPECT_TRUE(read()["ledger"].is_null()) << "what earlier agents counted is not known";
    ZTSPageCounts lOther;
    lOther.mWwpn = ZTSFcName{.mBytes = {0x10, 0, 0, 0, 0, 0, 0, 1}};
    lOther.mWwnn = ZTSFcName{};
    lOther.mKind = *findKind("rscn");
    lOther.mReceived = 9;
    lOther.mRefused[ZTRF_TotalLimit] = 4;
    lOther.mConsolidated = lOther.mHandedOver = 5;
    mFacts.mHistory.mpOthers = std::make_shared<const std::vector<ZTSPageCounts>>(1, lOther);
    mFacts.mHistory.mGeneration = "00ff";
    auto lpPage = std::make_shared<ZTSStatusSnapshot>(*mFacts.mpPage);
    lpPage->mBoards[0].mRows[5].mConsolidated = 7;
    lpPage->mBoards[0].mRows[5].mHandedOver = 6;
    ASSERT_STREQ(getStatusRowName(5), "rscn");
    mFacts.mpPage = lpPage;
    const nlohmann::json lLedger = read()["ledger"];
    ASSERT_EQ(lLedger.size(), 1U);
    EXPECT_EQ(lLedger[0]["kind"], "rscn");
    EXPECT_EQ(lLedger[0]["initiator"]["host"], "host7");
    EXPECT_EQ(lLedger[0]["received"], 16);
    EXPECT_EQ(lLedger[0]["refused"]["total-limit"], 4);
    EXPECT_EQ(lLedger[0]["consolidated"], 12);
    EXPECT_EQ(lLedger[0]["handedOver"], 11);
    EXPECT_EQ(lLedger[0]["held"], 1);
    // The page of an agent that has ended is among the others.
    mFacts.mHistory.mGeneration = "";
    EXPECT_EQ(read()["ledger"][0]["received"], 9);
    mFacts.mHistory.mGeneration = "00fe";
    EXPECT_TRUE(read()["ledger"].is_null()) << "the history has not met this agent yet";
}

TEST_F(LiveStateJsonTest, ThePageIsShown) {
    const nlohmann::json lState = read();
    EXPECT_EQ(lState["agent"]["generation"], "00ff");
    EXPECT_EQ(lState["agent"]["heldBytes"], 40);
    EXPECT_TRUE(lState["agent"]["endReason"].is_null());
    EXPECT_EQ(lState["adapters"][0]["host"], "host7");
    EXPECT_EQ(lState["adapters"][0]["portState"], "Online");
    EXPECT_TRUE(lState["adapters"][0]["speed"].is_null());
    EXPECT_EQ(lState["kinds"][0]["kinds"].size(), gcStatusKinds);
    EXPECT_EQ(lState["kinds"][0]["kinds"][getStatusRowName(5)], "no_rights");
    EXPECT_EQ(lState["kinds"][0]["words"][getStatusRowName(5)], "needs more");
    EXPECT_EQ(lState["collector"]["lastEventKind"], getStatusRowName(9));
}

TEST_F(LiveStateJsonTest, TheDiskIsOkFullOrReadOnly) {
    EXPECT_EQ(read()["collector"]["disk"], "ok");
    mFacts.mHistory.mProblem = "the database is full";
    EXPECT_EQ(read()["collector"]["disk"], "full");
    EXPECT_EQ(read()["collector"]["diskProblem"], "the database is full");
    mFacts.mSpoolProblem = "no room for 8388608 bytes";
    mFacts.mIsSpoolReadOnly = true;
    EXPECT_EQ(read()["collector"]["disk"], "read-only");
    EXPECT_EQ(read()["collector"]["diskProblem"], "no room for 8388608 bytes");
}

TEST_F(LiveStateJsonTest, TheKeeperSaysWhyNoAgentRuns) {
    ZTSLinkMessage lKeeper;
    lKeeper.mType = ZTLM_KeeperState;
    lKeeper.mState = ZTKS_WaitingForAdapters;
    lKeeper.mSince = 1700000000;
    lKeeper.mText = "no adapters";
    mFacts.mpKeeperState = &lKeeper;
    const nlohmann::json lState = read();
    EXPECT_EQ(lState["keeper"]["state"], "waiting-for-adapters");
    EXPECT_FALSE(lState["keeper"]["since"].is_null());
    EXPECT_TRUE(lState["keeper"]["nextStart"].is_null());
    EXPECT_EQ(lState["agent"]["problem"], "no adapters");
}
