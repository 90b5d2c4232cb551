#include "tavik/include/TavikCommandHandler.h"

#include <gtest/gtest.h>

#include <deque>
#include <stdexcept>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "os/common/include/Reader.h"
#include "os/common/include/SystemInterface.h"
#include "os/common/include/ThreadComponent.h"
#include "os/common/include/Writer.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

const char* const scWaitingText = "-I- Waiting for control availability...";

/// Does what the next scripted step says when the thread waits, and so ends by itself when the steps are used up.
class TavikCommandHandler : public ZTCTavikFixture {
protected:
    TavikCommandHandler() {
        bringUp();
        mSystem->readers().get(0) = ZTCPointer<ZTCReader>(new ZTCScriptedReader(*this));
        mSystem->writers().get(0) = ZTCPointer<ZTCWriter>(new ZTCNotingWriter(*this));
        mSystem->mMakeThreadsToExit = [this] { mDone.emplace_back("exit"); };
        mSystem->mWaitForActivity = [this](unsigned aReader, unsigned aSeconds) {
            mDone.push_back("wait " + std::to_string(aReader) + " " + std::to_string(aSeconds));
            if (mSteps.empty()) {
                component().setForExit();
                return;
            }
            const std::function<void()> lStep = mSteps.front();
            mSteps.pop_front();
            lStep();
        };
        setLogCode(127);
    }

    /// A step of the script: a wait that ends with a command in the pipe, with the time over, or with an exception.
    void thenCommand(const char* apHex) {
        mSteps.emplace_back([this, apHex] { mCommands.push_back(bytesOf(apHex)); });
    }
    void thenTimeOut() {
        mSteps.emplace_back([] { throw ZTCTimeOutEx(); });
    }
    template <typename TException>
    void thenThrow(const TException& acrException) {
        mSteps.emplace_back([acrException] { throw acrException; });
    }
    void then(std::function<void()> aStep) { mSteps.push_back(std::move(aStep)); }

    ZTCThreadComponent& component() { return *mSystem->threadComponents().get(1); }

    void* run() { return runWith(component(), *mSystem); }
    static void* runWith(ZTCThreadComponent& arComponent, ZTCSystemInterface& arSystem) {
        ZTSThreadArguments lArguments{&arComponent, &arSystem};
        return CommandHandlerThreadProcedure(&lArguments);
    }

    /// What the procedure itself and the steps of a cycle have logged.
    std::vector<std::string> ownTexts() const { return mLog.texts("", ".//TavikCommandHandler"); }

    std::vector<std::string> mDone;                ///< waits, reads, responses and exit requests, in order
    std::function<void()> mBeforeRead = [] {};     ///< may throw
    std::function<void()> mBeforeWritten = [] {};  ///< may throw

private:
    class ZTCScriptedReader : public ZTCReader {
    public:
        explicit ZTCScriptedReader(TavikCommandHandler& arTest) : mrTest(arTest) {}
        void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) override {
            mrTest.mDone.emplace_back("read");
            mrTest.mBeforeRead();
            arBuffer = makeBuffer(mrTest.mCommands.front());
            arCount = arBuffer->getSize();
            mrTest.mCommands.pop_front();
        }
        void waitForActivity(unsigned) override {}

    private:
        TavikCommandHandler& mrTest;
    };

    class ZTCNotingWriter : public ZTCWriter {
    public:
        explicit ZTCNotingWriter(TavikCommandHandler& arTest) : mrTest(arTest) {}
        void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) override {
            mrTest.mBeforeWritten();
            mrTest.mDone.push_back("response " + hexOf(contentOf(*acrBuffer)));
            arCount = acrBuffer->getSize();
        }

    private:
        TavikCommandHandler& mrTest;
    };

    std::deque<std::function<void()>> mSteps;
    std::deque<ZTCBytes> mCommands;
};

}  // namespace

TEST_F(TavikCommandHandler, EveryWakeUpReadsAndAnswersOneCommand) {
    thenCommand("05 00000001");
    thenCommand("02");
    thenCommand("05 00000000");
    EXPECT_EQ(nullptr, run());
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "response 0000000000", "wait 0 3", "read",
                                        "response 0000000000", "wait 0 3", "read", "response 010006", "wait 0 3"}),
              mDone);
    EXPECT_EQ((std::vector<std::string>{scWaitingText, scWaitingText, scWaitingText, scWaitingText,
                                        "-I- Command handler thread is set for exit ..."}),
              ownTexts());
}

