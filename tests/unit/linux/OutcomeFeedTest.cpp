#include "libkpm/linux/src/OutcomeFeed.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>

#include "tests/support/Waiting.h"
#include "tests/unit/linux/LinuxRecorder.h"
#include "tests/unit/linux/WatcherFixture.h"

/// A feed that nobody tells which buffers are readable.
class OutcomeFeed : public ZTCWatcherFixture {
protected:
    void open() {
        for (const std::size_t lKind : {gcLinuxQueueFull, gcLinuxDeviceBusy, gcLinuxCheckCondition}) {
            mRegistry.put(0, lKind, {.mpContext = &mRecorder, .mpScopeCallback = &ZTCLinuxRecorder::onScope});
        }
        mKernel.addHost(0);
        mWatcher.look();
        mFeed.noteHosts();
        ASSERT_EQ(mFeed.getState().get(), ZTFS_Working) << mFeed.getState().getReason();
    }

    void markAllReady() {
        for (std::size_t lBuffer = 0; lBuffer < mFeed.getBufferCount(); ++lBuffer) {
            mFeed.markReady(lBuffer);
        }
    }

    ZTCLinuxRecorder mRecorder;
    ZTCLinuxQueueDepths mDepths{mSysfs, mWatcher, mDelivery};
    ZTCLinuxOutcomeFeed mFeed{mKernel.options().mTracePlace, mKernel, mWatcher, mDepths, mDelivery, mLosses};
};

TEST_F(OutcomeFeed, ALookReadsEveryBufferAlsoOneThatPollSaysNothingOf) {
    open();
    mKernel.sendDone({.mLun = 1, .mResult = 0x28}, 0);
    mKernel.sendDone({.mLun = 2, .mResult = 0x28}, 1);
    mFeed.serve();
    EXPECT_EQ(mRecorder.count(), 0u) << "no buffer was said to be readable";
    mFeed.look();
    std::vector<std::string> lEvents = mRecorder.events();
    std::sort(lEvents.begin(), lEvents.end());  // the buffers are read in any order
    EXPECT_EQ(lEvents, (std::vector<std::string>{"0 queue-full 0 1", "0 queue-full 0 2"}));
}

TEST_F(OutcomeFeed, TheEndReadsEveryBufferAlsoOneThatPollSaysNothingOf) {
    open();
    mKernel.sendDone({.mLun = 2, .mResult = 0x08}, 1);
    mFeed.stop();
    EXPECT_EQ(mRecorder.events(), std::vector<std::string>{"0 device-busy 0 2"});
}

TEST_F(OutcomeFeed, BeforeAnOutcomeIsGivenUpSenseDataAreReadThatPollSaysNothingOf) {
    mKernel.mFormat = doneFormat(false);
    mKernel.addTypes();
    open();
    ASSERT_EQ(mFeed.getSenseProblem(), "");
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    markAllReady();
    mFeed.serve();
    mKernel.sendSense({});
    const auto lEnd = mFeed.getNextTime();
    ASSERT_TRUE(lEnd.has_value());
    waitUntil([&] { return ZTCSenseMatcher::Clock::now() >= *lEnd; }, "the end of the wait");
    mFeed.serve();
    EXPECT_EQ(mRecorder.events(), std::vector<std::string>{"0 check-condition 0 0 28 5 21 0"});
}

TEST_F(OutcomeFeed, AnOutcomeThatWaitsWhenTheEventIsSwitchedOffIsDelivered) {
    mKernel.mFormat = doneFormat(false);
    mKernel.addTypes();
    open();
    mKernel.sendDone({.mLun = 1, .mResult = 2, .mHasSense = false});
    markAllReady();
    mFeed.serve();
    mKernel.sendDone({.mLun = 2, .mResult = 8, .mHasSense = false}, 1);
    mKernel.refuseWrites("filter", "", EINVAL, 2);
    mKernel.addHost(1);
    mWatcher.look();
    mFeed.noteHosts();
    EXPECT_EQ(mFeed.getState().get(), ZTFS_Failed);
    EXPECT_EQ(mRecorder.events(),
              (std::vector<std::string>{"0 device-busy 0 2", "0 check-condition 0 1 28 ffffffff ffffffff ffffffff"}));
}

TEST_F(OutcomeFeed, AMarkOfLostRecordsIsCountedOnceHoweverOftenRecordsComeBehindIt) {
    open();
    writeFile(mKernel.instance() + "/per_cpu/cpu0/stats", "overrun: 18446744073709551615\n");
    mKernel.sendPage(ZTCPageBuilder().addShort(ZTSDoneRecord{.mResult = 8}.make()).make(gcMissedEvents));
    mFeed.look();
    mKernel.sendDone({.mResult = 8});
    mFeed.look();
    ASSERT_EQ(mRecorder.count(), 2u);
    mLosses.tellAll();
    EXPECT_EQ(mLog.loss("scsi-outcomes-lost"), 1u);
}
