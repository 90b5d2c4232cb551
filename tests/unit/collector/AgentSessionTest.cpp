#include "sensor/collector/include/AgentSession.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <filesystem>
#include <mutex>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/link/include/Link.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/SmallFileSystem.h"
#include "tests/support/StatusPageFile.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/collector/NotingHistory.h"

using std::chrono::milliseconds;
using std::chrono::seconds;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

static const ZTCWireBytes scSuccess{0, 0, 0, 0, 0};
static const ZTCWireBytes scScopeData{2, 0, 0, 0, 0};
static constexpr int scKilled = SIGKILL;  // as waitpid() gives it

class AgentSessionTest : public testing::Test {
protected:
    AgentSessionTest() {
        std::signal(SIGPIPE, SIG_IGN);
        std::filesystem::create_directory(mDirectory.path("agent"));
        mSpool.open();
        makeFifos(mDirectory.path("agent"));
        // Something is held, unless a test says otherwise.
        mPage.header().mHeldRecords = 1;
    }

    /// An agent that answers each command as it should; the script is what get scope data answers.
    void startAgent(ZTCFakeAgent::ZTCStep aGet = ZTCFakeAgent::answering(scScopeData)) {
        mAgent = std::make_unique<ZTCFakeAgent>(
            mDirectory.path("agent"),
            std::deque<ZTCFakeAgent::ZTCStep>{[aGet](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                if (acrRequest[0] == ZTSTVKC_GetScopeData) {
                    aGet(arAgent, acrRequest);
                } else if (acrRequest[0] == ZTSTVKC_CollectionPeriod) {
                    arAgent.sendFrame({ZTRO_Failed, 0, ZTSAPS_Invalid});
                } else {
                    arAgent.sendFrame(scSuccess);
                }
            }});
    }
    void startSession(const std::string& acrPage = "agent/page.1") {
        ZTSAgentStart lStart;
        lStart.mStart = 1;
        lStart.mPid = 4711;
        lStart.mPagePath = mDirectory.path(acrPage);
        lStart.mResponseFifo =
            ZTCFileDescriptor::open((mDirectory.path("agent") + gcResponseFifoName).c_str(), O_RDONLY | O_NONBLOCK);
        lStart.mBell = ZTCFileDescriptor(eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC));
        mpBell = lStart.mBell.get();
        mSession = std::make_unique<ZTCAgentSession>(std::move(lStart), mSpool, mHistory, mDirectory.path("agent"),
                                                     ZTSSessionSettings{}, now());
    }
    ZTCAgentSession::ZTCTime now() const { return std::chrono::steady_clock::now() + mAhead; }
    /// Steps until the condition holds.
    void stepUntil(const std::function<bool()>& acrCondition, const std::string& acrWhat) {
        waitUntil(
            [&] {
                mSession->step(now());
                collectEvents();
                return acrCondition();
            },
            acrWhat);
    }
    void collectEvents() {
        const ZTSSessionEvents lEvents = mSession->takeEvents();
        mLines.insert(mLines.end(), lEvents.mLines.begin(), lEvents.mLines.end());
        mIsSilent |= lEvents.mIsSilent;
        mStartsAnswered += lEvents.mIsStartAnswered ? 1 : 0;
        mLooks += lEvents.mLooks;
    }
    void stepUntilFrames(std::size_t aCount) {
        stepUntil([&] { return mHistory.mFiles.size() >= aCount; }, "frames");
    }
    /// First byte of each request.
    std::vector<int> commands() const {
        std::vector<int> lCommands;
        for (const ZTCWireBytes& lrRequest : mAgent->getRequests()) {
            lCommands.push_back(lrRequest.at(0));
        }
        return lCommands;
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCSpool mSpool{mDirectory.path("spool")};
    ZTCNotingHistory mHistory;
    ZTCStatusPageFile mPage{
        (std::filesystem::create_directories(mDirectory.path("agent")), mDirectory.path("agent/page.1")), 1};
    std::unique_ptr<ZTCFakeAgent> mAgent;
    std::unique_ptr<ZTCAgentSession> mSession;
    int mpBell = -1;
    seconds mAhead{0};
    std::vector<std::string> mLines;
    bool mIsSilent = false;
    int mStartsAnswered = 0;
    std::uint64_t mLooks = 0;
};