TEST_F(TavikCommandHandler, ATimeOutIsSilentAndTheNextWaitBegins) {
    thenTimeOut();
    thenTimeOut();
    thenTimeOut();
    run();
    EXPECT_EQ(std::vector<std::string>(4, "wait 0 3"), mDone);
    EXPECT_EQ((std::vector<std::string>{scWaitingText, scWaitingText, scWaitingText, scWaitingText,
                                        "-I- Command handler thread is set for exit ..."}),
              ownTexts());
}

TEST_F(TavikCommandHandler, AComponentSetForExitBeforehandNeverWaits) {
    setLogCode(255);
    component().setForExit();
    EXPECT_EQ(nullptr, run());
    EXPECT_TRUE(mDone.empty());
    EXPECT_EQ((std::vector<std::string>{"-T- Entered", "-T- Left"}), ownTexts());
}

TEST_F(TavikCommandHandler, AnExitRequestDuringAWaitLeavesACommandThatWaitsUnread) {
    then([this] { component().setForExit(); });
    thenCommand("02");
    run();
    EXPECT_EQ(std::vector<std::string>{"wait 0 3"}, mDone);
    EXPECT_EQ((std::vector<std::string>{scWaitingText, "-I- Command handler thread is set for exit ..."}), ownTexts());
}

TEST_F(TavikCommandHandler, AnExitRequestSeenAtTheTopOfTheLoopIsNotSaid) {
    thenCommand("02");
    mBeforeWritten = [this] { component().setForExit(); };
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "response 0000000000"}), mDone);
    EXPECT_EQ(std::vector<std::string>{scWaitingText}, ownTexts());
}

TEST_F(TavikCommandHandler, ATimeOutDuringWhichTheExitIsRequestedIsSilentToo) {
    then([this] {
        component().setForExit();
        throw ZTCTimeOutEx();
    });
    run();
    EXPECT_EQ(std::vector<std::string>{scWaitingText}, ownTexts());
}

TEST_F(TavikCommandHandler, AShutDownIsAnsweredBeforeTheThreadsAreMadeToExit) {
    thenCommand("04");
    thenCommand("02");
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "response 0000000000", "exit"}), mDone);
    EXPECT_EQ((std::vector<std::string>{scWaitingText,
                                        "-H- Exiting TavikCommandHandler thread with error : Shutting down Tavik"}),
              ownTexts());
    EXPECT_EQ(std::vector<std::string>{"Close"}, mLibrary.calls());
}

TEST_F(TavikCommandHandler, AShutDownWhoseAnswerCannotBeWrittenStillEndsTheAgent) {
    thenCommand("04");
    mBeforeWritten = [] { throw ZTCClibWriteFailedEx("nobody reads"); };
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "exit"}), mDone);
    EXPECT_TRUE(mLog.has("-H- Exiting TavikCommandHandler thread with error : nobody reads"));
    EXPECT_EQ(std::vector<std::string>{"Close"}, mLibrary.calls());
}

TEST_F(TavikCommandHandler, AQuitThreadExceptionEndsThisThreadAlone) {
    thenThrow(ZTCQuitThreadEx("enough", 5));
    EXPECT_EQ(nullptr, run());
    EXPECT_EQ(std::vector<std::string>{"wait 0 3"}, mDone);
    EXPECT_EQ((std::vector<std::string>{scWaitingText, "-H- Exiting TavikCommandHnadler thread (thread-only): enough"}),
              ownTexts());
}

