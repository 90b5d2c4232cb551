#include "sensor/collector/include/SpoolingConversation.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <future>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"

using testing::ElementsAre;
using testing::IsEmpty;

static const ZTCWireBytes scSuccess{0, 0, 0, 0, 0};
static const ZTCWireBytes scRefusedAsInvalid{1, 0, 6};
static const ZTCWireBytes scNothing{2, 0, 0, 0, 0};

/// A response with scope data that differs from others. Nobody decodes it here.
static ZTCWireBytes sScopeData(std::uint8_t aMark, std::size_t aSize = 20) {
    ZTCWireBytes lBody(aSize, aMark);
    lBody[0] = 2;
    return lBody;
}

class SpoolingConversationTest : public testing::Test {
protected:
    SpoolingConversationTest() {
        std::signal(SIGPIPE, SIG_IGN);
        std::filesystem::create_directory(mDirectory.path("agent"));
        mSpool.open();
        makeFifos(mDirectory.path("agent"));
        mKeepersEnd = openResponseFifo();
    }

    ZTCFileDescriptor openResponseFifo() const {
        return ZTCFileDescriptor::open((mDirectory.path("agent") + gcResponseFifoName).c_str(), O_RDONLY | O_NONBLOCK);
    }
    void startAgent(std::deque<ZTCFakeAgent::ZTCStep> aSteps) {
        mAgent = std::make_unique<ZTCFakeAgent>(mDirectory.path("agent"), std::move(aSteps));
    }
    /// A conversation as a new process makes it, with the `.part` that is there.
    void newCollector() {
        mTalk = std::make_unique<ZTCSpoolingConversation>(mSpool, mDirectory.path("agent"));
        std::uint64_t lNext = 1;
        std::optional<ZTSSpoolName> lPart;
        for (const ZTSSpoolEntry& lrEntry : mSpool.list()) {
            lNext = lrEntry.mName.mNumber + 1;
            if (lrEntry.mName.mState == ZTSPS_Part) {
                lPart = lrEntry.mName;
            }
        }
        mSpool.raiseNumber(lNext);
        mTalk->attach(openResponseFifo(), "ab", lPart);
    }
    void send(ZTERequest aRequest, const ZTCWireBytes& acrBody) {
        ASSERT_EQ(mTalk->request(aRequest, acrBody), ZTSND_Sent);
    }
    /// Until the answer to the request is there.
    ZTSRequestAnswer answer() {
        waitUntil(
            [this] {
                mTalk->advance(mProgress);
                return !mProgress.mAnswers.empty();
            },
            "an answer");
        const ZTSRequestAnswer lAnswer = mProgress.mAnswers.front();
        mProgress.mAnswers.clear();
        return lAnswer;
    }
    /// The bodies of the frames and torn files in the spool, in order.
    std::vector<ZTCWireBytes> bodies() const {
        std::vector<ZTCWireBytes> lBodies;
        for (const ZTSSpoolEntry& lrEntry : mSpool.list()) {
            if (lrEntry.mName.mState != ZTSPS_Part) {
                ZTCWireBytes lBytes = mSpool.read(lrEntry.mName);
                lBytes.erase(lBytes.begin(), lBytes.begin() + std::min<std::ptrdiff_t>(4, std::ssize(lBytes)));
                lBodies.push_back(lBytes);
            }
        }
        return lBodies;
    }
    std::vector<std::string> names() const {
        std::vector<std::string> lNames;
        for (const ZTSSpoolEntry& lrEntry : mSpool.list()) {
            lNames.push_back(lrEntry.mName.toText());
        }
        return lNames;
    }
    void waitForBytesInFifo(int aCount) const {
        waitUntil(
            [&] {
                int lCount = 0;
                return ioctl(mKeepersEnd.get(), FIONREAD, &lCount) == 0 && lCount >= aCount;
            },
            "bytes in the FIFO");
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSpool mSpool{mDirectory.path("spool")};
    ZTCFileDescriptor mKeepersEnd;
    std::unique_ptr<ZTCFakeAgent> mAgent;
    std::unique_ptr<ZTCSpoolingConversation> mTalk;
    ZTSProgress mProgress;
};

TEST_F(SpoolingConversationTest, ABeginThatFailsLeavesTheFifoForTheNextTry) {
    ZTCSpoolingConversation lTalk(mSpool, mDirectory.path("agent"));
    ZTCFileDescriptor lFifo = openResponseFifo();
    const ZTSSpoolName lMissing{.mNumber = 7, .mGeneration = "ab", .mState = ZTSPS_Part};
    EXPECT_THROW(lTalk.attach(std::move(lFifo), "ab", lMissing), ZTCSpoolTroubleEx);
    EXPECT_FALSE(lTalk.isAttached());
    // NOLINTNEXTLINE(bugprone-use-after-move): that it is still there is the promise.
    ASSERT_TRUE(lFifo.isOpen());
    lTalk.attach(std::move(lFifo), "ab");
    EXPECT_TRUE(lTalk.isAttached());
}

TEST_F(SpoolingConversationTest, ScopeDataBecomeAFrameAndOtherAnswersLeaveNoFile) {
    startAgent({ZTCFakeAgent::answering(scSuccess), ZTCFakeAgent::answering(sScopeData(1))});
    newCollector();
    EXPECT_TRUE(mTalk->isIdle());
    send(ZTRQ_Start, encodeStartScope(900));
    EXPECT_FALSE(mTalk->isIdle());
    EXPECT_EQ(answer().mOutcome, ZTRO_Success);
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_TRUE(mTalk->isIdle());
    send(ZTRQ_Get, encodeGetScopeData());
    EXPECT_THAT(names(), ElementsAre("2.ab.part"));
    EXPECT_EQ(answer().mRequest, ZTRQ_Get);
    EXPECT_THAT(names(), ElementsAre("2.ab.frame"));
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(1)));
    EXPECT_THAT(mProgress.mSpooled, ElementsAre(mSpool.list().front()));
}

