#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

// Every cause that ends the agent, at every moment of its life: it ends in time, in order, with its status, and the
// next start is served. What an agent needs to learn of its end, and what it must wait for before it can act on it (a
// library that is in no hurry, a sensor that is still to come), counts as the cause; the time runs from there on.

/// One wait time of the command thread, and a second.
static ZTCDeadline sExitDeadline() {
    return ZTCDeadline(stretched(std::chrono::seconds(4)));
}

enum class ZTEMoment {
    LibraryInit,     ///< before the FIFOs exist, in a library's Init that takes its time
    WaitForReader,   ///< the FIFOs exist, no sensor has opened the response FIFO
    Registration,    ///< in the start command, in a library's registration that takes its time
    LibraryClose,    ///< in the shut-down command, in a library's Close that takes its time
    CutResponse,     ///< in the middle of a large response that the sensor has stopped to read
    PartialRequest,  ///< a part of a request is there
    Idle,
    Storm  ///< eight threads of the library deliver events
};

struct ZTSMoment {
    ZTEMoment mMoment;
    const char* mpName;
    bool mServesCommands;  ///< what is sent now is taken for a command, now or later
    bool mHasThreads;      ///< commands and heartbeats are served already
};

/// The storm comes last: it leaves little of the processors to what comes after it.
static const ZTSMoment scMoments[] = {
    {ZTEMoment::LibraryInit, "library's Init", false, false},
    {ZTEMoment::WaitForReader, "wait for a reader", true, false},
    {ZTEMoment::Registration, "registration", true, true},
    {ZTEMoment::LibraryClose, "library's Close", false, true},
    {ZTEMoment::CutResponse, "cut response", true, true},
    {ZTEMoment::PartialRequest, "partial request", false, true},
    {ZTEMoment::Idle, "idle", true, true},
    {ZTEMoment::Storm, "storm", true, true},
};

enum class ZTECause { StopSignal, ShutDownCommand, DeadSensor, LostPidFile, UnknownCommand };

struct ZTSCause {
    ZTECause mCause;
    const char* mpRequest;    ///< hex of the command that is the cause; null where it is none
    const char* mpDetection;  ///< line that tells that the heartbeat has noticed; null where it does not take part
    int mStatus;
};

/// One agent that is brought to a moment of its life, and to its end there.
class ZTCEndingAgent {
public:
    ZTCEndingAgent(const ZTSMoment& acrMoment, const ZTSCause& acrCause)
        : mcrMoment(acrMoment), mcrCause(acrCause), mAgent(2) {}

    const char* momentName() const { return mcrMoment.mpName; }

