/// The keeper's rules about the collector, and an orderly stop.
#include "tests/unit/keeper/KeeperFixture.h"

using std::chrono::minutes;
using std::chrono::seconds;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

TEST_F(Keeper, ACollectorThatHadWorkedIsStartedAtOnceAndToldEverything) {
    startWorking();
    collectorEnds();
    EXPECT_THAT(mWorld.take(), ElementsAre("start collector", "send AgentStarted 1", "send KeeperState running"));
}

TEST_F(Keeper, ACollectorThatNeverWorksIsStartedEverMoreSeldomUpToAMinute) {
    mDoesLook = false;
    start();
    for (const int lPause : {1, 2, 4, 8, 16, 32, 60, 60}) {
        collectorEnds(gcStatus3);
        EXPECT_EQ(waitFor("start collector"), seconds(lPause));
    }
    look();
    collectorEnds();
    EXPECT_EQ(waitFor("start collector"), seconds(0));
    collectorEnds();
    EXPECT_EQ(waitFor("start collector"), seconds(1)) << "the back-off has begun anew";
}

TEST_F(Keeper, AFirstCollectorThatRefusesTheHistoryEndsTheSensorWithItsStatus) {
    mDoesLook = false;
    start();
    collectorEnds(gcStatus2);
    EXPECT_THAT(mWorld.take(), ElementsAre("signal 15 to agent"));
    EXPECT_FALSE(mKeeper.isDone());
    agentEnds(gcStatus0, ZTSE_Signal);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 2);
    EXPECT_THAT(mWorld.mSaid, Contains(HasSubstr("the history or the settings cannot be used")));
    pass(minutes(2));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("start"))));
}

TEST_F(Keeper, ALaterCollectorThatRefusesTheHistoryIsStartedAgainAfterPauses) {
    startWorking();
    mDoesLook = false;
    collectorEnds();
    mWorld.take();
    for (const int lPause : {1, 2, 4}) {
        collectorEnds(gcStatus2);
        EXPECT_EQ(waitFor("start collector"), seconds(lPause));
    }
    EXPECT_FALSE(mKeeper.isDone());
}

TEST_F(Keeper, ACollectorThatCompletesNoLookIsEnded) {
    startWorking();
    pass(minutes(30));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("signal"))));
    mDoesLook = false;
    EXPECT_EQ(waitFor("signal 15 to collector"), seconds(120));
    EXPECT_EQ(waitFor("signal 9 to collector"), seconds(15));
    collectorEnds();
    EXPECT_EQ(waitFor("start collector"), seconds(0));
}

TEST_F(Keeper, ACollectorHas10MinutesForItsFirstLook) {
    mDoesLook = false;
    start();
    EXPECT_EQ(waitFor("signal 15 to collector"), seconds(600));
}

TEST_F(Keeper, ACollectorThatReadsNothingIsEndedAndNothingMoreIsSentToIt) {
    startWorking();
    mWorld.mSendResult = ZTLR_NotNow;
    agentEnds();
    EXPECT_THAT(mWorld.take(), testing::IsSupersetOf({"send AgentEnded 1", "signal 15 to collector"}));
    pass(seconds(5));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("send"))));
}

TEST_F(Keeper, ACollectorThatSpeaksLikeAKeeperIsEnded) {
    startWorking();
    tell(ZTLM_Finish);
    EXPECT_THAT(mWorld.take(), Contains("signal 15 to collector"));
}

TEST_F(Keeper, AnEndedAgentIsToldToEachNewCollectorUntilItsFifoIsDrained) {
    startWorking();
    agentEnds();
    waitFor("start agent 2");
    collectorEnds();
    EXPECT_THAT(mWorld.take(), ElementsAre("start collector", "send AgentStarted 1", "send AgentEnded 1",
                                           "send AgentStarted 2", "send KeeperState starting"));
    tell(ZTLM_Drained, 1);
    collectorEnds();
    EXPECT_THAT(mWorld.take(), Not(Contains("send AgentStarted 1")));
}

TEST_F(Keeper, AnEndedAgentWithAnEmptyFifoIsForgottenWhileThereIsNoCollector) {
    mWorld.mIsFifoEmpty = true;
    startWorking();
    agentEnds();
    waitFor("start agent 2");
    collectorEnds();
    EXPECT_THAT(mWorld.take(), ElementsAre("start collector", "send AgentStarted 2", "send KeeperState starting"));
}

TEST_F(Keeper, EndedAgentsThatNobodyDrainsDoNotPileUp) {
    startWorking();
    for (std::uint64_t i = 1; i <= 100; ++i) {
        answer(i);
        agentEnds();
        waitFor("start agent " + std::to_string(i + 1));
    }
    collectorEnds();
    const std::vector<std::string> lDone = mWorld.take();
    EXPECT_EQ(std::count_if(lDone.begin(), lDone.end(),
                            [](const std::string& acrDone) { return acrDone.starts_with("send AgentEnded"); }),
              16);
    EXPECT_THAT(lDone, Contains("send AgentEnded 100"));
}

TEST_F(Keeper, TheServiceManagerHearsOfReadyOnceAndTheWatchdogIsFedByLooks) {
    mDoesLook = false;
    mKeeper.start(mNow);
    EXPECT_THAT(mWorld.mNotified, Not(Contains("READY=1")));
    look();
    look();
    EXPECT_EQ(std::count(mWorld.mNotified.begin(), mWorld.mNotified.end(), "READY=1"), 1);
    mWorld.mNotified.clear();
    pass(seconds(60));
    EXPECT_THAT(mWorld.mNotified, Not(Contains("WATCHDOG=1"))) << "a collector that stands still must not be hidden";
    look();
    EXPECT_THAT(mWorld.mNotified, Contains("WATCHDOG=1"));
}

