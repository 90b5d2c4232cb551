#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "tests/collector/PagedAgent.h"
#include "tests/support/SmallFileSystem.h"

using testing::ElementsAre;
using testing::HasSubstr;

class CollectorTest : public testing::Test {
protected:
    void startAgent() { mAgent = std::make_unique<ZTCPagedAgent>(mStage, mStage.announceStart(4711)); }
    void waitUntilStored(std::uint64_t aCount) {
        mStage.waitFor([&] { return stored() == aCount; }, std::to_string(aCount) + " stored occurrences");
    }
    std::uint64_t stored() const { return mStage.countStored(); }
    /// A whole orderly end.
    void finish() {
        mStage.send(ZTLM_Finish);
        mStage.waitFor([this] { return mAgent->hasShutDown(); }, "the shut-down");
        mAgent.reset();
        mStage.announceEnd(0);
        mStage.waitFor([this] { return !mStage.isRunning(); }, "the collector's end");
        EXPECT_EQ(mStage.waitForExit(), 0);
    }

    ZTCCollectorStage mStage;
    std::unique_ptr<ZTCPagedAgent> mAgent;
};

TEST_F(CollectorTest, WhatHappensIsStoredExactlyAndTheEndIsOrderly) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(1000, 3);
    waitUntilStored(3000);
    mAgent->happen(5, 1, false);
    waitUntilStored(3005);
    mAgent->happen(7);
    finish();
    EXPECT_EQ(stored(), 3012U);
    EXPECT_EQ(mStage.countStartsAnswered(), 1U);
    EXPECT_GT(mStage.countLooks(), 0U);
    EXPECT_TRUE(mStage.isDrained(1));
    mStage.expectSound();
    EXPECT_TRUE(mStage.history()->readGaps().empty());
    EXPECT_FALSE(exists(mStage.agentDirectory() + "/page.1"));
    const std::vector<ZTSRun> lRuns = mStage.history()->readRuns();
    ASSERT_EQ(lRuns.size(), 1U);
    EXPECT_FALSE(lRuns[0].mIsOpen);
}

TEST_F(CollectorTest, AKilledCollectorIsFollowedByOneThatGoesOn) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(10);
    waitUntilStored(10);
    mStage.killCollector();
    mAgent->happen(20);
    mStage.startCollector();
    waitUntilStored(30);
    finish();
    mStage.expectSound();
    EXPECT_TRUE(mStage.history()->readGaps().empty());
}

TEST_F(CollectorTest, AKilledAgentCostsWhatItHeldInOneGap) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(10);
    waitUntilStored(10);
    mStage.waitFor([&] { return mStage.status()["agent"]["heldRecords"] == 0; }, "nothing held");
    mStage.killCollector();
    mAgent->happen(7);
    mAgent.reset();
    mStage.announceEnd(SIGKILL);
    mStage.startCollector();
    mStage.waitFor([this] { return mStage.isDrained(1); }, "the FIFO's end");
    mStage.waitFor([this] { return !mStage.history()->readGaps().empty(); }, "the gap");
    const std::vector<ZTSGap> lGaps = mStage.history()->readGaps();
    ASSERT_EQ(lGaps.size(), 1U);
    EXPECT_EQ(lGaps[0].getOccurrences(), 7U);
    EXPECT_EQ(lGaps[0].mReason, "the agent was killed by signal 9");
    startAgent();
    mAgent->happen(4);
    waitUntilStored(14);
    finish();
    mStage.expectSound();
    EXPECT_EQ(mStage.history()->readGaps().size(), 1U);
}

TEST_F(CollectorTest, AResponseThatIsCutIsTakenInAsFarAsItCameAndTheRestIsAGap) {
    startAgent();
    mStage.startCollector();
    mStage.waitFor([this] { return mStage.countStartsAnswered() == 1; }, "the start");
    mAgent->cutNextResponse(100);  // two records of 61 bytes
    mAgent->happen(10);
    mStage.waitFor([this] { return mAgent->hasDied(); }, "the agent's end");
    mAgent.reset();
    mStage.announceEnd(SIGKILL);
    mStage.waitFor([this] { return mStage.isDrained(1); }, "the FIFO's end");
    waitUntilStored(8);
    EXPECT_EQ(mStage.finish(), 0);
    const std::vector<ZTSGap> lGaps = mStage.history()->readGaps();
    ASSERT_EQ(lGaps.size(), 1U);
    EXPECT_EQ(lGaps[0].getOccurrences(), 2U);
    mStage.expectSound();
}