TEST_F(AgentSessionTest, TargetsAreRegisteredBeforeTheStartCommandAndThenItAsksAtOnce) {
    startAgent();
    startSession();
    mSession->offerTargets({{.mNodeName = {}, .mPortName = {}, .mFcId = 7}}, now());
    stepUntilFrames(1);
    EXPECT_THAT(commands(), ElementsAre(ZTSTVKC_RegisterTargets, ZTSTVKC_StartScope, ZTSTVKC_GetScopeData));
    EXPECT_EQ(mStartsAnswered, 1);
    EXPECT_EQ(mSession->countTargets(), 1U);
    EXPECT_EQ(mAgent->getRequests()[1], encodeStartScope(900));
}

TEST_F(AgentSessionTest, ManyTargetsGoInSeveralRequestsAndNoneGoesTwice) {
    startAgent();
    startSession();
    std::vector<ZTSTargetPort> lTargets(2 * gcMaxTargetsPerSpooledRequest + 1);
    for (std::size_t i = 0; i < lTargets.size(); ++i) {
        lTargets[i].mFcId = static_cast<std::uint32_t>(i);
    }
    mSession->offerTargets(lTargets, now());
    stepUntilFrames(1);
    mSession->offerTargets(lTargets, now());
    lTargets.push_back({.mNodeName = {}, .mPortName = {}, .mFcId = 0xFFFFFF});
    mSession->offerTargets(lTargets, now());
    stepUntil([&] { return mSession->countTargets() == lTargets.size(); }, "the new target");
    EXPECT_THAT(commands(), ElementsAre(ZTSTVKC_RegisterTargets, ZTSTVKC_RegisterTargets, ZTSTVKC_RegisterTargets,
                                        ZTSTVKC_StartScope, ZTSTVKC_GetScopeData, ZTSTVKC_RegisterTargets));
    EXPECT_EQ(mAgent->getRequests().back(), encodeRegisterTargets({{lTargets.back()}}));
}

TEST_F(AgentSessionTest, WhereThePageShowsNothingHeldItLooksAndDoesNotAsk) {
    mPage.header().mHeldRecords = 0;
    startAgent();
    startSession();
    stepUntilFrames(1);
    const std::uint64_t lLooks = mLooks;
    mAhead += seconds(5);
    stepUntil([&] { return mLooks > lLooks; }, "a look");
    EXPECT_EQ(commands().size(), 2U);
    EXPECT_TRUE(mSession->getNextStep() > now() + seconds(4));
    mPage.header().mHeldRecords = 3;
    mAhead += seconds(5);
    stepUntilFrames(2);
}

TEST_F(AgentSessionTest, ABellIsAnsweredAtOnce) {
    startAgent();
    startSession();
    stepUntilFrames(1);
    const std::uint64_t lOne = 1;
    ASSERT_EQ(write(mpBell, &lOne, sizeof(lOne)), 8);
    mSession->noteBell(now());
    EXPECT_LE(mSession->getNextStep(), now());
    stepUntilFrames(2);
    std::uint64_t lLeft = 0;
    EXPECT_EQ(read(mpBell, &lLeft, sizeof(lLeft)), -1) << "the bell is still ringing";
}

TEST_F(AgentSessionTest, AnAgentThatIsStartingIsWaitedFor) {
    startSession();
    mSession->step(now());
    mSession->step(now());
    EXPECT_THAT(mSpool.list(), IsEmpty());
    startAgent();
    stepUntilFrames(1);
}

TEST_F(AgentSessionTest, SixtySecondsWithoutAByteAreSilence) {
    startAgent(ZTCFakeAgent::silent());
    startSession();
    stepUntil([this] { return mSession->getLastAsked().has_value(); }, "the request");
    mAhead += seconds(59);
    mSession->step(now());
    collectEvents();
    EXPECT_FALSE(mIsSilent);
    EXPECT_LE(mSession->getNextStep(), now() + seconds(2));
    mAhead += seconds(2);
    mSession->step(now());
    collectEvents();
    EXPECT_TRUE(mIsSilent);
    EXPECT_THAT(mLines.back(), HasSubstr("no byte of its answer to \"get scope data\" for 60 s"));
    EXPECT_GT(mSession->getNextStep(), now()) << "it is not said again at once";
}

TEST_F(AgentSessionTest, AStartThatRefusesSomeKindIsAStartForTheOthers) {
    mAgent = std::make_unique<ZTCFakeAgent>(
        mDirectory.path("agent"),
        std::deque<ZTCFakeAgent::ZTCStep>{ZTCFakeAgent::answering({ZTRO_Failed, 0, ZTSAPS_NotAllowed}),
                                          ZTCFakeAgent::answering(scScopeData)});
    startSession();
    stepUntilFrames(1);
    EXPECT_EQ(mStartsAnswered, 1);
    EXPECT_THAT(commands(), ElementsAre(ZTSTVKC_StartScope, ZTSTVKC_GetScopeData));
    EXPECT_THAT(mLines, ElementsAre(HasSubstr("answered \"start\" with status ")));
}

