#include "sensor/collector/include/TopologyWatch.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <mutex>

#include "tests/support/Waiting.h"
#include "tests/unit/collector/TopologyWatchFixture.h"

using testing::ElementsAre;

namespace {

/// What the watch has handed over.
class ZTCSinkOfATest : public ZTCTopologySink {
public:
    void notePorts(std::shared_ptr<const ZTSTopology> /*apPorts*/) override { ++mPorts; }
    void noteTopology(ZTCHistoryTime /*aTime*/, std::shared_ptr<const ZTSTopology> apTopology) override {
        const std::lock_guard lLock(mMutex);
        mScans.push_back(*apTopology);
    }
    void noteCounters(std::vector<ZTSCounterSample> aSamples) override {
        const std::lock_guard lLock(mMutex);
        mSamples.insert(mSamples.end(), aSamples.begin(), aSamples.end());
    }
    std::vector<ZTSTopology> scans() const {
        const std::lock_guard lLock(mMutex);
        return mScans;
    }
    std::vector<ZTSCounterSample> samples() const {
        const std::lock_guard lLock(mMutex);
        return mSamples;
    }
    int countPorts() const { return mPorts; }

private:
    mutable std::mutex mMutex;
    std::vector<ZTSTopology> mScans;
    std::vector<ZTSCounterSample> mSamples;
    std::atomic<int> mPorts = 0;
};

class TopologyWatchTest : public ZTCTopologyWatchFixture {
protected:
    TopologyWatchTest() {
        mSetup.mClock = [this] { return fromMicroseconds(mNow); };
    }
    void start() { mWatch.emplace(mSink, mSetup); }
    void waitForScans(std::size_t aCount) {
        waitUntil([&] { return mSink.scans().size() >= aCount; }, std::to_string(aCount) + " scans");
    }
    void scanAgain() {
        const std::size_t lCount = mSink.scans().size();
        mWatch->hurry();
        waitForScans(lCount + 1);
    }

    std::atomic<std::int64_t> mNow{600'000'000};
    ZTCSinkOfATest mSink;
    std::optional<ZTCTopologyWatch> mWatch;
    const std::string mState = "devices/pci0/host7/fc_host/host7/port_state";
    const std::string mStatistics = "devices/pci0/host7/fc_host/host7/statistics/";
};

}  // namespace

TEST_F(TopologyWatchTest, TheHostIsScannedAtTheStart) {
    start();
    waitForScans(1);
    ASSERT_EQ(mSink.scans()[0].mRemotePorts.size(), 1U);
    EXPECT_EQ(mSink.countPorts(), 1);
    EXPECT_EQ(mWatch->getPorts()->mRemotePorts, mSink.scans()[0].mRemotePorts);
    EXPECT_EQ(*mWatch->getTopology(), mSink.scans()[0]);
    const ZTSTopologyState lState = mWatch->getState();
    EXPECT_EQ(lState.mScanned, fromMicroseconds(mNow));
    EXPECT_FALSE(lState.mIsStale);
    pollfd lBell{.fd = mWatch->getBell().getDescriptor(), .events = POLLIN, .revents = 0};
    EXPECT_EQ(poll(&lBell, 1, 0), 1) << "the ports are new";
}

TEST_F(TopologyWatchTest, AnEventLeadsToAScanSoonAndManyEventsToFew) {
    mSetup.mHurryPause = std::chrono::hours(1);
    start();
    waitForScans(1);
    for (int i = 0; i < 1000; ++i) {
        mWatch->hurry();
    }
    mWatch->stop();
    EXPECT_EQ(mSink.scans().size(), 1U) << "the pause is not over";
    mWatch.reset();
    mSetup.mHurryPause = std::chrono::milliseconds(1);
    start();
    waitForScans(2);
    mTree.write(mState, "Linkdown");
    scanAgain();
    EXPECT_EQ(mSink.scans().back().mInitiators[0].mState, "Linkdown");
}

TEST_F(TopologyWatchTest, PortsThatHaveChangedLeadToAWholeScan) {
    mSetup.mPortsPeriod = std::chrono::milliseconds(5);
    start();
    waitForScans(1);
    mTree.write(mState, "Linkdown");
    waitUntil([&] { return mSink.scans().back().mInitiators[0].mState == "Linkdown"; }, "the scan");
    EXPECT_GE(mSink.countPorts(), 2);
    EXPECT_EQ(mWatch->getPorts()->mInitiators[0].mState, "Linkdown");
}

TEST_F(TopologyWatchTest, AFileThatBlocksMakesNamesStaleAndIsNamed) {
    start();
    waitForScans(1);
    const std::string lBlocking = mTree.path(mState);
    ASSERT_EQ(unlink(lBlocking.c_str()), 0);
    ASSERT_EQ(mkfifo(lBlocking.c_str(), 0600), 0);
    scanAgain();
    EXPECT_TRUE(mWatch->getState().mIsStale);
    EXPECT_THAT(mWatch->getState().mBlocked, ElementsAre(mSetup.mRoots.mSysfs + "/class/fc_host/host7/port_state"));
    EXPECT_EQ(mSink.scans().back().mInitiators[0].mSpeed, "16 Gbit") << "the others are read";
    // The reader that was left behind ends with the file.
    const int lWriter = open(lBlocking.c_str(), O_WRONLY);
    ASSERT_GE(lWriter, 0);
    close(lWriter);
    waitUntil([&] { return mWatch->getState().mBlocked.empty(); }, "the end of the reading");
    EXPECT_FALSE(mWatch->getState().mIsStale);
}

TEST_F(TopologyWatchTest, CountersAreReadOnceAMinuteAndTheirRiseBelongsToTheMinuteBefore) {
    mTree.write(mStatistics + "invalid_crc_count", "0x10");
    start();
    waitForScans(1);
    waitUntil([&] { return mWatch->getState().mScanned.has_value(); }, "the first scan");
    scanAgain();  // the base is read behind the first scan
    mTree.write(mStatistics + "invalid_crc_count", "0x15");
    scanAgain();
    scanAgain();
    EXPECT_TRUE(mSink.samples().empty()) << "the minute is not over";
    mNow += 61'000'000;
    mWatch->hurry();
    waitUntil([&] { return !mSink.samples().empty(); }, "the sample");
    EXPECT_THAT(mSink.samples(),
                ElementsAre(ZTSCounterSample{600'000'000, ZTSFcName::fromText(ZTCFakeSysfs::initiatorName(7)),
                                             std::nullopt, "invalid_crc_count", 5}));
}

TEST_F(TopologyWatchTest, NothingIsHandedOverAfterItWasStopped) {
    mSetup.mPortsPeriod = mSetup.mWholePeriod = std::chrono::milliseconds(1);
    start();
    waitForScans(3);
    mWatch->stop();
    const std::size_t lCount = mSink.scans().size();
    mWatch->hurry();
    mWatch->stop();
    mWatch.reset();
    EXPECT_EQ(mSink.scans().size(), lCount);
}
