/// The keeper's rules about the agent.
#include "tests/unit/keeper/KeeperFixture.h"

using std::chrono::minutes;
using std::chrono::seconds;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

TEST_F(Keeper, StartsTheCollectorAndThenTheAgentOfWhichItTells) {
    mKeeper.start(mNow);
    EXPECT_THAT(mWorld.take(), ElementsAre("start collector", "send KeeperState waiting-to-restart", "start agent 1",
                                           "send AgentStarted 1", "send KeeperState starting"));
    answer(1);
    EXPECT_THAT(mWorld.take(), ElementsAre("send KeeperState running"));
}

TEST_F(Keeper, AnAgentThatHadWorkedIsStartedAfterASecond) {
    startWorking();
    agentEnds();
    EXPECT_THAT(mWorld.take(), ElementsAre("send AgentEnded 1", "send KeeperState waiting-to-restart"));
    EXPECT_EQ(mWorld.mLastNextStart, mWorld.mWallClock + 1);
    EXPECT_EQ(waitFor("start agent 2"), seconds(1));
    EXPECT_THAT(mWorld.mSaid, Contains(HasSubstr("ended: killed by signal 9")));
}

TEST_F(Keeper, AnAgentThatNeverWorksIsStartedEverMoreSeldomUpToAMinute) {
    start();
    std::uint64_t lStart = 1;
    for (const int lPause : {1, 2, 4, 8, 16, 32, 60, 60}) {
        agentEnds(gcStatus3);
        EXPECT_EQ(waitFor("start agent " + std::to_string(++lStart)), seconds(lPause));
    }
    answer(lStart);
    agentEnds(gcStatus3);
    EXPECT_EQ(waitFor("start agent " + std::to_string(++lStart)), seconds(1));
    agentEnds(gcStatus3);
    EXPECT_EQ(waitFor("start agent " + std::to_string(lStart + 1)), seconds(1)) << "the back-off has begun anew";
}

TEST_F(Keeper, AnAgentThatCannotBeStartedCountsAsOneThatHasFailed) {
    mWorld.mCanStartAgent = false;
    mKeeper.start(mNow);
    EXPECT_EQ(waitFor("start agent 2"), seconds(1));
    EXPECT_EQ(waitFor("start agent 3"), seconds(2));
}

class KeeperNothing : public Keeper, public testing::WithParamInterface<ZTEStatusEnd> {};

TEST_P(KeeperNothing, IsAStateThatIsLookedAtAgainAfterAMinute) {
    start();
    agentEnds(gcStatus0, GetParam());
    EXPECT_THAT(mWorld.take(), ElementsAre("send AgentEnded 1", "send KeeperState waiting-for-adapters"));
    EXPECT_EQ(waitFor("start agent 2"), seconds(60));
    const std::size_t lSaid = mWorld.mSaid.size();
    agentEnds(gcStatus0, GetParam());
    EXPECT_EQ(waitFor("start agent 3"), seconds(60)) << "no back-off: it is not a failure";
    EXPECT_EQ(mWorld.mSaid.size(), lSaid) << "said once, not every minute";
}

TEST_P(KeeperNothing, EndsWithin10SecondsOnceTheHostHasOtherNames) {
    mWorld.mHostNames = {"host1"};
    start();
    pass(seconds(3));
    agentEnds(gcStatus0, GetParam());
    mWorld.take();
    pass(seconds(20));
    EXPECT_THAT(mWorld.take(), Not(Contains("start agent 2")));
    mWorld.mHostNames = {"host1", "host2"};
    EXPECT_LE(waitFor("start agent 2"), seconds(10));
}

INSTANTIATE_TEST_SUITE_P(Reasons, KeeperNothing, testing::Values(ZTSE_NoAdapters, ZTSE_NoLibrary, ZTSE_NoEventSupport));

TEST_F(Keeper, ANameThatCameWhileTheAgentWasFindingNoneStartsItAtOnce) {
    start();
    mWorld.mHostNames = {"host7"};
    agentEnds(gcStatus0, ZTSE_NoAdapters);
    EXPECT_LE(waitFor("start agent 2"), seconds(10));
}

