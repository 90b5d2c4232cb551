#include "sensor/collector/include/AgentQueue.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "tests/support/StatusPageFile.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/collector/NotingHistory.h"

using std::chrono::seconds;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

static constexpr int scKilled = SIGKILL;  // as waitpid() gives it

class AgentQueueTest : public testing::Test {
protected:
    using ZTCMessages = std::vector<std::pair<int, std::uint64_t>>;  ///< type, and start number

    AgentQueueTest() : mLink(ZTCLink::makePair()), mPort(std::move(mLink.second)) {
        std::signal(SIGPIPE, SIG_IGN);
        std::filesystem::create_directory(mDirectory.path("agent"));
        mSpool.open();
        makeFifos(mDirectory.path("agent"));
    }

    /// An agent that answers what it is asked. The message about it has this start number.
    void startAgent(ZTCFakeAgent::ZTCStep aGet = ZTCFakeAgent::answering({2, 0, 0, 0, 0})) {
        mAgent = std::make_unique<ZTCFakeAgent>(
            mDirectory.path("agent"),
            std::deque<ZTCFakeAgent::ZTCStep>{[aGet](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                if (acrRequest[0] == ZTSTVKC_GetScopeData) {
                    aGet(arAgent, acrRequest);
                } else if (acrRequest[0] == ZTSTVKC_CollectionPeriod) {
                    arAgent.sendFrame({ZTRO_Failed, 0, ZTSAPS_Invalid});
                } else {
                    arAgent.sendFrame({0, 0, 0, 0, 0});
                }
            }});
    }
    ZTSLinkMessage makeStarted(std::uint64_t aStart, const std::string& acrFifo) {
        ZTSLinkMessage lMessage;
        lMessage.mType = ZTLM_AgentStarted;
        lMessage.mStart = aStart;
        lMessage.mPid = 4711;
        lMessage.mText = pagePath(aStart);
        lMessage.mResponseFifo = ZTCFileDescriptor::open(acrFifo.c_str(), O_RDONLY | O_NONBLOCK);
        lMessage.mBell = ZTCFileDescriptor(eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC));
        mBells[aStart] = lMessage.mBell.get();
        return lMessage;
    }
    /// The agent of startAgent().
    void noteStarted(std::uint64_t aStart) {
        mPages[aStart] = std::make_unique<ZTCStatusPageFile>(pagePath(aStart), 1);
        mPages[aStart]->header().mHeldRecords = 1;
        mQueue.noteStarted(makeStarted(aStart, mDirectory.path("agent") + gcResponseFifoName));
    }
    /// An agent that only writes: returns its end of the response FIFO.
    ZTCFileDescriptor noteWriterStarted(std::uint64_t aStart) {
        const std::string lFifo = mDirectory.path("fifo." + std::to_string(aStart));
        EXPECT_EQ(mkfifo(lFifo.c_str(), 0600), 0);
        mPages[aStart] = std::make_unique<ZTCStatusPageFile>(pagePath(aStart), 1);
        mQueue.noteStarted(makeStarted(aStart, lFifo));
        return ZTCFileDescriptor::open(lFifo.c_str(), O_WRONLY | O_NONBLOCK);
    }
    void noteEnded(std::uint64_t aStart, int aWaitStatus = scKilled) {
        ZTSLinkMessage lMessage;
        lMessage.mType = ZTLM_AgentEnded;
        lMessage.mStart = aStart;
        lMessage.mWaitStatus = aWaitStatus;
        mQueue.noteEnded(lMessage, now());
    }
    std::string pagePath(std::uint64_t aStart) const { return mDirectory.path("agent/page." + std::to_string(aStart)); }
    ZTCAgentQueue::ZTCTime now() const { return std::chrono::steady_clock::now() + mAhead; }

    /// One turn of the collector's loop.
    void turn() {
        pollfd lFifo{.fd = mQueue.getResponseFifo(), .events = POLLIN, .revents = 0};
        poll(&lFifo, 1, 0);
        mQueue.noteResponseEvents(lFifo.revents);
        mQueue.run(now());
        mPort.flush();
        ZTSLinkMessage lMessage;
        while (mLink.first.receive(lMessage) == ZTLR_Done) {
            mTold.emplace_back(lMessage.mType, lMessage.mStart);
        }
    }
    void turnUntil(const std::function<bool()>& acrCondition, const std::string& acrWhat) {
        waitUntil(
            [&] {
                turn();
                return acrCondition();
            },
            acrWhat);
    }
    bool hasTold(int aType, std::uint64_t aStart) const {
        return std::ranges::find(mTold, std::pair(aType, aStart)) != mTold.end();
    }
    void turnUntilTold(int aType, std::uint64_t aStart) {
        turnUntil([&] { return hasTold(aType, aStart); }, "a message to the keeper");
    }
    bool hasAsked(const ZTCWireBytes& acrRequest) const {
        return std::ranges::count(mAgent->getRequests(), acrRequest) != 0;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSpool mSpool{mDirectory.path("spool")};
    ZTCNotingHistory mHistory;
    std::map<std::uint64_t, std::unique_ptr<ZTCStatusPageFile>> mPages;
    std::map<std::uint64_t, int> mBells;
    std::unique_ptr<ZTCFakeAgent> mAgent;
    std::pair<ZTCLink, ZTCLink> mLink;  ///< the keeper's end, and what becomes the port's
    ZTCKeeperPort mPort;
    ZTCMessages mTold;  ///< what the keeper was told
    std::vector<std::string> mLines;
    ZTCAgentQueue mQueue{
        mPort, mSpool, mHistory, mDirectory.path("agent"), ZTSSessionSettings{}, [this](const std::string& acrLine) {
            mLines.push_back(acrLine);
        }};
    seconds mAhead{0};
};