TEST_F(SpoolingConversationTest, ARefusalHasItsStatus) {
    startAgent({ZTCFakeAgent::answering({1, 0, 9})});
    newCollector();
    send(ZTRQ_Start, encodeStartScope(900));
    const ZTSRequestAnswer lAnswer = answer();
    EXPECT_EQ(lAnswer.mOutcome, ZTRO_Failed);
    EXPECT_EQ(lAnswer.mStatus, ZTSAPS_NotAllowed);
}

TEST_F(SpoolingConversationTest, WithoutAnAgentNothingIsSentAndNoFileIsLeft) {
    newCollector();
    EXPECT_EQ(mTalk->request(ZTRQ_Get, encodeGetScopeData()), ZTSND_NoAgent);
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_TRUE(mTalk->isIdle());
}

TEST_F(SpoolingConversationTest, ARequestThatDoesNotFitOneWriteIsRefused) {
    startAgent({ZTCFakeAgent::answering(scSuccess)});
    newCollector();
    const std::vector<ZTSTargetPort> lMost(gcMaxTargetsPerSpooledRequest);
    send(ZTRQ_RegisterTargets, encodeRegisterTargets(lMost));
    answer();
    const std::vector<ZTSTargetPort> lTooMany(gcMaxTargetsPerSpooledRequest + 1);
    EXPECT_THROW(mTalk->request(ZTRQ_RegisterTargets, encodeRegisterTargets(lTooMany)), ZTCBadInputEx);
    EXPECT_TRUE(mTalk->isIdle());
}

TEST_F(SpoolingConversationTest, AnAnswerThatHasBegunIsCompletedByTheNextCollector) {
    const ZTCWireBytes lLarge = sScopeData(5, 2 << 20);
    std::promise<void> lGoOn;  // where the test ends early, it lets the agent go on, too
    startAgent({ZTCFakeAgent::answeringInHalves(lLarge, lGoOn.get_future().share())});
    newCollector();
    send(ZTRQ_Get, encodeGetScopeData());
    waitUntil(
        [&] {
            mTalk->advance(mProgress);
            return mProgress.mMoved >= lLarge.size() / 2;
        },
        "the first half of the answer");
    EXPECT_TRUE(mProgress.mAnswers.empty());
    newCollector();
    EXPECT_FALSE(mTalk->needsMarker());
    EXPECT_FALSE(mTalk->isIdle());
    lGoOn.set_value();
    EXPECT_EQ(answer().mRequest, ZTRQ_Unknown);
    ASSERT_EQ(bodies().size(), 1U);
    EXPECT_TRUE(bodies()[0] == lLarge);
}

