// What the collector learns of the host's ports and disks, and that collecting never waits for it.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/collector/PagedAgent.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::ElementsAre;
using testing::EndsWith;

namespace {

class CollectorTopologyTest : public testing::Test {
protected:
    CollectorTopologyTest() {
        mTree.addHost(7);
        mTree.addRemotePort(7, 3, 9);
        mTree.addPath(7, 3, 12, "naa.600a", "sdc");
        mStage.setEnvironment("TAVIK_SYSFS_ROOT", mTree.roots().mSysfs);
    }
    void startAll() {
        mAgent = std::make_unique<ZTCPagedAgent>(mStage, mStage.announceStart(4711));
        mStage.startCollector();
        mStage.waitFor([this] { return mStage.countStartsAnswered() == 1; }, "the start");
    }
    std::optional<ZTSStoredTopology> stored() const {
        return mStage.history()->readTopology(toMicroseconds(getHistoryTime()));
    }

    ZTCFakeSysfs mTree;
    ZTCCollectorStage mStage;
    std::unique_ptr<ZTCPagedAgent> mAgent;
};

}  // namespace

TEST_F(CollectorTopologyTest, WhatHangsOnThePortsIsInTheHistoryAndItsAgeInTheLiveState) {
    startAll();
    mStage.waitFor([this] { return stored().has_value(); }, "the first scan in the history");
    ASSERT_EQ(stored()->mTopology.mPaths.size(), 1U);
    EXPECT_EQ(stored()->mTopology.mPaths[0].mDisk, "sdc");
    EXPECT_EQ(stored()->mTopology.mPaths[0].mWwid, "naa.600a");
    const nlohmann::json lTopology = mStage.status()["topology"];
    EXPECT_EQ(lTopology["stale"], false);
    EXPECT_TRUE(lTopology["scanned"].is_string());
    EXPECT_GE(lTopology["ageSeconds"], 0.0);
    EXPECT_TRUE(lTopology["blocked"].empty());
}

TEST_F(CollectorTopologyTest, AnAttributeThatBlocksDelaysNothingElse) {
    const std::string lBlocking = mTree.path("devices/pci0/host7/fc_host/host7/port_state");
    ASSERT_EQ(unlink(lBlocking.c_str()), 0);
    ASSERT_EQ(mkfifo(lBlocking.c_str(), 0600), 0);  // opening it for reading waits for a writer
    startAll();
    mAgent->happen(1000, 3);
    mStage.waitFor([this] { return mStage.countStored() == 3000; }, "what has happened");
    mStage.waitFor([this] { return stored().has_value(); }, "the rest of the scan");
    EXPECT_TRUE(stored()->mIsStale);
    EXPECT_FALSE(stored()->mTopology.mInitiators.at(0).mState);
    EXPECT_EQ(stored()->mTopology.mInitiators.at(0).mSpeed, "16 Gbit");
    const nlohmann::json lTopology = mStage.status()["topology"];
    EXPECT_EQ(lTopology["stale"], true);
    EXPECT_THAT(lTopology["blocked"].get<std::vector<std::string>>(), ElementsAre(EndsWith("host7/port_state")));
    // Nor does it hold up the end.
    mStage.send(ZTLM_Finish);
    mStage.waitFor([this] { return mAgent->hasShutDown(); }, "the shut-down");
    mAgent.reset();
    mStage.announceEnd(0);
    mStage.waitFor([this] { return !mStage.isRunning(); }, "the collector's end");
    EXPECT_EQ(mStage.waitForExit(), 0);
    mStage.expectSound();
}
