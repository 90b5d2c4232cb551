#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/Seed.h"
#include "tests/support/TestThreads.h"
#include "tests/system/AdapterEvents.h"

// SIGKILL at a random moment under load: every line that was logged is there, and the next start works. ZT_KILL_RUNS is
// the number of kills; scripts/check-kills runs many.

static unsigned sRuns() {
    const char* const lpRuns = std::getenv("ZT_KILL_RUNS");
    return lpRuns != nullptr ? static_cast<unsigned>(std::strtoul(lpRuns, nullptr, 10)) : 10;
}

enum class ZTEKillPhase { Start, Load, Stop };

/// What was known to have happened when the agent was killed.
struct ZTSAcknowledged {
    std::size_t mEvents = 0;  ///< temperature events whose callback had returned
    std::size_t mStops = 0;   ///< stop commands that were answered
};

class ZTCKills {
public:
    explicit ZTCKills(ZTCTestSeed& arSeed) : mrSeed(arSeed), mAgent(2) {}

    void run() {
        const ZTEKillPhase lPhases[] = {ZTEKillPhase::Start, ZTEKillPhase::Load, ZTEKillPhase::Load,
                                        ZTEKillPhase::Stop};
        const ZTEKillPhase lPhase = lPhases[mrSeed.below(4)];
        std::filesystem::remove(mAgent.agentLogPath());
        mAgent.start();
        ZTSAcknowledged lAcknowledged;
        if (lPhase == ZTEKillPhase::Start) {
            killWithin(60, [this](const ZTCTestThread& acrKiller) { comeAsASensor(acrKiller); });
        } else {
            mAgent.pipes().open();
            EXPECT_TRUE(mAgent.ping());
            if (lPhase == ZTEKillPhase::Load) {
                killWithin(150, [&](const ZTCTestThread&) { load(lAcknowledged, 1u << 30); });
            } else {
                load(lAcknowledged, 3);
                killWithin(8, [this](const ZTCTestThread&) { askToStop(); });
            }
        }
        ++mPhases[static_cast<std::size_t>(lPhase)];
        const std::string lLog = readFile(mAgent.agentLogPath());
        expectLinesThere(lLog, lAcknowledged);
        expectNextStartServed(lLog);
    }

    std::string summary() const {
        return std::to_string(mPhases[0] + mPhases[1] + mPhases[2]) + " agents killed: " + std::to_string(mPhases[0]) +
               " while starting, " + std::to_string(mPhases[1]) + " under load, " + std::to_string(mPhases[2]) +
               " while stopping (" + std::to_string(mEarlyEnds) + " of them had ended); " + std::to_string(mLines) +
               " log lines, those of " + std::to_string(mEvents) + " acknowledged events among them, whole; " +
               std::to_string(mCutLines) + " cut while they were being written; every next start was served";
    }

private:
    /// Does this, and kills the agent at a random moment meanwhile; what fails for that reason does not count. The
    /// action gets the thread that kills, which runs until then.
    template <typename Action>
    void killWithin(unsigned aMilliseconds, Action aAction) {
        const ZTCDeadline lMoment(std::chrono::milliseconds(mrSeed.below(aMilliseconds)));
        ZTCTestThread lKiller([&] {
            waitUntil([&] { return lMoment.isOver(); }, "the moment of the kill", ZTCDeadline(2 * gcTestPatience));
            mAgent.process().sendSignal(SIGKILL);
        });
        try {
            aAction(lKiller);
        } catch (const std::runtime_error&) {
            // The agent is gone: of the pipes, of the library's socket.
        }
        lKiller.join();
        const int lStatus = mAgent.waitForExit();
        EXPECT_TRUE(lStatus == 1000 + SIGKILL || lStatus == 0) << lStatus;
        mEarlyEnds += lStatus == 0 ? 1 : 0;
    }

    void comeAsASensor(const ZTCTestThread& acrKiller) {
        waitUntil([&] { return !acrKiller.isRunning() || isFifo(mAgent.responseFifoPath()); },
                  "the response FIFO or the kill");
        if (acrKiller.isRunning()) {
            mAgent.pipes().openResponse();
        }
    }

