#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <filesystem>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/collector/include/SpoolRecovery.h"
#include "sensor/collector/include/SpoolingConversation.h"
#include "tests/support/Seed.h"
#include "tests/support/SystemCallKiller.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"

// A process that retrieves from an agent is killed at each of its system calls. The next one has to end up with every
// response that the agent has sent, each exactly once and in order.

class SpoolKillTest : public testing::Test {
protected:
    SpoolKillTest() {
        std::signal(SIGPIPE, SIG_IGN);
        std::filesystem::create_directory(mDirectory.path("agent"));
        makeFifos(mDirectory.path("agent"));
        // As the keeper does, this process holds a read end all the time.
        mKeepersEnd =
            ZTCFileDescriptor::open((mDirectory.path("agent") + gcResponseFifoName).c_str(), O_RDONLY | O_NONBLOCK);
    }

    /// The n-th response to get scope data: its bytes can be told from those of the others.
    static ZTCWireBytes scopeData(std::uint64_t aNumber, std::size_t aSize) {
        ZTCWireBytes lBody(aSize);
        for (std::size_t i = 0; i < aSize; ++i) {
            lBody[i] = static_cast<std::uint8_t>(aNumber * 31 + i * 7 + i / 256);
        }
        lBody[0] = ZTRO_ScopeData;
        return lBody;
    }

    void startAgent(std::size_t aResponseSize) {
        mResponseSize = aResponseSize;
        mAgent = std::make_unique<ZTCFakeAgent>(
            mDirectory.path("agent"),
            std::deque<ZTCFakeAgent::ZTCStep>{[this](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                if (acrRequest[0] == ZTSTVKC_GetScopeData) {
                    arAgent.sendFrame(scopeData(++mSent, mResponseSize));
                } else {
                    arAgent.sendFrame({ZTRO_Failed, 0, ZTSAPS_Invalid});
                }
            }});
    }

    static void untilAnswered(ZTCSpoolingConversation& arTalk) {
        ZTSProgress lProgress;
        arTalk.advance(lProgress);
        while (lProgress.mAnswers.empty()) {
            pollfd lFd{.fd = arTalk.getResponseFifo(), .events = POLLIN, .revents = 0};
            poll(&lFd, 1, 20);
            arTalk.advance(lProgress);
        }
    }

    /// The whole life of a collector that asks once.
    int collect() const {
        ZTCSpool lSpool(mDirectory.path("spool"));
        lSpool.open();
        const std::vector<ZTSSpoolEntry> lFound = lSpool.list();
        const ZTSSpoolPlan lPlan = planSpoolRecovery(lFound, "ab");
        ZTCSpoolingConversation lTalk(lSpool, mDirectory.path("agent"));
        lSpool.raiseNumber(lPlan.mNextNumber);
        std::optional<ZTSSpoolName> lPart;
        if (lPlan.mResume) {
            lPart = lPlan.mResume->mName;
        }
        lTalk.attach(ZTCFileDescriptor(fcntl(mKeepersEnd.get(), F_DUPFD_CLOEXEC, 3)), "ab", lPart);
        if (lTalk.needsMarker()) {
            lTalk.request(ZTRQ_Marker, encodeCollectionPeriod(0));
        }
        if (!lTalk.isIdle()) {
            untilAnswered(lTalk);
        }
        if (lTalk.request(ZTRQ_Get, encodeGetScopeData()) != ZTSND_Sent) {
            return 1;
        }
        untilAnswered(lTalk);
        return lPlan.mTear.empty() ? 0 : 2;
    }

    /// Runs it again without a kill, takes what may still come, and looks at what all runs together have got.
    void expectEveryResponseOnce() {
        ASSERT_EQ(collect(), 0);
        ZTCSpool lSpool(mDirectory.path("spool"));
        ZTCSpoolingConversation lTalk(lSpool, mDirectory.path("agent"));
        lSpool.raiseNumber(planSpoolRecovery(lSpool.list(), "ab").mNextNumber);
        lTalk.attach(ZTCFileDescriptor(fcntl(mKeepersEnd.get(), F_DUPFD_CLOEXEC, 3)), "ab");
        waitUntil(
            [&] {
                ZTSProgress lProgress;
                lTalk.advance(lProgress);
                return lTalk.isIdle() && mTaken + lSpool.list().size() >= mSent.load();
            },
            "all that the agent has sent");
        for (const ZTSSpoolEntry& lrEntry : lSpool.list()) {
            ASSERT_EQ(lrEntry.mName.mState, ZTSPS_Frame) << lrEntry.mName.toText();
            const std::vector<std::uint8_t> lBytes = lSpool.read(lrEntry.mName);
            const ZTSSpooledBody lBody = readSpooledBody(lBytes);
            ASSERT_TRUE(lBody.isWhole());
            ASSERT_TRUE(std::ranges::equal(lBody.mBody, scopeData(++mTaken, mResponseSize)))
                << "response " << mTaken << " in " << lrEntry.mName.toText();
            lSpool.remove(lrEntry.mName);
        }
        ASSERT_EQ(mTaken, mSent.load());
    }

    ZTSKilledRun collectAndKill(unsigned aStop) const {
        return killAtSystemCall(aStop, [this] { return collect(); });
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCFileDescriptor mKeepersEnd;
    std::size_t mResponseSize = 0;
    std::atomic<std::uint64_t> mSent{0};
    std::uint64_t mTaken = 0;
    std::unique_ptr<ZTCFakeAgent> mAgent;
};

TEST_F(SpoolKillTest, KilledAtEachSystemCallNothingIsLostAndNothingComesTwice) {
    startAgent(500);
    unsigned lStop = 1;
    for (;; ++lStop) {
        const ZTSKilledRun lRun = collectAndKill(lStop);
        if (!lRun.mIsTraced) {
            GTEST_SKIP() << "processes cannot be traced here";
        }
        if (!lRun.mIsKilled) {
            EXPECT_EQ(lRun.mStatus, 0);
            break;
        }
        SCOPED_TRACE("killed at stop " + std::to_string(lStop));
        ASSERT_NO_FATAL_FAILURE(expectEveryResponseOnce());
    }
    EXPECT_GT(lStop, 30U) << "too few to have reached the response";
}

TEST_F(SpoolKillTest, KilledInTheMiddleOfAResponseOfTwoMegabytesTheResponseIsComplete) {
    startAgent(2 << 20);
    ZTCTestSeed lSeed;
    for (int i = 0; i < 12; ++i) {
        const unsigned lStop = 40 + lSeed.below(60);
        SCOPED_TRACE("killed at stop " + std::to_string(lStop));
        if (!collectAndKill(lStop).mIsTraced) {
            GTEST_SKIP() << "processes cannot be traced here";
        }
        ASSERT_NO_FATAL_FAILURE(expectEveryResponseOnce());
    }
}

TEST_F(SpoolKillTest, SeveralThatAreKilledInARowLoseNothing) {
    startAgent(500);
    ZTCTestSeed lSeed;
    for (int i = 0; i < 60; ++i) {
        for (unsigned lKills = 2 + lSeed.below(3); lKills > 0; --lKills) {
            if (!collectAndKill(1 + lSeed.below(90)).mIsTraced) {
                GTEST_SKIP() << "processes cannot be traced here";
            }
        }
        ASSERT_NO_FATAL_FAILURE(expectEveryResponseOnce());
    }
}