    void reachMoment() {
        writeFile(mAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
        switch (mcrMoment.mMoment) {
            case ZTEMoment::LibraryInit:
                mAgent.library().configure("hold Init");
                start();
                mAgent.library().waitForCall("Init held");
                return;
            case ZTEMoment::WaitForReader:
                start();
                mAgent.pipes().openCommand();
                waitUntil([this] { return isFifo(mAgent.responseFifoPath()); }, "the response FIFO");
                return;
            default:
                break;
        }
        start();
        mAgent.pipes().open();
        EXPECT_TRUE(mAgent.ping());
        switch (mcrMoment.mMoment) {
            case ZTEMoment::Registration:
                mAgent.library().configure("hold ZtapiRegEvent");
                mAgent.pipes().sendRequest(ZTCAgentProcess::startScopeRequest(4096));
                mAgent.library().waitForCall("ZtapiRegEvent held");
                break;
            case ZTEMoment::LibraryClose:
                mAgent.library().configure("hold Close");
                mAgent.pipes().sendRequest({4});
                mAgent.library().waitForCall("Close held");
                break;
            case ZTEMoment::CutResponse:
                cutResponse();
                break;
            case ZTEMoment::PartialRequest:
                mAgent.pipes().sendRaw(bytesOf("00000005 0500"));
                mAgent.pipes().waitUntilTaken();
                break;
            case ZTEMoment::Storm:
                mAgent.startScope();
                mAgent.library().startStorm(8, 0, storm());
                mAgent.retrieve();
                break;
            default:
                break;
        }
    }

    void bringCause() {
        switch (mcrCause.mCause) {
            case ZTECause::StopSignal:
                mAgent.process().sendSignal(SIGTERM);
                break;
            case ZTECause::DeadSensor:
                std::filesystem::remove(mAgent.sensorPidFilePath());
                break;
            case ZTECause::LostPidFile:
                std::filesystem::remove(mAgent.pidFilePath());
                break;
            default:
                mAgent.pipes().sendRequest(bytesOf(mcrCause.mpRequest));
                break;
        }
        if (!mcrMoment.mHasThreads) {
            letItActOnIt();
        }
    }

    void expectEnd() {
        waitForDetection();
        if (mcrMoment.mHasThreads) {
            letItActOnIt();
        }
        EXPECT_EQ(mAgent.waitForExit(sExitDeadline()), mcrCause.mStatus);
        expectAnswers();
        expectWhatIsLeft();
        const std::vector<std::string> lCalls = mAgent.library().calls();
        EXPECT_EQ(std::count(lCalls.begin(), lCalls.end(), "Close"), isLibraryToBeClosed() ? 1 : 0);
    }

    void expectThatTheNextStartIsServed() {
        mAgent.pipes().close();
        mAgent.library().configure("hold-nothing");
        writeFile(mAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
        mAgent.startAndConnectQuietly();
        EXPECT_EQ(mAgent.stop(), 0);
        expectNoFiles();
    }

private:
    void start() { mAgent.start({"-D", "false", "-d", "65", "-l", mAgent.agentLogPath(), "-b", "1"}); }

    static std::vector<ZTSLibraryEvent> storm() {
        std::vector<ZTSLibraryEvent> lEvents;
        for (const ZTSDataKind& lcrKind : dataKinds()) {
            lEvents.push_back(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
        }
        for (const ZTSBareKind& lcrKind : bareKinds(1)) {
            lEvents.push_back(lcrKind.mEvent);
        }
        return lEvents;
    }

    /// More than the FIFO holds is on its way, and the agent waits for room in it.
    void cutResponse() {
        mAgent.startScope();
        mAgent.library().startStorm(1, 1500, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::bare(0, 8, 1)});
        EXPECT_EQ(mAgent.library().waitForStorm(), 3000u);
        mAgent.pipes().sendRequest({1});
        waitUntil([this] { return mAgent.pipes().waitingResponseBytes() >= 60000; }, "a full response FIFO");
    }

    bool isCommand() const { return mcrCause.mpRequest != nullptr; }
    bool isExitCondition() const { return mcrCause.mCause == ZTECause::StopSignal && !mcrMoment.mHasThreads; }
    bool isLibraryToBeClosed() const {
        return mcrCause.mCause == ZTECause::ShutDownCommand || mcrMoment.mMoment == ZTEMoment::LibraryClose;
    }

    void waitForDetection() {
        if (mcrCause.mpDetection != nullptr) {
            mAgent.log().waitFor(mcrCause.mpDetection);
        }
    }

    void letItActOnIt() {
        switch (mcrMoment.mMoment) {
            case ZTEMoment::LibraryInit:
            case ZTEMoment::Registration:
            case ZTEMoment::LibraryClose:
                mAgent.library().letGo();
                break;
            case ZTEMoment::CutResponse:
                if (isCommand()) {
                    EXPECT_EQ(ZTSScopeDataResponse::decode(mAgent.pipes().readResponse()).occurrences(2, 1), 1500u);
                }
                break;
            default:
                break;
        }
        if (!mcrMoment.mHasThreads && mcrCause.mCause != ZTECause::StopSignal) {
            mAgent.pipes().openResponse();
        }
    }

    /// What was under way is answered, and so is the shut-down command; nothing else is.
    void expectAnswers() {
        if (isExitCondition()) {
            return;
        }
        if (mcrMoment.mMoment == ZTEMoment::CutResponse && !isCommand()) {
            EXPECT_THROW(mAgent.pipes().readResponse(), std::runtime_error);
            EXPECT_EQ(mAgent.log().containing("Writing to '" + mAgent.responseFifoPath() + "' ended after").size(), 1u);
            return;
        }
        if (mcrMoment.mMoment == ZTEMoment::Registration || mcrMoment.mMoment == ZTEMoment::LibraryClose) {
            EXPECT_EQ(hexOf(mAgent.pipes().readResponse()), gcSuccessHex);
        }
        if (mcrCause.mCause == ZTECause::ShutDownCommand) {
            EXPECT_EQ(hexOf(mAgent.pipes().readResponse()), gcSuccessHex);
        }
        EXPECT_TRUE(mAgent.pipes().isAtEnd());
    }

    void expectWhatIsLeft() {
        const bool lIsAssertion = mcrCause.mStatus == 1;
        EXPECT_EQ(mAgent.log().count("Assertion [ false ] failed", "-H-"), lIsAssertion ? 1u : 0u);
        EXPECT_EQ(mAgent.log().count("Exit condition", "-I-"), isExitCondition() ? 1u : 0u);
        EXPECT_EQ(mAgent.log().count("Tavik System exiting", "-H-"), lIsAssertion || isExitCondition() ? 0u : 1u);
        if (lIsAssertion) {
            // It ends at once: what is left is for the next start to take over.
            EXPECT_TRUE(isFifo(mAgent.commandFifoPath()));
            EXPECT_TRUE(exists(mAgent.pidFilePath()));
        } else if (isExitCondition()) {
            EXPECT_FALSE(exists(mAgent.pidFilePath()));
        } else {
            expectNoFiles();
        }
    }

    void expectNoFiles() {
        EXPECT_FALSE(exists(mAgent.commandFifoPath()));
        EXPECT_FALSE(exists(mAgent.responseFifoPath()));
        EXPECT_FALSE(exists(mAgent.pidFilePath()));
    }

    const ZTSMoment& mcrMoment;
    const ZTSCause& mcrCause;
    ZTCAgentProcess mAgent;
};

/// All moments side by side, so that the heartbeats' seconds pass once.
static void sExpectEndAtEveryMoment(const ZTSCause& acrCause) {
    std::vector<std::unique_ptr<ZTCEndingAgent>> lAgents;
    for (const ZTSMoment& lcrMoment : scMoments) {
        if (acrCause.mpRequest != nullptr && !lcrMoment.mServesCommands) {
            continue;
        }
        SCOPED_TRACE(lcrMoment.mpName);
        lAgents.push_back(std::make_unique<ZTCEndingAgent>(lcrMoment, acrCause));
        lAgents.back()->reachMoment();
    }
    for (auto lpAgent = lAgents.rbegin(); lpAgent != lAgents.rend(); ++lpAgent) {
        SCOPED_TRACE((*lpAgent)->momentName());
        (*lpAgent)->bringCause();
    }
    for (auto lpAgent = lAgents.rbegin(); lpAgent != lAgents.rend(); ++lpAgent) {
        SCOPED_TRACE((*lpAgent)->momentName());
        (*lpAgent)->expectEnd();
        (*lpAgent)->expectThatTheNextStartIsServed();
    }
}

TEST(Exit, AStopSignalEndsTheAgentAtEveryMoment) {
    sExpectEndAtEveryMoment({ZTECause::StopSignal, nullptr, nullptr, 0});
}

TEST(Exit, TheShutDownCommandEndsTheAgentAtEveryMoment) {
    sExpectEndAtEveryMoment({ZTECause::ShutDownCommand, "04", nullptr, 0});
}

TEST(Exit, ADeadSensorEndsTheAgentAtEveryMoment) {
    sExpectEndAtEveryMoment({ZTECause::DeadSensor, nullptr, "Failed in getting the status of Sensor", 0});
}

TEST(Exit, ALostPidFileEndsTheAgentAtEveryMoment) {
    sExpectEndAtEveryMoment({ZTECause::LostPidFile, nullptr, "Failed in updating the status", 0});
}

TEST(Exit, AnUnknownCommandEndsTheAgentAtEveryMoment) {
    sExpectEndAtEveryMoment({ZTECause::UnknownCommand, "06", nullptr, 1});
}