    void load(ZTSAcknowledged& arAcknowledged, unsigned aRounds) {
        mAgent.startScope();
        std::vector<ZTSLibraryEvent> lEvents;
        for (const ZTSDataKind& lcrKind : dataKinds()) {
            lEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
        }
        mAgent.library().startStorm(2, 0, lEvents);
        for (unsigned i = 0; i < aRounds; ++i) {
            mAgent.library().deliver(ZTSLibraryEvent::temperature(1));
            ++arAcknowledged.mEvents;
            mAgent.retrieve();
            if (mAgent.request(gcStopScopeHex) == gcSuccessHex) {
                ++arAcknowledged.mStops;
            }
            mAgent.startScope();
        }
    }

    void askToStop() {
        if (mrSeed.below(2) == 0) {
            mAgent.process().sendSignal(SIGTERM);
        } else {
            mAgent.request(gcShutDownHex);
        }
    }

    void expectLinesThere(const std::string& acrLog, const ZTSAcknowledged& acrAcknowledged) {
        // The kernel may cut the line that was being written, at the end of a page. No call had returned from it yet.
        mCutLines += acrLog.empty() || acrLog.ends_with('\n') ? 0 : 1;
        const std::vector<ZTSLogLine> lLines = parseLogLines(acrLog);
        EXPECT_EQ(lLines.size(), static_cast<std::size_t>(std::count(acrLog.begin(), acrLog.end(), '\n')));
        const auto lCount = [&lLines](const char* apFunction, const char* apText) {
            return static_cast<std::size_t>(std::count_if(lLines.begin(), lLines.end(), [&](const ZTSLogLine& acrLine) {
                return acrLine.mFunction == apFunction && acrLine.mText == apText;
            }));
        };
        EXPECT_GE(lCount("ScopeCb_KpmTemp", "Invoking TEMPERATURE callback with boardId: 1"), acrAcknowledged.mEvents);
        EXPECT_GE(lCount("ScopeCb_KpmTemp", "Left"), acrAcknowledged.mEvents);
        EXPECT_GE(lCount("handleStopCommand", "Stopping Scope Data Collection."), acrAcknowledged.mStops);
        mLines += lLines.size();
        mEvents += acrAcknowledged.mEvents;
    }

    void expectNextStartServed(const std::string& acrLog) {
        mAgent.pipes().close();
        mAgent.startAndConnectQuietly(63);
        EXPECT_EQ(mAgent.stop(), 0);
        EXPECT_FALSE(exists(mAgent.commandFifoPath()));
        EXPECT_FALSE(exists(mAgent.responseFifoPath()));
        EXPECT_FALSE(exists(mAgent.pidFilePath()));
        const std::string lBoth = readFile(mAgent.agentLogPath());
        EXPECT_TRUE(lBoth.starts_with(acrLog)) << "the next start took lines away";
        const bool lIsCut = !acrLog.empty() && !acrLog.ends_with('\n');
        EXPECT_EQ(lBoth[acrLog.size()] == '\n', lIsCut) << "the next start does not begin on a line of its own";
        mAgent.pipes().close();
    }

    ZTCTestSeed& mrSeed;
    ZTCAgentProcess mAgent;
    std::array<unsigned, 3> mPhases{};
    unsigned mEarlyEnds = 0;
    std::size_t mLines = 0;
    std::size_t mEvents = 0;
    unsigned mCutLines = 0;
};

TEST(Kill, AnAgentKilledAtAnyMomentHasLostNoLineAndTheNextStartIsServed) {
    ZTCTestSeed lSeed;
    ZTCKills lKills(lSeed);
    const unsigned lRuns = sRuns();
    ASSERT_GT(lRuns, 0u) << "ZT_KILL_RUNS is no number above 0";
    for (unsigned lRun = 1; lRun <= lRuns; ++lRun) {
        SCOPED_TRACE("kill " + std::to_string(lRun) + " of " + std::to_string(lRuns));
        lKills.run();
        ASSERT_FALSE(HasFailure());
    }
    std::cout << lKills.summary() << "; seed " << lSeed.seed() << std::endl;
}
