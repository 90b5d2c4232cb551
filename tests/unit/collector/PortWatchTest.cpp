#include "sensor/collector/include/PortWatch.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <string_view>

#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/collector/TopologyWatchFixture.h"

using std::chrono::seconds;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

namespace {

/// Counts the whole scans.
class ZTCCountingSink : public ZTCTopologySink {
public:
    void notePorts(std::shared_ptr<const ZTSTopology> /*apPorts*/) override {}
    void noteTopology(ZTCHistoryTime /*aTime*/, std::shared_ptr<const ZTSTopology> /*apTopology*/) override {
        ++mScans;
    }
    void noteCounters(std::vector<ZTSCounterSample> /*aSamples*/) override {}

    std::atomic<int> mScans = 0;
};

class PortWatchTest : public ZTCTopologyWatchFixture {
protected:
    PortWatchTest() {
        mSettings.mTargetsSysfs = true;
        mTopology.emplace(mSink, mSetup);
        mWatch.emplace(*mTopology, [this](const std::string& acrLine) { mLines.push_back(acrLine); });
    }
    void waitForScans(int aCount) {
        waitUntil([&] { return mSink.mScans >= aCount; }, std::to_string(aCount) + " scans of the host");
    }
    /// A page on which this kind had its last event at a time.
    static std::shared_ptr<const ZTSStatusSnapshot> pageWith(std::string_view aKind, std::int64_t aTime) {
        auto lpPage = std::make_shared<ZTSStatusSnapshot>();
        lpPage->mBoards.resize(2);
        for (std::size_t i = 0; i < gcStatusRowsPerBoard; ++i) {
            if (getStatusRowName(i) == aKind) {
                lpPage->mBoards[1].mRows[i].mLastEvent = aTime;
            }
        }
        return lpPage;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCCountingSink mSink;
    std::optional<ZTCTopologyWatch> mTopology;
    std::vector<std::string> mLines;
    ZTSSettings mSettings;
    const ZTCPortWatch::ZTCTime mNow = std::chrono::steady_clock::now();
    std::optional<ZTCPortWatch> mWatch;
};

}  // namespace

TEST_F(PortWatchTest, TheTargetsAreThePortsOfTheHostOnceTheyAreKnown) {
    waitForScans(1);
    EXPECT_FALSE(mWatch->isReady());
    EXPECT_TRUE(mWatch->scan(mSettings, mNow));
    EXPECT_TRUE(mWatch->isReady());
    EXPECT_THAT(mWatch->getTargets(), SizeIs(1));
    EXPECT_THAT(mWatch->getPorts().mRemotePorts, SizeIs(1));
}

TEST_F(PortWatchTest, NothingIsScannedAgainBeforeItIsDueUnlessThePortsAreNew) {
    waitForScans(1);
    ASSERT_TRUE(mWatch->scan(mSettings, mNow));
    EXPECT_FALSE(mWatch->scan(mSettings, mNow + seconds(9)));
    EXPECT_TRUE(mWatch->scan(mSettings, mNow + seconds(10)));
    mTree.addRemotePort(7, 4, 10);
    mTopology->hurry();
    waitForScans(2);
    EXPECT_TRUE(mWatch->scan(mSettings, mNow + seconds(11)));
    EXPECT_THAT(mWatch->getTargets(), SizeIs(2));
    mWatch->hurry();
    EXPECT_TRUE(mWatch->scan(mSettings, mNow + seconds(12)));
}

TEST_F(PortWatchTest, SysfsIsLeftOutWhereTheSettingsSaySo) {
    waitForScans(1);
    mSettings.mTargetsSysfs = false;
    EXPECT_TRUE(mWatch->scan(mSettings, mNow));
    EXPECT_THAT(mWatch->getTargets(), IsEmpty());
}

TEST_F(PortWatchTest, AFileOfTargetsThatCannotBeReadIsReportedOnceAndThePortsStay) {
    waitForScans(1);
    mSettings.mTargetsFile = mDirectory.path("targets");
    writeFile(mSettings.mTargetsFile, "no target\n");
    EXPECT_TRUE(mWatch->scan(mSettings, mNow));
    EXPECT_TRUE(mWatch->scan(mSettings, mNow + seconds(10)));
    EXPECT_THAT(mLines, ElementsAre(HasSubstr(": its targets are not registered")));
    EXPECT_THAT(mWatch->getTargets(), SizeIs(1));
}

TEST_F(PortWatchTest, AFabricEventAsksForAScanOnceAndAnotherKindForNone) {
    waitForScans(1);
    mWatch->noteEvents(pageWith("queue-full", 5));
    mWatch->noteEvents(nullptr);
    for (const std::int64_t lTime : {6, 7}) {
        const int lScans = mSink.mScans;
        mWatch->noteEvents(pageWith("rscn", lTime));
        waitForScans(lScans + 1);
        mWatch->noteEvents(pageWith("rscn", lTime));  // the same event on a later page
        EXPECT_EQ(mSink.mScans, lScans + 1);
    }
}
