#include "sensor/link/include/Link.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstring>
#include <exception>
#include <tuple>

#include "sensor/client/include/ClientErrors.h"

static ZTCFileDescriptor sMakeEvent() {
    return ZTCFileDescriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
}

static bool sIsSameFile(const ZTCFileDescriptor& acrOne, const ZTCFileDescriptor& acrOther) {
    struct stat lOne {};
    struct stat lOther {};
    return fstat(acrOne.get(), &lOne) == 0 && fstat(acrOther.get(), &lOther) == 0 && lOne.st_ino == lOther.st_ino;
}

class Link : public testing::Test {
protected:
    /// Sends on the keeper's end, receives on the collector's.
    ZTSLinkMessage pass(const ZTSLinkMessage& acrMessage) {
        EXPECT_EQ(mKeeper.send(acrMessage), ZTLR_Done);
        ZTSLinkMessage lReceived;
        EXPECT_EQ(mCollector.receive(lReceived), ZTLR_Done);
        return lReceived;
    }

    Link() { std::tie(mKeeper, mCollector) = ZTCLink::makePair(); }

    ZTCLink mKeeper;
    ZTCLink mCollector;
};

TEST_F(Link, EveryNumberAndTheTextArriveAsTheyWereSent) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_KeeperState;
    lMessage.mStart = 0xFFFFFFFFFFFFFFFF;
    lMessage.mPid = 4194303;
    lMessage.mRestarts = 77;
    lMessage.mWaitStatus = -9;
    lMessage.mState = ZTKS_Stopping;
    lMessage.mSince = -5;
    lMessage.mNextStart = 1795262400;
    lMessage.mText = "no adapters";
    const ZTSLinkMessage lReceived = pass(lMessage);
    EXPECT_EQ(lReceived.mType, ZTLM_KeeperState);
    EXPECT_EQ(lReceived.mStart, 0xFFFFFFFFFFFFFFFF);
    EXPECT_EQ(lReceived.mPid, 4194303);
    EXPECT_EQ(lReceived.mRestarts, 77U);
    EXPECT_EQ(lReceived.mWaitStatus, -9);
    EXPECT_EQ(lReceived.mState, ZTKS_Stopping);
    EXPECT_EQ(lReceived.mSince, -5);
    EXPECT_EQ(lReceived.mNextStart, 1795262400);
    EXPECT_EQ(lReceived.mText, "no adapters");
    EXPECT_FALSE(lReceived.mBell.isOpen());
}

TEST_F(Link, AStartBringsTheReadEndOfTheResponseFifoAndTheBellInTheirPlaces) {
    int lPipe[2];
    ASSERT_EQ(pipe2(lPipe, O_CLOEXEC | O_NONBLOCK), 0);
    const ZTCFileDescriptor lWriteEnd(lPipe[1]);
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_AgentStarted;
    lMessage.mResponseFifo = ZTCFileDescriptor(lPipe[0]);
    lMessage.mBell = sMakeEvent();
    const ZTSLinkMessage lReceived = pass(lMessage);
    EXPECT_TRUE(sIsSameFile(lReceived.mResponseFifo, lMessage.mResponseFifo));
    ASSERT_EQ(write(lWriteEnd.get(), "x", 1), 1);
    char lByte = 0;
    EXPECT_EQ(read(lReceived.mResponseFifo.get(), &lByte, 1), 1);
    EXPECT_EQ(lByte, 'x');
    ASSERT_EQ(eventfd_write(lMessage.mBell.get(), 3), 0);
    eventfd_t lRings = 0;
    EXPECT_EQ(eventfd_read(lReceived.mBell.get(), &lRings), 0);
    EXPECT_EQ(lRings, 3U);
    EXPECT_NE(fcntl(lReceived.mResponseFifo.get(), F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_NE(fcntl(lReceived.mBell.get(), F_GETFD) & FD_CLOEXEC, 0);
}

TEST_F(Link, AReloadBringsTheTextOfTheSettings) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Reload;
    lMessage.mSettings = ZTCFileDescriptor(memfd_create("settings", MFD_CLOEXEC));
    EXPECT_TRUE(sIsSameFile(pass(lMessage).mSettings, lMessage.mSettings));
}

TEST_F(Link, AMessageThatLacksItsDescriptorsIsNotSent) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_AgentStarted;
    lMessage.mBell = sMakeEvent();
    EXPECT_THROW(mKeeper.send(lMessage), ZTCBadInputEx);
    ZTSLinkMessage lReceived;
    EXPECT_EQ(mCollector.receive(lReceived), ZTLR_NotNow);
}