TEST_F(SpoolingConversationTest, AnAnswerOfWhichNoByteWasTakenIsFoundBehindTheMarker) {
    startAgent({ZTCFakeAgent::answering(sScopeData(1)), ZTCFakeAgent::answering(scRefusedAsInvalid)});
    newCollector();
    send(ZTRQ_Get, encodeGetScopeData());
    newCollector();
    ASSERT_TRUE(mTalk->needsMarker());
    send(ZTRQ_Marker, encodeCollectionPeriod(0));
    EXPECT_FALSE(mTalk->needsMarker());
    EXPECT_EQ(answer().mStatus, ZTSAPS_Invalid);
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(1)));
    EXPECT_TRUE(mTalk->isIdle());
    EXPECT_EQ(mSpool.list().size(), 1U);
}

TEST_F(SpoolingConversationTest, ARequestThatWasNeverSentLeavesTheMarkerAlone) {
    startAgent({ZTCFakeAgent::answering(scRefusedAsInvalid)});
    mSpool.createPart(1, "ab", gcShortReserve);  // the collector died here
    newCollector();
    send(ZTRQ_Marker, encodeCollectionPeriod(0));
    answer();
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_EQ(mProgress.mLateAnswers, 0U);
}

TEST_F(SpoolingConversationTest, AMarkerThatCannotBeSentYetLeavesTheFileOfTheAnswerThatIsOwed) {
    const ZTCFileDescriptor lBusyAgent =
        ZTCFileDescriptor::open((mDirectory.path("agent") + gcCommandFifoName).c_str(), O_RDWR | O_NONBLOCK);
    const std::vector<char> lUnread(PIPE_BUF);
    while (write(lBusyAgent.get(), lUnread.data(), lUnread.size()) > 0) {
    }
    mSpool.createPart(1, "ab", gcShortReserve);
    newCollector();
    EXPECT_EQ(mTalk->request(ZTRQ_Marker, encodeCollectionPeriod(0)), ZTSND_NotNow);
    EXPECT_TRUE(mTalk->needsMarker());
    EXPECT_THAT(names(), ElementsAre("1.ab.part"));
}

TEST_F(SpoolingConversationTest, AnswersInFrontOfTheMarkersAreDroppedUnlessTheyAreScopeData) {
    startAgent({ZTCFakeAgent::answering(scSuccess), ZTCFakeAgent::answering(scRefusedAsInvalid)});
    newCollector();
    send(ZTRQ_Start, encodeStartScope(900));
    newCollector();
    send(ZTRQ_Marker, encodeCollectionPeriod(0));
    answer();
    EXPECT_EQ(mProgress.mLateAnswers, 1U);
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(SpoolingConversationTest, TwoCollectorsThatDieInARowLoseNothing) {
    startAgent({ZTCFakeAgent::answering(sScopeData(1)), ZTCFakeAgent::answering(scRefusedAsInvalid),
                ZTCFakeAgent::answering(scRefusedAsInvalid), ZTCFakeAgent::answering(sScopeData(2))});
    newCollector();
    send(ZTRQ_Get, encodeGetScopeData());
    newCollector();
    send(ZTRQ_Marker, encodeCollectionPeriod(0));
    newCollector();
    send(ZTRQ_Marker, encodeCollectionPeriod(0));
    answer();  // perhaps the first marker's
    send(ZTRQ_Get, encodeGetScopeData());
    answer();
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(1), sScopeData(2)));
    EXPECT_TRUE(mTalk->isIdle());
}

