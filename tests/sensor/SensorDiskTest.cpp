// The real sensor on a disk that is full, or can only be read.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/sensor/TavikRun.h"
#include "tests/support/SmallFileSystem.h"

using testing::AllOf;
using testing::HasSubstr;

class SensorDisk : public testing::Test {
protected:
    SensorDisk() { std::filesystem::create_directory(mSensor.stateDirectory()); }
    void SetUp() override {
        mFileSystem = std::make_unique<ZTCSmallFileSystem>(mSensor.stateDirectory(), 24 << 10);
        if (!mFileSystem->isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
        mSensor.start();
        mSensor.simulate("queue-full board=hba0 times=2");
        mSensor.waitUntilAllIsStored();
    }
    /// Events of one kind after another, one record each.
    void deliverTen() {
        for (int i = 0; i < 5; ++i) {
            mSensor.simulate("queue-full board=hba0");
            mSensor.simulate("device-busy board=hba0");
        }
    }
    void waitForDisk(const std::string& acrState) {
        waitUntil([&] { return mSensor.status()["collector"]["disk"] == acrState; }, "the disk " + acrState);
    }
    /// While nothing can be stored: the agent holds what comes, and a person is told.
    void expectHeldAndSaid() {
        EXPECT_GT(mSensor.status()["agent"]["heldRecords"], 0);
        const ZTSTavikRun lRun = runTavik(mSensor, {"status"});
        EXPECT_EQ(lRun.mExit, 3) << lRun.mError;
        EXPECT_THAT(lRun.mOutput,
                    AllOf(HasSubstr("state: NOT COLLECTING"), HasSubstr("there is no room to store what comes"),
                          HasSubstr("see: tavik explain disk-full")));
        mAgent = mSensor.findAgent();
        EXPECT_NE(mAgent, 0);
    }
    void expectAllOf(std::uint64_t aCount) {
        waitForDisk("ok");
        mSensor.waitUntilAllIsStored();
        EXPECT_EQ(mSensor.findAgent(), mAgent) << "the same agent";
        EXPECT_NE(runTavik(mSensor, {"status"}).mExit, 3);
        EXPECT_EQ(mSensor.stop(), 0);
        EXPECT_EQ(countStored(mSensor.stateDirectory()), aCount);
        EXPECT_TRUE(ZTCHistory(mSensor.stateDirectory()).readGaps().empty());
        EXPECT_EQ(countRefused(mSensor.stateDirectory()), 0U);
        expectSoundHistory(mSensor.stateDirectory());
    }

    ZTCSensorProcess mSensor{"collect.period = 0.1\n"};
    pid_t mAgent = 0;
    std::unique_ptr<ZTCSmallFileSystem> mFileSystem;  // goes first: it is mounted in the sensor's directory
};

TEST_F(SensorDisk, WhenItIsFullTheAgentKeepsItsRecordsAndAllIsStoredWhenThereIsRoomAgain) {
    mFileSystem->fill();
    deliverTen();
    waitForDisk("full");
    deliverTen();
    expectHeldAndSaid();
    mFileSystem->empty();
    expectAllOf(22);
    EXPECT_THAT(mSensor.standardError(), HasSubstr("there is room in"));
}

TEST_F(SensorDisk, AReadOnlyOneIsLikeAFullOne) {
    mFileSystem->makeReadOnly();
    deliverTen();
    waitForDisk("read-only");
    deliverTen();
    expectHeldAndSaid();
    mFileSystem->makeWritable();
    expectAllOf(22);
}
