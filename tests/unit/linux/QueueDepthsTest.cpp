#include "libkpm/linux/src/QueueDepths.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>

#include "tests/unit/linux/EngineFixture.h"
#include "tests/unit/linux/WatcherFixture.h"

using ZTCDepthTime = ZTCLinuxQueueDepths::Clock::time_point;

/// The object alone, with a clock that the test moves.
class QueueDepths : public ZTCWatcherFixture {
protected:
    QueueDepths() {
        mKernel.addHost(0);
        mWatcher.look();
    }

    void look() {
        mDepths.look(mNow);
        while (mDepths.getNextTime()) {
            mNow = std::max(mNow, *mDepths.getNextTime());
            mDepths.serve(mNow);
        }
    }

    static void onDepth(unsigned, HBA_wwn, unsigned, unsigned, void* apContext, ZT_event*) {
        ++*static_cast<unsigned*>(apContext);
    }

    void registerDepths() {
        ZTSLibraryRegistration lRegistration;
        lRegistration.mpScopeCallback = &onDepth;
        lRegistration.mpContext = &mDelivered;
        mRegistry.put(0, gcLinuxQueueDepth, lRegistration);
    }

    ZTCLinuxQueueDepths mDepths{mSysfs, mWatcher, mDelivery};
    ZTCDepthTime mNow{};
    unsigned mDelivered = 0;
};

TEST_F(QueueDepths, ManyLunsAreReadAFewAtATimeWithPausesBetween) {
    constexpr std::size_t lLuns = 3 * ZTCLinuxQueueDepths::scLunsInARound + 1;
    for (std::size_t lLun = 0; lLun < lLuns; ++lLun) {
        mKernel.setDepth("0:0:0:" + std::to_string(lLun), 32);
    }
    registerDepths();
    look();
    for (std::size_t lLun = 0; lLun < lLuns; ++lLun) {
        mKernel.setDepth("0:0:0:" + std::to_string(lLun), 31);
    }
    mDepths.look(mNow);
    unsigned lRounds = 0;
    while (const std::optional<ZTCDepthTime> lNext = mDepths.getNextTime()) {
        const unsigned lBefore = mDelivered;
        mDepths.serve(*lNext);
        EXPECT_LE(mDelivered - lBefore, ZTCLinuxQueueDepths::scLunsInARound);
        EXPECT_EQ(*lNext, mNow + lRounds * ZTCLinuxQueueDepths::scPause);
        ++lRounds;
    }
    EXPECT_EQ(lRounds, 4u);
    EXPECT_EQ(mDelivered, lLuns);
}

TEST_F(QueueDepths, ALookDuringASweepDoesNotBeginItAnew) {
    mKernel.setDepth("0:0:0:0", 32);
    mDepths.look(mNow);
    mKernel.setDepth("0:0:0:1", 32);
    mDepths.look(mNow);
    mDepths.serve(mNow);
    EXPECT_FALSE(mDepths.getNextTime().has_value());
}

TEST_F(QueueDepths, ALunThatAnsweredQueueFullIsReadSoonAndOnceForAStorm) {
    mKernel.setDepth("0:0:0:0", 32);
    registerDepths();
    look();
    mKernel.setDepth("0:0:0:0", 30);
    for (int lTimes = 0; lTimes < 1000; ++lTimes) {
        mDepths.noteQueueFull({0, 0, 0, 0}, mNow + std::chrono::milliseconds(lTimes % 10));
    }
    EXPECT_EQ(mDepths.getNextTime(), mNow + ZTCLinuxQueueDepths::scSoon);
    mDepths.serve(mNow);
    EXPECT_EQ(mDelivered, 0u);
    mDepths.serve(mNow + ZTCLinuxQueueDepths::scSoon);
    EXPECT_EQ(mDelivered, 1u);
    EXPECT_FALSE(mDepths.getNextTime().has_value());
}

TEST_F(QueueDepths, ALunThatLeavesAndComesBackBeginsAnew) {
    mKernel.setDepth("0:0:0:0", 32);
    registerDepths();
    look();
    mKernel.removeClass("scsi_device/0:0:0:0");
    look();
    mKernel.setDepth("0:0:0:0", 16);
    look();
    EXPECT_EQ(mDelivered, 0u);
}

TEST_F(QueueDepths, AChangeWhileTheLunsCannotBeListedIsDeliveredAfterwards) {
    const std::string lClass = mKernel.sysfs() + "/class/scsi_device";
    mKernel.setDepth("0:0:0:0", 32);
    registerDepths();
    look();
    std::filesystem::rename(lClass, lClass + ".away");
    mKernel.setAttribute("scsi_device", "a file in place of the directory");
    look();
    std::filesystem::remove(lClass);
    std::filesystem::rename(lClass + ".away", lClass);
    mKernel.setDepth("0:0:0:0", 16);
    look();
    EXPECT_EQ(mDelivered, 1u);
}

TEST_F(LinuxEngine, AQueueDepthThatChangesIsDeliveredWithBothValues) {
    mKernel.addHost(3);
    mKernel.addTarget(3, 0, 5, portNameText(0x55));
    mKernel.setDepth("3:0:5:17", 32);
    mKernel.setDepth("3:0:6:1", 32);
    start();
    mKernel.setDepth("3:0:5:17", 31);
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 queue-depth 55 11 32->31"});
    mKernel.setDepth("3:0:6:1", 64);
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 queue-depth 0 1 32->64") << "a port that is not known is zeros";
}

TEST_F(LinuxEngine, QueueDepthsOfOtherHostsAndWhatIsNoDepthAreNothing) {
    mKernel.addHost(0);
    mKernel.setDepth("0:0:0:0", 32);
    mKernel.setDepth("7:0:0:0", 32);
    mKernel.setDepth("0:0:0:1", 32);
    start();
    mKernel.setDepth("7:0:0:0", 31);
    mKernel.setAttribute("scsi_device/0:0:0:1/device/queue_depth", "garbage\n");
    mKernel.setDepth("0:0:0:0", 31);
    mRecorder.waitFor(1);
    mKernel.setAttribute("scsi_device/0:0:0:1/device/queue_depth", "-1\n");
    mKernel.setDepth("0:0:0:0", 30);
    EXPECT_EQ(mRecorder.waitFor(2), (ZTCTexts{"0 queue-depth 0 0 32->31", "0 queue-depth 0 0 31->30"}));
}

TEST_F(LinuxEngine, AQueueFullHasTheDepthReadWithoutWaitingForTheNextLook) {
    mKernel.addHost(0);
    mKernel.setDepth("0:0:0:0", 32);
    startWithoutLooks();
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    mKernel.setDepth("0:0:0:0", 20);
    mKernel.sendDone({.mResult = 0x28});
    const ZTCTexts lEvents = mRecorder.waitFor(3);
    EXPECT_EQ(std::count(lEvents.begin(), lEvents.end(), "0 queue-depth 0 0 32->20"), 1);
}