TEST_F(CollectorTest, AnAgentThatVanishedWithItsKeeperIsAGapAtTheNextStart) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(10);
    waitUntilStored(10);
    mStage.killCollector();
    mAgent->happen(3);
    mAgent.reset();
    // A new keeper knows nothing of the old agent but the page that it left.
    ZTCCollectorStage& lrStage = mStage;
    lrStage.forgetStarts();
    lrStage.startCollector();
    lrStage.waitFor([&] { return !lrStage.history()->readGaps().empty(); }, "the gap");
    EXPECT_EQ(lrStage.history()->readGaps()[0].getOccurrences(), 3U);
    lrStage.waitFor([&] { return !exists(lrStage.agentDirectory() + "/page.1"); }, "the page's end");
    EXPECT_EQ(lrStage.finish(), 0);
    lrStage.startCollector();
    EXPECT_EQ(lrStage.finish(), 0);
    EXPECT_EQ(lrStage.history()->readGaps().size(), 1U) << "a gap is written once";
    lrStage.expectSound();
}

TEST_F(CollectorTest, AnAgentThatVanishedWithItsPageIsAGapAtTheNextStart) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(10);
    waitUntilStored(10);
    mStage.waitFor([this] { return mStage.status()["agent"]["heldRecords"] == 0; }, "nothing held");
    mStage.waitForLooks(2);
    mStage.killCollector();
    mAgent.reset();
    mStage.forgetStarts();
    unlink((mStage.agentDirectory() + "/page.1").c_str());
    mStage.startCollector();
    mStage.waitFor([this] { return !mStage.history()->readGaps().empty(); }, "the gap");
    EXPECT_THAT(mStage.history()->readGaps()[0].mReason, HasSubstr("without a trace"));
    EXPECT_FALSE(mStage.history()->readGaps()[0].mIsCountKnown) << "nobody knows what it held at its end";
    EXPECT_EQ(mStage.finish(), 0);
    mStage.expectSound();
}

TEST_F(CollectorTest, StatusShowsWhatGoesOn) {
    startAgent();
    mStage.startCollector();
    mAgent->happen(10);
    waitUntilStored(10);
    const nlohmann::json lStatus = mStage.status();
    EXPECT_EQ(lStatus["schema"], "tavik.live/1");
    EXPECT_EQ(lStatus["keeper"]["state"], "running");
    EXPECT_EQ(lStatus["keeper"]["pid"], getpid());
    EXPECT_EQ(lStatus["agent"]["running"], true);
    EXPECT_EQ(lStatus["agent"]["pid"], 4711);
    EXPECT_EQ(lStatus["agent"]["limitBytes"], 262144);
    EXPECT_EQ(lStatus["collector"]["pid"], mStage.getPid());
    EXPECT_EQ(lStatus["collector"]["disk"], "ok");
    EXPECT_EQ(lStatus["collector"]["lastEventKind"], "link");
    EXPECT_EQ(lStatus["kinds"][0]["kinds"]["link"], "listening");
    EXPECT_EQ(lStatus["kinds"][0]["initiator"]["wwpn"], "10:00:00:00:c9:00:00:01");
    EXPECT_EQ(lStatus["storeId"], mStage.history()->getStoreId());
    EXPECT_EQ(lStatus["losses"]["refused"]["total-limit"], 0);
}

TEST_F(CollectorTest, AMarkIsStoredWhenItIsAnswered) {
    mStage.startCollector();
    const nlohmann::json lAnswer = mStage.ask(R"({"request":"mark","name":"before"})");
    EXPECT_EQ(lAnswer["mark"], "before");
    ASSERT_EQ(mStage.history()->readMarks().size(), 1U);
    EXPECT_EQ(mStage.history()->readMarks()[0].mName, "before");
    EXPECT_TRUE(mStage.ask("nonsense").contains("error"));
}