TEST_F(AgentQueueTest, WithoutAnAgentNothingIsPlannedAndNothingIsPolled) {
    turn();
    EXPECT_TRUE(mQueue.isEmpty());
    EXPECT_FALSE(mQueue.getNextStep());
    EXPECT_EQ(mQueue.getResponseFifo(), -1);
    EXPECT_EQ(mQueue.getBell(), -1);
    EXPECT_EQ(mQueue.readPage(), nullptr);
    EXPECT_FALSE(mQueue.getLastAsked());
    EXPECT_THAT(mTold, IsEmpty());
}

TEST_F(AgentQueueTest, TheKeeperHearsThatTheAgentHasAnsweredItsStartAndOfEachLook) {
    startAgent();
    noteStarted(7);
    turnUntilTold(ZTLM_StartAnswered, 7);
    turnUntilTold(ZTLM_Look, 0);
    turnUntil([this] { return !mHistory.mFiles.empty(); }, "a frame");
    EXPECT_TRUE(mQueue.getLastAsked());
    EXPECT_NE(mQueue.getPage(), nullptr);
}

TEST_F(AgentQueueTest, AStartThatIsAnnouncedAgainIsTheSameAgent) {
    startAgent();
    noteStarted(7);
    mQueue.noteStarted(makeStarted(7, mDirectory.path("agent") + gcResponseFifoName));
    turnUntilTold(ZTLM_StartAnswered, 7);
    mQueue.noteStarted(makeStarted(7, mDirectory.path("agent") + gcResponseFifoName));
    EXPECT_FALSE(mQueue.hasWaiting());
}

TEST_F(AgentQueueTest, TheNextAgentWaitsUntilAllThatTheFormerOneWroteIsInTheSpool) {
    ZTCFileDescriptor lFormer = noteWriterStarted(1);
    const ZTCFileDescriptor lNext = noteWriterStarted(2);
    turn();
    ASSERT_EQ(mQueue.getSession()->getStart(), 1U);
    EXPECT_TRUE(mQueue.hasWaiting());
    ASSERT_EQ(write(lFormer.get(), "\0\0\0\5\2\0\0\0\0", 9), 9);
    noteEnded(1);
    turnUntil([this] { return mHistory.mFiles.size() == 1; }, "the former one's frame");
    EXPECT_EQ(mQueue.getSession()->getStart(), 1U) << "its FIFO is not at its end";
    EXPECT_FALSE(hasTold(ZTLM_Drained, 1));
    lFormer.reset();
    turnUntilTold(ZTLM_Drained, 1);
    ASSERT_NE(mQueue.getSession(), nullptr);
    EXPECT_EQ(mQueue.getSession()->getStart(), 2U);
    EXPECT_FALSE(mQueue.hasWaiting());
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_EQ(mHistory.mEnded[0].mPagePath, pagePath(1));
}

TEST_F(AgentQueueTest, AgentsThatEndedWhileTheyWaitedAreEmptiedInTheirOrder) {
    for (const std::uint64_t lStart : {1U, 2U, 3U}) {
        const ZTCFileDescriptor lWriter = noteWriterStarted(lStart);
        ASSERT_EQ(write(lWriter.get(), "\0\0\0\5\2\0\0\0\0", 9), 9);
    }
    for (const std::uint64_t lStart : {3U, 1U, 2U}) {
        noteEnded(lStart);
    }
    turnUntilTold(ZTLM_Drained, 3);
    EXPECT_TRUE(mQueue.isEmpty());
    EXPECT_EQ(mHistory.mFiles.size(), 3U);
    std::vector<std::string> lEnded;
    for (const ZTSEndedAgent& lrAgent : mHistory.mEnded) {
        EXPECT_EQ(lrAgent.mReason, "the agent was killed by signal 9");
        lEnded.push_back(lrAgent.mPagePath);
    }
    EXPECT_THAT(lEnded, ElementsAre(pagePath(1), pagePath(2), pagePath(3)));
    std::erase_if(mTold, [](const auto& acrMessage) { return acrMessage.first != ZTLM_Drained; });
    EXPECT_EQ(mTold, (ZTCMessages{{ZTLM_Drained, 1}, {ZTLM_Drained, 2}, {ZTLM_Drained, 3}}));
}