TEST_F(Link, MessagesKeepTheirOrderAndEachIsReceivedOnce) {
    for (std::uint64_t i = 1; i <= 5; ++i) {
        ZTSLinkMessage lMessage;
        lMessage.mType = ZTLM_Drained;
        lMessage.mStart = i;
        ASSERT_EQ(mCollector.send(lMessage), ZTLR_Done);
    }
    ZTSLinkMessage lReceived;
    for (std::uint64_t i = 1; i <= 5; ++i) {
        ASSERT_EQ(mKeeper.receive(lReceived), ZTLR_Done);
        EXPECT_EQ(lReceived.mStart, i);
    }
    EXPECT_EQ(mKeeper.receive(lReceived), ZTLR_NotNow);
}

TEST_F(Link, AFullLinkSaysSoInsteadOfWaitingAndTakesMessagesAgainOnceRead) {
    ZTSLinkMessage lMessage;
    unsigned lSent = 0;
    while (mCollector.send(lMessage) == ZTLR_Done) {
        ASSERT_LT(++lSent, 100000U);
    }
    EXPECT_GT(lSent, 10U);
    EXPECT_EQ(mCollector.send(lMessage), ZTLR_NotNow);
    ZTSLinkMessage lReceived;
    while (mKeeper.receive(lReceived) == ZTLR_Done) {
    }
    EXPECT_EQ(mCollector.send(lMessage), ZTLR_Done);
}

TEST_F(Link, TooManyDescriptorsOnTheirWayAreNoFailureEither) {
    // The kernel counts them by user, and lets root send any number.
    const pid_t lChild = fork();
    ASSERT_GE(lChild, 0);
    if (lChild == 0) {
        const rlimit lLimit{16, 16};
        ZTSLinkMessage lMessage;
        lMessage.mType = ZTLM_AgentStarted;
        lMessage.mResponseFifo = sMakeEvent();
        lMessage.mBell = sMakeEvent();
        if ((geteuid() == 0 && setuid(65534) != 0) || setrlimit(RLIMIT_NOFILE, &lLimit) != 0) {
            _exit(2);
        }
        try {
            ZTELinkResult lResult = ZTLR_Done;
            for (int i = 0; i < 1000 && lResult == ZTLR_Done; ++i) {
                lResult = mKeeper.send(lMessage);
            }
            _exit(lResult == ZTLR_NotNow ? 0 : 3);
        } catch (const std::exception&) {
            _exit(1);
        }
    }
    int lStatus = 0;
    ASSERT_EQ(waitpid(lChild, &lStatus, 0), lChild);
    EXPECT_TRUE(WIFEXITED(lStatus) && WEXITSTATUS(lStatus) == 0) << lStatus;
}

TEST_F(Link, WhatWasSentBeforeTheEndIsReceivedBeforeTheEndIsSeen) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Finish;
    ASSERT_EQ(mKeeper.send(lMessage), ZTLR_Done);
    mKeeper.close();
    ZTSLinkMessage lReceived;
    EXPECT_EQ(mCollector.receive(lReceived), ZTLR_Done);
    EXPECT_EQ(lReceived.mType, ZTLM_Finish);
    EXPECT_EQ(mCollector.receive(lReceived), ZTLR_PeerGone);
    EXPECT_EQ(mCollector.send(lMessage), ZTLR_PeerGone);
}