TEST_F(AgentSessionTest, AFurtherStartCommandSetsANewRecordLimit) {
    startAgent();
    startSession();
    stepUntilFrames(1);
    mSession->setSettings({.mPeriod = seconds(5), .mRecordLimit = 500}, now());
    stepUntil([this] { return mStartsAnswered == 2; }, "a second start");
    const std::vector<ZTCWireBytes> lRequests = mAgent->getRequests();
    EXPECT_THAT(lRequests, testing::Contains(encodeStartScope(500)));
}

TEST_F(AgentSessionTest, AStopAsksUntilNothingIsHeldAndThenShutsDown) {
    startAgent([this](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        mPage.header().mHeldRecords = mPage.header().mHeldRecords - 1;
        arAgent.sendFrame(scScopeData);
    });
    mPage.header().mHeldRecords = 3;
    startSession();
    stepUntilFrames(1);
    mSession->requestStop(now(), seconds(8));
    stepUntil([this] { return commands().size() > 3; }, "the first retrieval of the stop");
    mSession->requestStop(now(), seconds(8));  // asked again, it goes on
    stepUntil([this] { return commands().back() == ZTSTVKC_ShutDown; }, "the shut-down");
    EXPECT_THAT(commands(), ElementsAre(ZTSTVKC_StartScope, ZTSTVKC_GetScopeData, ZTSTVKC_Stop, ZTSTVKC_GetScopeData,
                                        ZTSTVKC_GetScopeData, ZTSTVKC_ShutDown));
}

TEST_F(AgentSessionTest, AKilledAgentsRestIsTornAndItsPageGoesToTheHistory) {
    mPage.header().mStartTime = 1000000;
    mPage.header().mLastRetrieval = 5000000;
    std::atomic<bool> lHasWritten{false};
    startAgent([&lHasWritten](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
        arAgent.sendRaw({0, 0, 1, 0, 2, 7});
        lHasWritten = true;
        arAgent.die();
    });
    startSession();
    stepUntil([&] { return lHasWritten.load(); }, "the begin of the answer");
    mAgent.reset();
    mSession->noteEnded(scKilled, now());
    stepUntil([this] { return mSession->isDrained(); }, "the FIFO's end");
    ASSERT_EQ(mHistory.mFiles.size(), 1U);
    EXPECT_THAT(mHistory.mFiles[0], HasSubstr(".torn"));
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_TRUE(mHistory.mEnded[0].mIsVanished);
    EXPECT_EQ(mHistory.mEnded[0].mReason, "the agent was killed by signal 9");
    EXPECT_EQ(mHistory.mEnded[0].mPagePath, mDirectory.path("agent/page.1"));
    EXPECT_EQ(toMicroseconds(mHistory.mEnded[0].mFrom), 5000000);
    EXPECT_EQ(mHistory.mEnded[0].mGeneration, mSession->getGeneration());
}

TEST_F(AgentSessionTest, AnOrderlyEndIsNoGapOfItself) {
    mPage.header().mEndReason = ZTSE_ShutDown;
    mPage.header().mEndTime = 9000000;
    startSession();
    mSession->noteEnded(0, now());
    stepUntil([this] { return mSession->isDrained(); }, "the FIFO's end");
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_FALSE(mHistory.mEnded[0].mIsVanished);
    EXPECT_EQ(mHistory.mEnded[0].mReason, "the agent ended: shut-down");
    EXPECT_EQ(toMicroseconds(mHistory.mEnded[0].mTo), 9000000);
    EXPECT_THAT(mSpool.list(), IsEmpty());
}

TEST_F(AgentSessionTest, AnAgentThatEndedBeforeItHadAPageHasLostNothing) {
    startSession("agent/no-page");
    mSession->noteEnded(1 << 8, now());
    stepUntil([this] { return mSession->isDrained(); }, "the FIFO's end");
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_FALSE(mHistory.mEnded[0].mIsVanished);
}

TEST_F(AgentSessionTest, AnAgentThatWasKilledBeforeItHadAPageIsAGapFromItsStartOn) {
    const ZTCHistoryTime lBefore = getHistoryTime();
    startSession("agent/no-page");
    mSession->noteEnded(scKilled, now());
    stepUntil([this] { return mSession->isDrained(); }, "the FIFO's end");
    ASSERT_EQ(mHistory.mEnded.size(), 1U);
    EXPECT_TRUE(mHistory.mEnded[0].mIsVanished);
    EXPECT_GE(mHistory.mEnded[0].mFrom, lBefore);
    EXPECT_LT(mHistory.mEnded[0].mFrom, mHistory.mEnded[0].mTo);
}