TEST_F(Keeper, AnAgentWithoutAHeartbeatGetsSigtermAndThenSigkill) {
    startWorking();
    pass(minutes(30));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("signal"))));
    mHasHeart = false;
    const seconds lPatience = waitFor("signal 15 to agent");
    EXPECT_GE(lPatience, seconds(125 - 10));
    EXPECT_LE(lPatience, seconds(125 + 10));
    EXPECT_EQ(waitFor("signal 9 to agent"), seconds(15));
    pass(seconds(10));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("signal"))));
    agentEnds();
    EXPECT_EQ(waitFor("start agent 2"), seconds(1));
}

TEST_F(Keeper, AnAgentThatEndsOnSigtermIsNotKilled) {
    startWorking();
    mHasHeart = false;
    waitFor("signal 15 to agent");
    agentEnds(gcStatus0, ZTSE_Signal);
    mHasHeart = true;
    answer(2);
    pass(minutes(5));
    EXPECT_THAT(mWorld.take(), Not(Contains("signal 9 to agent")));
}

TEST_F(Keeper, ASilentAgentIsEndedAndTheSilenceOfAnEarlierOneMeansNothing) {
    startWorking();
    tell(ZTLM_Silent, 7);
    EXPECT_THAT(mWorld.take(), Not(Contains("signal 15 to agent")));
    tell(ZTLM_Silent, 1);
    EXPECT_THAT(mWorld.take(), Contains("signal 15 to agent"));
    tell(ZTLM_Silent, 1);
    EXPECT_THAT(mWorld.take(), Not(Contains("signal 15 to agent")));
    EXPECT_EQ(waitFor("signal 9 to agent"), seconds(15));
}

TEST_F(Keeper, ANewAdapterReplacesTheAgentInOrderOnceIn10Minutes) {
    startWorking();
    mWorld.mAdapters = 2;
    pass(seconds(30));
    mWorld.mAdapters = 3;
    EXPECT_LE(waitFor("send StopAgent 1"), seconds(10));
    agentEnds(gcStatus0, ZTSE_ShutDown);
    EXPECT_EQ(waitFor("start agent 2"), seconds(0));
    answer(2);
    pass(seconds(30));
    mWorld.mAdapters = 4;
    const seconds lPause = waitFor("send StopAgent 2");
    EXPECT_GE(lPause, seconds(600 - 60));
    EXPECT_LE(lPause, seconds(600));
}

TEST_F(Keeper, AnAdapterThatLeavesAndComesBackIsNewAFewerAloneIsNot) {
    startWorking();
    mWorld.mAdapters = 2;
    pass(seconds(30));
    mWorld.mAdapters = 1;
    pass(seconds(30));
    EXPECT_THAT(mWorld.take(), Not(Contains("send StopAgent 1")));
    mWorld.mAdapters = 2;
    EXPECT_LE(waitFor("send StopAgent 1"), seconds(10));
}

TEST_F(Keeper, AnAgentThatIsNotStoppedInOrderWithin90SecondsGetsSigterm) {
    startWorking();
    mWorld.mAdapters = 2;
    pass(seconds(30));
    mWorld.mAdapters = 3;
    waitFor("send StopAgent 1");
    collectorEnds();
    EXPECT_THAT(mWorld.take(), testing::IsSupersetOf({"start collector", "send AgentStarted 1", "send StopAgent 1"}));
    const seconds lPatience = waitFor("signal 15 to agent");
    EXPECT_GE(lPatience, seconds(90));
    EXPECT_LE(lPatience, seconds(100));
}

TEST_F(Keeper, AnAgentOfSomebodyElseIsEndedBeforeItsOwnIsStarted) {
    mWorld.mStranger = ZTSL_Unknown;
    mKeeper.start(mNow);
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("start agent"))));
    mWorld.mStranger = ZTSL_Watched;
    EXPECT_EQ(waitFor("signal 15 to stranger"), seconds(0));
    EXPECT_EQ(waitFor("signal 9 to stranger"), seconds(15));
    mWorld.mStranger = ZTSL_None;
    mKeeper.handleStrangerEnd(mNow);
    EXPECT_THAT(mWorld.take(), Contains("start agent 1"));
}

TEST_F(Keeper, ThePidFileIsTouchedMoreThanOnceInAHeartbeat) {
    start();
    pass(seconds(60));
    EXPECT_GE(mWorld.mTouches, 6U);
    EXPECT_LE(mWorld.mTouches, 8U) << "an idle keeper sleeps";
}