TEST_F(Link, AnEndThatLeavesMessagesUnreadIsAnEndLikeAnyOther) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Finish;
    ASSERT_EQ(mKeeper.send(lMessage), ZTLR_Done);
    mCollector.close();
    ZTSLinkMessage lReceived;
    EXPECT_EQ(mKeeper.receive(lReceived), ZTLR_PeerGone);
    EXPECT_EQ(mKeeper.receive(lReceived), ZTLR_PeerGone);
}

TEST_F(Link, ATextOfTheLimitPassesALongerStatusLineIsCutALongerPathIsRefused) {
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Text;
    lMessage.mText = std::string(gcMaxLinkText, 't');
    EXPECT_EQ(pass(lMessage).mText, lMessage.mText);
    lMessage.mText += "u";
    EXPECT_EQ(pass(lMessage).mText, std::string(gcMaxLinkText, 't'));
    lMessage.mType = ZTLM_AgentEnded;
    EXPECT_THROW(mKeeper.send(lMessage), ZTCBadInputEx);
}

TEST_F(Link, APacketThatIsNotAMessageIsNamedAndTheNextMessageIsReceived) {
    const std::string lForeign(100, '\1');
    ASSERT_EQ(send(mKeeper.getDescriptor(), lForeign.data(), lForeign.size(), 0), 100);
    const std::string lTooLong(5000, '\1');
    ASSERT_EQ(send(mKeeper.getDescriptor(), lTooLong.data(), lTooLong.size(), 0), 5000);
    ZTSLinkMessage lReceived;
    EXPECT_THROW(mCollector.receive(lReceived), ZTCBadInputEx);
    EXPECT_THROW(mCollector.receive(lReceived), ZTCBadInputEx);
    ZTSLinkMessage lMessage;
    lMessage.mType = ZTLM_Finish;
    EXPECT_EQ(pass(lMessage).mType, ZTLM_Finish);
}

/// Sends whole packets with one number changed; offsets as in the packet.
TEST_F(Link, AnUnknownTypeStateOrTextSizeIsRefused) {
    struct {
        std::size_t mOffset;
        std::uint32_t mValue;
    } constexpr lCases[] = {{0, 0x54564B02}, {4, 0}, {4, 7}, {4, ZTLM_AgentStarted}, {48, 5}, {52, gcMaxLinkText + 1}};
    for (const auto& lcrCase : lCases) {
        SCOPED_TRACE(testing::Message() << "offset " << lcrCase.mOffset << " value " << lcrCase.mValue);
        ZTSLinkMessage lMessage;
        lMessage.mType = ZTLM_Finish;
        ASSERT_EQ(mKeeper.send(lMessage), ZTLR_Done);
        char lPacket[4096];
        const ssize_t lSize = recv(mCollector.getDescriptor(), lPacket, sizeof(lPacket), 0);
        ASSERT_GT(lSize, 56);
        std::memcpy(lPacket + lcrCase.mOffset, &lcrCase.mValue, sizeof(lcrCase.mValue));
        ASSERT_EQ(send(mKeeper.getDescriptor(), lPacket, static_cast<std::size_t>(lSize), 0), lSize);
        ZTSLinkMessage lReceived;
        EXPECT_THROW(mCollector.receive(lReceived), ZTCBadInputEx);
    }
}

TEST(LinkState, EveryStateOfTheKeeperHasAName) {
    EXPECT_STREQ(keeperStateName(ZTKS_Starting), "starting");
    EXPECT_STREQ(keeperStateName(ZTKS_Running), "running");
    EXPECT_STREQ(keeperStateName(ZTKS_WaitingForAdapters), "waiting-for-adapters");
    EXPECT_STREQ(keeperStateName(ZTKS_WaitingToRestart), "waiting-to-restart");
    EXPECT_STREQ(keeperStateName(ZTKS_Stopping), "stopping");
}