TEST_F(AgentQueueTest, TheLastPageStaysKnownWhenTheAgentHasEnded) {
    noteWriterStarted(1).reset();
    turnUntil([this] { return mQueue.getSession()->getPage() != nullptr; }, "the page");
    noteEnded(1);
    turnUntilTold(ZTLM_Drained, 1);
    EXPECT_EQ(mQueue.getSession(), nullptr);
    EXPECT_NE(mQueue.readPage(), nullptr);
    EXPECT_NE(mQueue.getPage(), nullptr);
}

TEST_F(AgentQueueTest, AStopIsForTheAgentOfThatStartAlone) {
    startAgent();
    noteStarted(7);
    turnUntilTold(ZTLM_StartAnswered, 7);
    mQueue.stop(6, now());
    EXPECT_FALSE(mQueue.getSession()->isStopping());
    mPages[7]->header().mHeldRecords = 0;
    mQueue.stop(7, now());
    turnUntil([this] { return hasAsked(encodeShutDown()); }, "the shut-down");
    EXPECT_TRUE(hasAsked(encodeStop()));
}

TEST_F(AgentQueueTest, AStopOfAllStopsAgentsThatAreAnnouncedLaterToo) {
    startAgent();
    mQueue.stopAll(now());
    noteStarted(7);
    mPages[7]->header().mHeldRecords = 0;
    turnUntil([this] { return hasAsked(encodeShutDown()); }, "the shut-down");
    EXPECT_FALSE(hasAsked(encodeStartScope(900)));
}

TEST_F(AgentQueueTest, SettingsAndTargetsReachTheRunningAgentAndThoseThatFollow) {
    const ZTSTargetPort lFirst{.mNodeName = {}, .mPortName = {}, .mFcId = 7};
    const ZTSTargetPort lSecond{.mNodeName = {}, .mPortName = {}, .mFcId = 8};
    mQueue.setTargets({lFirst}, now());
    mQueue.setSettings({.mPeriod = seconds(5), .mRecordLimit = 500}, now());
    startAgent();
    noteStarted(7);
    turnUntilTold(ZTLM_StartAnswered, 7);
    EXPECT_TRUE(hasAsked(encodeRegisterTargets({{lFirst}})));
    EXPECT_TRUE(hasAsked(encodeStartScope(500)));
    mQueue.setTargets({lFirst, lSecond}, now());
    mQueue.setSettings({.mPeriod = seconds(5), .mRecordLimit = 600}, now());
    turnUntil([&] { return hasAsked(encodeRegisterTargets({{lSecond}})) && hasAsked(encodeStartScope(600)); },
              "the new target and the new limit");
}

TEST_F(AgentQueueTest, AnAgentThatSaysNothingIsReportedToTheKeeper) {
    startAgent(ZTCFakeAgent::silent());
    noteStarted(7);
    turnUntil([this] { return mQueue.getLastAsked().has_value(); }, "the request");
    mAhead += gcSilenceLimit + seconds(1);
    turnUntilTold(ZTLM_Silent, 7);
    EXPECT_THAT(mLines, Contains(HasSubstr("no byte of its answer")));
}

TEST_F(AgentQueueTest, ABellIsAReasonToLookAtOnce) {
    startAgent();
    noteStarted(7);
    turnUntil([this] { return !mHistory.mFiles.empty(); }, "a frame");
    const std::uint64_t lOne = 1;
    ASSERT_EQ(write(mBells[7], &lOne, sizeof(lOne)), 8);
    EXPECT_EQ(mQueue.getBell(), mBells[7]);
    mQueue.noteBellEvents(POLLIN, now());
    EXPECT_LE(*mQueue.getNextStep(), now());
}

TEST_F(AgentQueueTest, AFifoWithoutAWriterIsNotPolledUntilTheNextStep) {
    ZTCFileDescriptor lWriter = noteWriterStarted(1);
    turnUntil([this] { return mQueue.getResponseFifo() != -1; }, "a session");
    lWriter.reset();
    mQueue.noteResponseEvents(POLLHUP);
    EXPECT_EQ(mQueue.getResponseFifo(), -1);
    EXPECT_THAT(mTold, Not(Contains(std::pair<int, std::uint64_t>(ZTLM_Drained, 1)))) << "its agent has not ended";
}

TEST_F(AgentQueueTest, WhatAnAgentRefusedIsKnownToTheNextQueue) {
    startAgent();
    noteStarted(7);
    mPages[7]->header().mStartTime = toMicroseconds(getHistoryTime());
    mPages[7]->row(0, 0).mRefused[ZTSR_TotalLimit] = 5;
    std::optional<std::string> lText;
    turnUntil([&] { return (lText = mQueue.takeNewLosses()).has_value(); }, "new losses");
    EXPECT_FALSE(mQueue.takeNewLosses()) << "they were taken";
    EXPECT_EQ(mQueue.getLosses(getHistoryTime()).mRefused.at("total-limit"), 5U);
    ZTCAgentQueue lNext(mPort, mSpool, mHistory, mDirectory.path("agent"), ZTSSessionSettings{}, nullptr);
    lNext.restoreLosses(*lText);
    EXPECT_EQ(lNext.getLosses(getHistoryTime()).mRefused.at("total-limit"), 5U);
}
