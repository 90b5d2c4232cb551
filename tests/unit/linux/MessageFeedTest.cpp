#include "libkpm/linux/src/MessageFeed.h"

#include <gtest/gtest.h>

#include <chrono>

#include "tests/unit/linux/WatcherFixture.h"

/// The object alone: the test calls what the engine's thread would call.
class MessageFeed : public ZTCWatcherFixture {
protected:
    ZTCLinuxMessageFeed mFeed{mKernel, mWatcher, mDelivery, mLosses, std::chrono::milliseconds(1000)};
};

TEST_F(MessageFeed, ASocketThatIsReadableWithNothingToReadIsLeftAloneUntilTheNextLook) {
    mFeed.noteHosts();
    const int lDescriptor = mFeed.getDescriptor();
    ASSERT_GE(lDescriptor, 0);
    mFeed.serve();
    EXPECT_EQ(mFeed.getDescriptor(), -1) << "waiting for it would wake the thread again and again";
    EXPECT_EQ(mFeed.getState().get(), ZTFS_Resting);
    mFeed.look();
    EXPECT_EQ(mFeed.getDescriptor(), lDescriptor);
}

TEST_F(MessageFeed, ASocketThatWasReadEmptyIsWaitedForAgain) {
    mKernel.addHost(0);
    mWatcher.look();
    mFeed.noteHosts();
    mKernel.sendFc({.mHost = 0, .mNumber = 1, .mCode = 0x500});
    mFeed.serve();
    EXPECT_TRUE(mKernel.isFcDrained());
    EXPECT_GE(mFeed.getDescriptor(), 0);
}

TEST_F(MessageFeed, ASocketThatHasWorkedIsTriedAgainWithTheNextLookHoweverLongItWasTriedBefore) {
    mKernel.mRefusesFcEvents = true;
    mFeed.noteHosts();
    for (int lLook = 0; lLook < 7; ++lLook) {
        mFeed.look();
    }
    ASSERT_FALSE(mFeed.getState().isOpen());
    mKernel.mRefusesFcEvents = false;
    for (int lLook = 0; lLook < 8 && !mFeed.getState().isOpen(); ++lLook) {
        mFeed.look();
    }
    ASSERT_TRUE(mFeed.getState().isOpen());
    mKernel.sendFc(ZTLR_Failed);
    mFeed.serve();
    ASSERT_FALSE(mFeed.getState().isOpen());
    mFeed.look();
    EXPECT_TRUE(mFeed.getState().isOpen());
}