TEST_F(CollectorTest, SignalsForAllProcessesDoNotEndItAndTheKeepersEndDoes) {
    mStage.startCollector();
    mStage.waitFor([this] { return mStage.countLooks() > 0; }, "a look");
    for (const int lSignal : {SIGTERM, SIGINT, SIGHUP}) {
        ASSERT_EQ(kill(mStage.getPid(), lSignal), 0);
    }
    EXPECT_EQ(mStage.status()["schema"], "tavik.live/1");
    mStage.closeLink();
    EXPECT_EQ(mStage.waitForExit(), 1);
    EXPECT_THAT(mStage.log(), HasSubstr("tavik-collector: the keeper is gone"));
}

TEST_F(CollectorTest, TargetsComeFromSysfsAndFromTheFileAndNewOnesFollowAReload) {
    mStage.writeSettings("collect.period = 0.1\ntargets.file = \"" + mStage.path("targets") + "\"\n");
    writeFile(mStage.path("targets"), "20:00:00:00:00:00:00:01,10:00:00:00:00:00:00:01,0x7\n");
    mStage.makeRemotePort("rport-7:0-1", 8);
    startAgent();
    mStage.startCollector();
    mStage.waitFor([this] { return mStage.countStartsAnswered() == 1; }, "the start");
    const ZTCWireBytes lFirst = mAgent->getRequests().at(0);
    EXPECT_EQ(lFirst.at(0), ZTSTVKC_RegisterTargets);
    EXPECT_EQ(lFirst.size(), 5U + 2 * 20);
    writeFile(mStage.path("targets"), "20:00:00:00:00:00:00:01,10:00:00:00:00:00:00:01,0x9\n");
    mStage.send(ZTLM_Reload);
    mStage.waitFor([this] { return mAgent->getRequests().back().at(0) == ZTSTVKC_RegisterTargets; }, "the new target");
    EXPECT_EQ(mAgent->getRequests().back().size(), 5U + 20);
    EXPECT_EQ(mAgent->getRequests().back().back(), 9);
}

class CollectorDiskTest : public CollectorTest {
protected:
    void SetUp() override {
        if (!mFileSystem.isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
        startAgent();
        mStage.startCollector();
        mAgent->happen(10);
        waitUntilStored(10);
    }
    void waitForDisk(const std::string& acrState) {
        mStage.waitFor([&] { return mStage.status()["collector"]["disk"] == acrState; }, "the disk " + acrState);
    }
    ZTCSmallFileSystem mFileSystem{mStage.stateDirectory(), 24 << 10};
};

TEST_F(CollectorDiskTest, WhenItIsFullTheAgentKeepsItsRecordsAndAllIsDeliveredWhenThereIsRoomAgain) {
    mFileSystem.fill();
    mAgent->happen(20);
    waitForDisk("full");
    const std::uint64_t lHandedOver = mAgent->getHandedOver();
    mAgent->happen(30);
    const std::uint64_t lLooks = mStage.countLooks();
    mStage.waitFor([&] { return mStage.countLooks() > lLooks + 2; }, "looks, so that it is not taken for hung");
    EXPECT_EQ(mAgent->getHandedOver(), lHandedOver);
    mFileSystem.empty();
    waitUntilStored(60);
    waitForDisk("ok");
    finish();
    mStage.expectSound();
    EXPECT_TRUE(mStage.history()->readGaps().empty());
}

TEST_F(CollectorDiskTest, AReadOnlyDiskIsLikeAFullOne) {
    mFileSystem.makeReadOnly();
    mStage.killCollector();
    mAgent->happen(20);
    mStage.startCollector();
    waitForDisk("read-only");
    EXPECT_EQ(mAgent->getHandedOver(), 10U);
    mFileSystem.makeWritable();
    waitUntilStored(30);
    finish();
    mStage.expectSound();
    EXPECT_TRUE(mStage.history()->readGaps().empty());
}