TEST_F(SpoolingConversationTest, AFrameThatNobodyAskedForIsKept) {
    startAgent({[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        arAgent.sendFrame(scSuccess);
        arAgent.sendFrame(sScopeData(7));
        arAgent.sendFrame(scSuccess);
    }});
    newCollector();
    send(ZTRQ_Stop, encodeStop());
    answer();
    waitUntil(
        [this] {
            mTalk->advance(mProgress);
            return mProgress.mLateAnswers == 2;
        },
        "the frames that nobody asked for");
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(7)));
    EXPECT_TRUE(mTalk->isIdle());
}

TEST_F(SpoolingConversationTest, AnEndedAgentsFifoIsEmptiedToItsEnd) {
    startAgent({[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        arAgent.sendFrame(sScopeData(1));
        arAgent.sendFrame(sScopeData(2));
        arAgent.sendRaw({0, 0, 0, 9, 2, 3});
        arAgent.die();
    }});
    newCollector();
    send(ZTRQ_Get, encodeGetScopeData());
    waitForBytesInFifo(54);
    waitUntil([this] { return mTalk->drain(mProgress); }, "the FIFO's end");
    EXPECT_THAT(names(), ElementsAre("1.ab.frame", "2.ab.frame", "3.ab.torn"));
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(1), sScopeData(2), ZTCWireBytes{2, 3}));
    EXPECT_FALSE(mTalk->isAttached());
}

TEST_F(SpoolingConversationTest, AnAgentThatEndedBeforeItOpenedTheFifoLeavesNothing) {
    newCollector();
    EXPECT_TRUE(mTalk->drain(mProgress));
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(SpoolingConversationTest, AFifoWithAWriterIsNotAtItsEnd) {
    startAgent({ZTCFakeAgent::answering(scSuccess)});
    newCollector();
    send(ZTRQ_Stop, encodeStop());
    answer();
    EXPECT_FALSE(mTalk->drain(mProgress));
    mAgent.reset();
    EXPECT_TRUE(mTalk->drain(mProgress));
}

class SpoolingOnAFullDiskTest : public SpoolingConversationTest {
protected:
    void SetUp() override {
        if (!mFileSystem.isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
        mSpool.open();
    }

    ZTCSmallFileSystem mFileSystem{mDirectory.path("spool"), 10 << 10};
};

TEST_F(SpoolingOnAFullDiskTest, NothingIsAskedWithoutRoomAndCollectingGoesOnWhenThereIsRoomAgain) {
    startAgent({ZTCFakeAgent::answering(sScopeData(1))});
    newCollector();
    mFileSystem.fill();
    EXPECT_THROW(mTalk->request(ZTRQ_Get, encodeGetScopeData()), ZTCSpoolTroubleEx);
    EXPECT_THAT(mAgent->getRequests(), IsEmpty());
    EXPECT_TRUE(mTalk->isIdle());
    mFileSystem.empty();
    send(ZTRQ_Get, encodeGetScopeData());
    answer();
    EXPECT_THAT(bodies(), ElementsAre(sScopeData(1)));
}

TEST_F(SpoolingOnAFullDiskTest, AFrameThatNeedsMoreThanThereIsWaitsInTheFifo) {
    const ZTCWireBytes lLarge = sScopeData(3, 300000);
    startAgent({ZTCFakeAgent::answering(scSuccess), ZTCFakeAgent::answering(lLarge)});
    newCollector();
    send(ZTRQ_Stop, encodeStop());
    answer();
    mTalk->request(ZTRQ_Stop, encodeStop());  // the agent answers with scope data, which this has no room for
    mFileSystem.fill();
    waitUntil(
        [this] {
            try {
                mTalk->advance(mProgress);
                return false;
            } catch (const ZTCSpoolTroubleEx&) {
                return true;
            }
        },
        "a full disk");
    mFileSystem.empty();
    waitUntil(
        [this] {
            mTalk->advance(mProgress);
            return !mProgress.mSpooled.empty();
        },
        "the frame");
    ASSERT_EQ(bodies().size(), 1U);
    EXPECT_TRUE(bodies()[0] == lLarge);
}