TEST_F(Keeper, TheWatchdogIsFedWhileTheCollectorIsAboutToBeStartedAgain) {
    mDoesLook = false;
    mWorld.mCanStartCollector = false;
    mKeeper.start(mNow);
    pass(seconds(60));
    EXPECT_GE(std::count(mWorld.mNotified.begin(), mWorld.mNotified.end(), "WATCHDOG=1"), 6);
}

TEST_F(Keeper, TheCollectorsLineIsTheServiceManagersStatusWithoutLineBreaks) {
    startWorking();
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Text;
    lMessage.mText = "COLLECTING\nREADY=0";
    mKeeper.handleMessage(mNow, lMessage);
    EXPECT_THAT(mWorld.mNotified, Contains("STATUS=COLLECTING READY=0"));
}

// ---- an orderly stop ----

TEST_F(Keeper, AStopLetsTheCollectorFinishAndEndsWithStatus0) {
    startWorking();
    mKeeper.handleStop(mNow);
    EXPECT_THAT(mWorld.take(), ElementsAre("send Finish", "send KeeperState stopping"));
    mKeeper.handleStop(mNow);
    EXPECT_THAT(mWorld.take(), ElementsAre()) << "a second signal changes nothing";
    pass(seconds(3));
    agentEnds(gcStatus0, ZTSE_ShutDown);
    EXPECT_FALSE(mKeeper.isDone());
    collectorEnds(gcStatus0);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 0);
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("start"))));
}

TEST_F(Keeper, AStopWaitsForAnAgentThatEndsAfterTheCollector) {
    startWorking();
    mKeeper.handleStop(mNow);
    collectorEnds(gcStatus0);
    pass(seconds(4));
    EXPECT_THAT(mWorld.take(), Not(Contains(HasSubstr("signal"))));
    EXPECT_FALSE(mKeeper.isDone());
    agentEnds(gcStatus0, ZTSE_ShutDown);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 0);
}

TEST_F(Keeper, AStopWithoutACollectorStartsOneThatTakesInWhatTheAgentHolds) {
    mDoesLook = false;
    start();
    collectorEnds(gcStatus3);
    mWorld.take();
    mKeeper.handleStop(mNow);
    EXPECT_THAT(mWorld.take(), testing::IsSupersetOf({"start collector", "send AgentStarted 1", "send Finish"}));
}

TEST_F(Keeper, ACollectorThatDiesDuringTheStopIsStartedOnceMore) {
    startWorking();
    mKeeper.handleStop(mNow);
    mWorld.take();
    collectorEnds(gcKilled);
    EXPECT_THAT(mWorld.take(), testing::IsSupersetOf({"start collector", "send Finish"}));
    agentEnds(gcStatus0, ZTSE_ShutDown);
    collectorEnds(gcStatus0);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 0);
}

TEST_F(Keeper, AStopThatNobodyFollowsIsForcedBefore20SecondsAreOverAndEndsWithStatus1) {
    startWorking();
    mKeeper.handleStop(mNow);
    EXPECT_EQ(waitFor("signal 15 to agent"), seconds(14));
    EXPECT_EQ(waitFor("signal 9 to agent"), seconds(3));
    EXPECT_EQ(waitFor("signal 9 to collector"), seconds(2));
    agentEnds();
    collectorEnds();
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 1);
}

TEST_F(Keeper, AStopWhileNoCollectorCanBeStartedEndsTheAgentWithSigterm) {
    mWorld.mCanStartCollector = false;
    mDoesLook = false;
    start();
    mKeeper.handleStop(mNow);
    const seconds lPatience = waitFor("signal 15 to agent");
    EXPECT_LE(lPatience, seconds(14));
    agentEnds(gcStatus0, ZTSE_Signal);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 1) << "what the agent held is lost";
}

TEST_F(Keeper, AStopForestallsTheStartOfAnAgentThatIsDue) {
    startWorking();
    agentEnds();
    EXPECT_THAT(mWorld.take(), Not(Contains("start agent 2"))) << "a pause comes first";
    mKeeper.handleStop(mNow);
    pass(seconds(10));
    EXPECT_THAT(mWorld.take(), Not(Contains("start agent 2")));
}

TEST_F(Keeper, AStopWhileNothingIsToBeWatchedOnlyEndsTheCollector) {
    start();
    agentEnds(gcStatus0, ZTSE_NoAdapters);
    mKeeper.handleStop(mNow);
    pass(seconds(1));
    collectorEnds(gcStatus0);
    EXPECT_TRUE(mKeeper.isDone());
    EXPECT_EQ(mKeeper.getExitStatus(), 0);
    EXPECT_THAT(mWorld.take(), Not(Contains("start agent 2")));
}

TEST_F(Keeper, AReloadReachesTheCollectorAndTheHeartbeatTheNextAgent) {
    startWorking();
    mKeeper.handleReload(mNow, seconds(10), ZTCFileDescriptor());
    EXPECT_THAT(mWorld.take(), ElementsAre("send Reload"));
    mHasHeart = false;
    pass(seconds(60));
    EXPECT_THAT(mWorld.take(), Not(Contains("signal 15 to agent"))) << "this agent still has its heartbeat of 60 s";
    mHasHeart = true;
    agentEnds();
    waitFor("start agent 2");
    mHasHeart = false;
    EXPECT_LE(waitFor("signal 15 to agent"), seconds(25 + 10));
}