TEST_F(AgentSessionTest, AnAgentWithoutAPageIsAskedEveryPeriod) {
    startAgent();
    startSession("agent/no-page");
    mSession->step(now());
    EXPECT_TRUE(mSession->getGeneration().empty());
    mAhead += seconds(11);
    stepUntilFrames(1);
    EXPECT_FALSE(mSession->getGeneration().empty());
    EXPECT_EQ(mSession->getPage(), nullptr);
    mAhead += seconds(5);
    stepUntilFrames(2);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(AgentSessionTest, AnAgentWhosePageCannotBeOpenedForWantOfDescriptorsIsNotTakenForOneWithoutAPage) {
    startAgent();
    startSession();
    {
        const ZTCResourceLimit lNoMore(RLIMIT_NOFILE, 0);
        mSession->step(now());
        mAhead += seconds(60);
        mSession->step(now());
        mSession->step(now());
        collectEvents();
    }
    EXPECT_TRUE(mSession->getGeneration().empty());
    EXPECT_THAT(mLines,
                ElementsAre(HasSubstr("page.1': cannot be opened: Too many open files: the agent is not asked")));
    mAhead += seconds(2);
    stepUntilFrames(1);
    EXPECT_NE(mSession->getPage(), nullptr);
}
#endif

TEST_F(AgentSessionTest, ThePartsOfOlderAgentsAreTornWhenTheNextOneComes) {
    ZTSSpoolPart lOld = mSpool.createPart(5, "abc", 10);
    ASSERT_EQ(write(lOld.mFile.get(), "\0\0\0\x09x", 5), 5);
    mSpool.createPart(6, "abd", 10);  // not a byte came
    startAgent();
    startSession();
    stepUntilFrames(2);
    EXPECT_EQ(mHistory.mFiles[0], "5.abc.torn");
    EXPECT_EQ(mHistory.mFiles[1], "8." + mSession->getGeneration() + ".frame");
}

class AgentSessionOnAFullDiskTest : public AgentSessionTest {
protected:
    void SetUp() override {
        if (!mFileSystem.isMounted()) {
            GTEST_SKIP() << "no file system can be mounted here";
        }
        mSpool.open();
    }
    ZTCSmallFileSystem mFileSystem{mDirectory.path("spool"), 10 << 10};
};

TEST_F(AgentSessionOnAFullDiskTest, NothingIsAskedAndCollectingGoesOnByItself) {
    startAgent();
    startSession();
    stepUntilFrames(1);
    mSpool.remove(*parseSpoolName(mHistory.mFiles[0]));
    mFileSystem.fill();
    mAhead += seconds(5);
    stepUntil([this] { return !mSession->getDiskProblem().empty(); }, "the full disk");
    EXPECT_EQ(mSession->getDiskErrno(), ENOSPC);
    const std::size_t lRequests = commands().size();
    mAhead += seconds(120);
    mSession->step(now());
    collectEvents();
    EXPECT_FALSE(mIsSilent) << "the agent is not to blame";
    EXPECT_EQ(commands().size(), lRequests);
    EXPECT_EQ(std::ranges::count_if(mLines, [](const std::string& acrLine) { return acrLine.find("no room") == 0; }),
              1);
    mFileSystem.empty();
    mAhead += seconds(2);
    stepUntilFrames(2);
    EXPECT_THAT(mSession->getDiskProblem(), IsEmpty());
    EXPECT_THAT(mLines.back(), HasSubstr("collecting goes on"));
}

TEST_F(AgentSessionOnAFullDiskTest, AStopThatFindsNoRoomGivesUpWhatIsHeldInTheEnd) {
    startAgent();
    startSession();
    stepUntilFrames(1);
    mSession->requestStop(now(), seconds(8));
    stepUntil([this] { return commands().back() == ZTSTVKC_GetScopeData && commands().size() > 3; }, "the stop");
    mFileSystem.fill();
    stepUntil([this] { return !mSession->getDiskProblem().empty(); }, "the full disk");
    mFileSystem.empty();
    // Room for an answer of a few bytes, not for a response.
    ZTSSpoolPart lTaken = mSpool.createPart(1000, "ff", 5 << 20);
    mAhead += seconds(9);
    stepUntil([this] { return commands().back() == ZTSTVKC_ShutDown; }, "the shut-down");
    mSpool.discard(lTaken);
}