TEST_F(TavikCommandHandler, EveryOtherExceptionOfTheFamilyMakesAllThreadsExit) {
    const std::pair<std::function<void()>, const char*> lExceptions[] = {
        {[] { throw ZTCHaltEx("halt", 1); }, "halt"},
        {[] { throw ZTCNoMemoryEx(); }, "Out of Memory"},
        {[] { throw ZTCShutDownEx("by itself", 19); }, "by itself"},
        {[] { throw ZTCExitConditionEx("condition", 19); }, "condition"},
        {[] { throw ZTCInvalidEx("invalid", 6); }, "invalid"},
        {[] { throw ZTCNotFoundEx("not there", 8); }, "not there"},
        {[] { throw ZTCClibReadFailedEx("read failed"); }, "read failed"},
        {[] { throw ZTCException("100% root", 1); }, "100% root"},
    };
    for (const auto& [lcrThrow, lpText] : lExceptions) {
        SCOPED_TRACE(lpText);
        mLog.forget();
        mDone.clear();
        then(lcrThrow);
        EXPECT_EQ(nullptr, run());
        EXPECT_EQ((std::vector<std::string>{"wait 0 3", "exit"}), mDone);
        EXPECT_EQ((std::vector<std::string>{scWaitingText, std::string("-H- Exiting TavikCommandHandler thread with "
                                                                       "error : ") +
                                                               lpText}),
                  ownTexts());
    }
}

TEST_F(TavikCommandHandler, AFailedReadEndsTheAgentWithoutAResponse) {
    thenCommand("02");
    mBeforeRead = [] { throw ZTCClibReadFailedEx("gone"); };
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "exit"}), mDone);
    EXPECT_TRUE(mLog.has("-H- Exiting TavikCommandHandler thread with error : gone"));
}

TEST_F(TavikCommandHandler, ATooShortCommandEndsTheAgentWithoutAResponse) {
    thenCommand("00 0000");
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "exit"}), mDone);
    EXPECT_TRUE(mLog.has("-H- Exiting TavikCommandHandler thread with error : Not enough data in stream"));
}

TEST_F(TavikCommandHandler, ATimeOutOfAnythingButTheWaitIsAFailure) {
    thenCommand("02");
    mBeforeRead = [] { throw ZTCTimeOutEx("too slow", 3); };
    run();
    EXPECT_EQ((std::vector<std::string>{"wait 0 3", "read", "exit"}), mDone);
    EXPECT_TRUE(mLog.has("-H- Exiting TavikCommandHandler thread with error : too slow"));
}

TEST_F(TavikCommandHandler, AForeignExceptionLeavesTheProcedureUnsaid) {
    thenThrow(std::runtime_error("foreign"));
    EXPECT_THROW(run(), std::runtime_error);
    EXPECT_EQ(std::vector<std::string>{"wait 0 3"}, mDone);
    EXPECT_EQ(std::vector<std::string>{scWaitingText}, ownTexts());
}

TEST_F(TavikCommandHandler, EveryStepOfACycleIsTraced) {
    setLogCode(ZTLL_Debug);
    thenCommand("02");
    run();
    std::vector<std::string> lCalls;
    for (const ZTSLogLine& lcrLine : mLog.lines()) {
        if (lcrLine.mLabel == ".//TavikCommandHandler") {
            lCalls.push_back(lcrLine.mFunction + " " + lcrLine.mText);
        }
    }
    EXPECT_EQ((std::vector<std::string>{"CommandHandlerThreadProcedure Entered", "sReadAndProcessCommand Entered",
                                        "sReadCommand Entered", "sReadCommand Left", "sProcessCommand Entered",
                                        "sProcessCommand Left", "sOutputResponse Entered", "sOutputResponse Left",
                                        "sReadAndProcessCommand Left", "CommandHandlerThreadProcedure Left"}),
              lCalls);
}

TEST_F(TavikCommandHandler, AMissingArgumentEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            CommandHandlerThreadProcedure(nullptr);
        },
        testing::ExitedWithCode(1), failedAssertion("0 != lpArgs"));
}

TEST_F(TavikCommandHandler, ASystemOfAnotherKindEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            ZTCSystemInterface lInterface;
            runWith(component(), lInterface);
        },
        testing::ExitedWithCode(1), failedAssertion("0 != lpTavikSystem"));
}

TEST_F(TavikCommandHandler, AComponentOfAnotherKindEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            runWith(*mSystem->threadComponents().get(0), *mSystem);
        },
        testing::ExitedWithCode(1), failedAssertion("0 != lCommandHandler"));
}
