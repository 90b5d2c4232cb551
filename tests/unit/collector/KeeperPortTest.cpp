#include "sensor/collector/include/KeeperPort.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class KeeperPortTest : public testing::Test {
protected:
    KeeperPortTest() {
        auto [lKeeper, lCollector] = ZTCLink::makePair();
        mKeeper = std::move(lKeeper);
        mPort.emplace(std::move(lCollector));
    }
    /// From the keeper.
    void say(ZTELinkMessageType aType) {
        ZTSLinkMessage lMessage;
        lMessage.mType = aType;
        EXPECT_EQ(mKeeper.send(lMessage), ZTLR_Done);
    }
    std::vector<std::string> receive() {
        return mPort->receive([this](ZTSLinkMessage aMessage) { mReceived.push_back(aMessage.mType); });
    }
    /// Types of all that the keeper has got.
    std::vector<ZTELinkMessageType> takeSent() {
        std::vector<ZTELinkMessageType> lTypes;
        ZTSLinkMessage lMessage;
        while (mKeeper.receive(lMessage) == ZTLR_Done) {
            lTypes.push_back(lMessage.mType);
        }
        return lTypes;
    }

    ZTCLink mKeeper;
    std::optional<ZTCKeeperPort> mPort;
    std::vector<ZTELinkMessageType> mReceived;
};

TEST_F(KeeperPortTest, HandsOverAllMessagesInOrder) {
    say(ZTLM_StopAgent);
    say(ZTLM_Finish);
    EXPECT_THAT(receive(), IsEmpty());
    EXPECT_THAT(mReceived, ElementsAre(ZTLM_StopAgent, ZTLM_Finish));
    EXPECT_FALSE(mPort->isGone());
}

TEST_F(KeeperPortTest, AKeeperThatHasEndedIsGone) {
    say(ZTLM_Finish);
    mKeeper.close();
    EXPECT_THAT(receive(), IsEmpty());
    EXPECT_THAT(mReceived, ElementsAre(ZTLM_Finish));
    EXPECT_TRUE(mPort->isGone());
}

TEST_F(KeeperPortTest, ALinkFromWhichNothingCanBeReceivedIsGoneWithOneLine) {
    const ZTCFileDescriptor lOther = ZTCFileDescriptor::open("/dev/null", O_RDWR);
    ASSERT_EQ(dup3(lOther.get(), mPort->getDescriptor(), O_CLOEXEC), mPort->getDescriptor());
    EXPECT_THAT(receive(), ElementsAre(HasSubstr("socket")));
    EXPECT_TRUE(mPort->isGone());
    EXPECT_THAT(receive(), IsEmpty()) << "it is not tried again";
}

TEST_F(KeeperPortTest, OneLookWaitsAtMostAndTheSameTextIsSentOnce) {
    const auto lNow = std::chrono::steady_clock::now();
    mPort->sendLook(lNow);
    mPort->sendLook(lNow);
    mPort->sendText("one");
    mPort->sendText("one");
    mPort->sendText("two");
    EXPECT_EQ(mPort->getEvents(), POLLIN | POLLOUT);
    mPort->flush();
    EXPECT_TRUE(mPort->isFlushed());
    EXPECT_EQ(mPort->getEvents(), POLLIN);
    EXPECT_THAT(takeSent(), ElementsAre(ZTLM_Look, ZTLM_Text, ZTLM_Text));
    EXPECT_EQ(mPort->getNextLook(), lNow + gcLookPeriod);
}

TEST_F(KeeperPortTest, WhatALinkDoesNotTakeWaitsForTheNextTime) {
    for (unsigned i = 0; i < 100000 && mPort->isFlushed(); ++i) {
        mPort->send(ZTLM_Silent, i);
        mPort->flush();
    }
    ASSERT_FALSE(mPort->isFlushed()) << "the link takes everything";
    const std::size_t lTaken = takeSent().size();
    EXPECT_GT(lTaken, 0U);
    mPort->flush();
    EXPECT_TRUE(mPort->isFlushed());
    EXPECT_THAT(takeSent(), ElementsAre(ZTLM_Silent));
}
