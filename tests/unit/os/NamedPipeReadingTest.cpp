#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>
#include <thread>

#include "common/include/Exception.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/os/NamedPipeTesting.h"

using std::chrono::milliseconds;

namespace {

using NamedPipeReading = ZTCNamedPipeFixture;

/// A handler of a signal.
void sDoNothing(int) {}

}  // namespace

TEST_F(NamedPipeReading, AMessageIsReadWhole) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("hello"));
    lPipe->waitForActivity(gcLongSeconds);
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "hello");
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 1;
    EXPECT_THROW(lPipe->read(lBuffer, lCount), ZTCClibReadFailedEx);
    EXPECT_EQ(lCount, 0u);
}

TEST_F(NamedPipeReading, ClosingThrowsAwayAMessageThatWasNotRead) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("old"));
    lPipe->waitForActivity(gcLongSeconds);
    lPipe->close();
    lPipe->open();
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 1;
    EXPECT_THROW(lPipe->read(lBuffer, lCount), ZTCClibReadFailedEx);
    send(frameOf("new"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "new");
}

TEST_F(NamedPipeReading, MessagesThatWaitAreReadInOrder) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("one") + frameOf("two") + frameOf("three"));
    for (const char* lpBody : {"one", "two", "three"}) {
        lPipe->waitForActivity(gcLongSeconds);
        EXPECT_EQ(readMessage(*lPipe), lpBody);
    }
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(0)), ZTCTimeOutEx);
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

TEST_F(NamedPipeReading, OnlyTheMessageInHandIsTakenOutOfThePipe) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("one") + frameOf("two"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(waitingBytes(), 7);
}

TEST_F(NamedPipeReading, AMessageMayBeCutAtEveryPlace) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    const std::string lcFrames = frameOf("hello") + frameOf("w");
    for (std::size_t lCut = 1; lCut < lcFrames.size(); ++lCut) {
        const ZTCTestThread lThread([&] {
            lPipe->waitForActivity(gcLongSeconds);
            EXPECT_EQ(readMessage(*lPipe), "hello");
            lPipe->waitForActivity(gcLongSeconds);
            EXPECT_EQ(readMessage(*lPipe), "w");
        });
        send(lcFrames.substr(0, lCut));
        waitUntilTaken();
        send(lcFrames.substr(lCut));
    }
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

TEST_F(NamedPipeReading, TheLargestMessageIsRead) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    const std::string lcBody(1048576, 'q');
    ZTCTestThread lThread([&] {
        const std::string lFrame = frameOf(lcBody);
        EXPECT_EQ(write(mSensor, lFrame.data(), lFrame.size()), static_cast<ssize_t>(lFrame.size()));
    });
    lPipe->waitForActivity(gcLongSeconds);
    lThread.join();
    EXPECT_TRUE(readMessage(*lPipe) == lcBody);
}

TEST_F(NamedPipeReading, ABrokenLengthThrowsAwayWhatWaitsAndTheNextMessageIsServed) {
    const struct {
        std::string mHeader;
        std::string mShown;
    } lcRows[] = {{std::string("\0\0\0\0", 4), " 0 "},
                  {std::string("\x00\x10\x00\x01", 4), "1048577"},
                  {"\xff\xff\xff\xff", "4294967295"}};
    for (const auto& lcrRow : lcRows) {
        ZTCLogCapture lLog;
        const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
        openReader(*lPipe);
        send(lcrRow.mHeader + frameOf("thrown away") + std::string(5000, 'x'));
        EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
        EXPECT_EQ(waitingBytes(), 0);
        send(frameOf("good"));
        lPipe->waitForActivity(gcLongSeconds);
        EXPECT_EQ(readMessage(*lPipe), "good");
        ASSERT_EQ(lLog.countMark("-E-"), 1u);
        for (const ZTSLogLine& lcrLine : lLog.file().lines()) {
            if (lcrLine.mMark == "-E-") {
                EXPECT_NE(lcrLine.mText.find(lcrRow.mShown), std::string::npos) << lcrLine.mText;
            }
        }
        closeSensor();
        lPipe->close();
        lPipe->destroy();
    }
}

TEST_F(NamedPipeReading, AMessageWhoseRestDoesNotComeIsThrownAwayAndTheNextOneServed) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("hello").substr(0, 7));
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
    ASSERT_EQ(mLog.countMark("-E-"), 1u);
    EXPECT_NE(textOfError().find("7 of 9"), std::string::npos) << textOfError();
    send(frameOf("good"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "good");
}

TEST_F(NamedPipeReading, ALengthWhoseRestDoesNotComeIsThrownAway) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(std::string("\0", 1));
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
    ASSERT_EQ(mLog.countMark("-E-"), 1u);
    EXPECT_NE(textOfError().find("1 of 4"), std::string::npos) << textOfError();
}

TEST_F(NamedPipeReading, AnIdleWaitTimesOutWithoutALine) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    lPipe->create();
    lPipe->open();
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(5)), ZTCTimeOutEx);
    EXPECT_TRUE(mLog.file().rawLines().empty());
}

TEST_F(NamedPipeReading, ASensorThatGoesLeavesNoEndOfFileBehind) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    send(frameOf("first"));
    closeSensor();
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "first");
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(5)), ZTCTimeOutEx);
    mSensor = open(mPath.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
    send(frameOf("second"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "second");
}

TEST_F(NamedPipeReading, TheExitEventEndsAnIdleWait) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    lPipe->create();
    lPipe->open();
    ZTCTestThread lThread([&] { lPipe->waitForActivity(gcLongSeconds); });
    getExitEvent().raise();
    lThread.join();
    EXPECT_NO_THROW(lPipe->waitForActivity(gcLongSeconds)) << "every later wait as well";
}

TEST_F(NamedPipeReading, ATrickleDoesNotHoldUpAnExit) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    const ZTCTestThread lWaiter([&] { lPipe->waitForActivity(gcLongSeconds); });
    send(std::string("\x00\x10\x00\x00", 4));
    for (int lByte = 0; lByte < 5; ++lByte) {
        send("x");
        waitUntilTaken();
    }
    EXPECT_TRUE(lWaiter.isRunning());
    getExitEvent().raise();
    // The trickle goes on for as long as the wait does.
    while (lWaiter.isRunning()) {
        ASSERT_EQ(write(mSensor, "x", 1), 1);
        std::this_thread::yield();
    }
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

TEST_F(NamedPipeReading, ASignalToTheThreadDoesNotEndItsWait) {
    struct sigaction lAction {};
    lAction.sa_handler = sDoNothing;
    ASSERT_EQ(sigaction(SIGUSR1, &lAction, nullptr), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(newReader(mPath));
    openReader(*lPipe);
    ZTCTestThread lThread([&] { lPipe->waitForActivity(gcLongSeconds); });
    for (int lRound = 0; lRound < 20; ++lRound) {
        lThread.sendSignal(SIGUSR1);
        std::this_thread::sleep_for(milliseconds(1));
    }
    EXPECT_TRUE(lThread.isRunning());
    send(frameOf("x"));
    lThread.join();
    EXPECT_EQ(readMessage(*lPipe), "x");
}
