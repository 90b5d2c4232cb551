#include "sensor/views/include/LiveState.h"

#include <gmock/gmock.h>

#include "tests/unit/views/ViewSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;

TEST(LiveState, EveryMemberIsRead) {
    const ZTSLiveState lState = readLiveState(makeHealthyJson());
    EXPECT_TRUE(lState.mProblems.empty());
    EXPECT_EQ(lState.mStoreId, "00112233445566778899aabbccddeeff");
    EXPECT_EQ(lState.mKeeper.mPid, 811U);
    EXPECT_EQ(lState.mKeeper.mState, ZTKP_Running);
    EXPECT_EQ(lState.mKeeper.mSince, timeOf("2026-11-14T08:12:00+01:00"));
    EXPECT_FALSE(lState.mKeeper.mNextStart);
    EXPECT_EQ(lState.mAgent.mIsRunning, true);
    EXPECT_EQ(lState.mAgent.mLimitBytes, 262144U);
    EXPECT_EQ(lState.mCollector.mDisk, ZTDK_Ok);
    EXPECT_EQ(lState.mCollector.mLastEventKind, "rscn");
    ASSERT_TRUE(lState.mAdapters && lState.mKinds && lState.mLosses);
    EXPECT_EQ(lState.mAdapters->at(1).mPortState, "Online");
    EXPECT_EQ(lState.mKinds->at(0).mStates.at("rscn"), "listening");
    EXPECT_EQ(lState.mLosses->mRefused.at("total-limit"), 0U);
    EXPECT_FALSE(lState.mLedger);
}

TEST(LiveState, AnEmptyAnswerLeavesEverythingUnknown) {
    const ZTSLiveState lState = readLiveState(nlohmann::json::object());
    EXPECT_TRUE(lState.mProblems.empty());
    EXPECT_FALSE(lState.mAgent.mIsRunning || lState.mAdapters || lState.mKinds || lState.mLosses);
}

TEST(LiveState, MembersOfAWrongTypeAreUnknownAndNamed) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["agent"]["pid"] = "813";
    lLive["agent"]["heldBytes"] = -1;
    lLive["keeper"]["state"] = "asleep";
    lLive["collector"]["lastAsked"] = "soon";
    lLive["adapters"][0]["wwpn"] = "10:00";
    lLive["kinds"][0]["kinds"]["rscn"] = 1;
    lLive["losses"] = 0;
    const ZTSLiveState lState = readLiveState(lLive);
    EXPECT_FALSE(lState.mAgent.mPid || lState.mAgent.mHeldBytes || lState.mKeeper.mState || lState.mLosses);
    EXPECT_THAT(lState.mProblems, testing::UnorderedElementsAre(
                                      HasSubstr("agent.pid"), HasSubstr("agent.heldBytes"), HasSubstr("keeper.state"),
                                      HasSubstr("collector.lastAsked"), HasSubstr("adapters[0].wwpn"),
                                      HasSubstr("kinds[0].kinds.rscn"), HasSubstr("losses")));
}

TEST(LiveState, SomethingElseThanAnObjectIsNamed) {
    EXPECT_THAT(readLiveState(nlohmann::json::array()).mProblems, ElementsAre(HasSubstr("not an object")));
}

TEST(LiveState, KindsComeInTheOrderOfTheirTable) {
    ZTSLiveKinds lKinds;
    lKinds.mStates = {{"adapter-arrival", "listening"}, {"link", "listening"}, {"aaa", "off"}, {"plogi", "off"}};
    const auto lOrdered = lKinds.getOrdered();
    ASSERT_EQ(lOrdered.size(), 4U);
    EXPECT_EQ(lOrdered[0].first, "plogi");
    EXPECT_EQ(lOrdered[1].first, "link");
    EXPECT_EQ(lOrdered[2].first, "adapter-arrival");
    EXPECT_EQ(lOrdered[3].first, "aaa");
}
