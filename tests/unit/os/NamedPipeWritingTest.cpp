#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/os/NamedPipeTesting.h"

using std::chrono::milliseconds;

namespace {

using NamedPipeWriting = ZTCNamedPipeFixture;

}  // namespace

TEST_F(NamedPipeWriting, AMessageIsWrittenBehindItsLength) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    for (const std::string& lcrBody : {std::string("hello"), std::string(), std::string(5000, 'y')}) {
        unsigned lCount = 99;
        lPipe->write(bufferOf(lcrBody), lCount);
        EXPECT_EQ(lCount, lcrBody.size());
        EXPECT_EQ(readAll(mSensor, lcrBody.size() + 4), frameOf(lcrBody));
    }
}

TEST_F(NamedPipeWriting, AMessageLargerThanThePipeIsWrittenAsItIsRead) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    std::string lBody(3000001, '\0');
    for (std::size_t lIndex = 0; lIndex < lBody.size(); ++lIndex) {
        lBody[lIndex] = static_cast<char>(lIndex % 251);
    }
    std::string lGot;
    ZTCTestThread lThread([&] { lGot = readAll(mSensor, lBody.size() + 4); });
    unsigned lCount = 0;
    lPipe->write(bufferOf(lBody), lCount);
    lThread.join();
    EXPECT_EQ(lCount, lBody.size());
    EXPECT_TRUE(lGot == frameOf(lBody));
}

TEST_F(NamedPipeWriting, TheExitEventCutsAWriteWhoseReaderHasStoppedReading) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    const int lCapacity = fcntl(mSensor, F_GETPIPE_SZ);
    unsigned lCount = 0;
    std::string lText;
    ZTCTestThread lThread([&] {
        try {
            lPipe->write(bufferOf(std::string(1000000, 'z')), lCount);
        } catch (const ZTCClibWriteFailedEx& acrException) {
            lText = acrException.what();
        }
    });
    waitUntil([&] { return waitingBytes() == lCapacity; }, "the pipe being full");
    getExitEvent().raise();
    lThread.join();
    EXPECT_EQ(lCount, static_cast<unsigned>(lCapacity) - 4);
    EXPECT_NE(lText.find(std::to_string(lCapacity) + " of 1000004"), std::string::npos) << lText;
    EXPECT_NE(lText.find(mPath), std::string::npos) << lText;
}

TEST_F(NamedPipeWriting, AMessageThatFitsIsWrittenEvenWhenTheThreadsAreToExit) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    getExitEvent().raise();
    unsigned lCount = 0;
    lPipe->write(bufferOf("bye"), lCount);
    EXPECT_EQ(readAll(mSensor, 7), frameOf("bye"));
}

TEST_F(NamedPipeWriting, AReaderThatHasGoneIsAnException) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    closeSensor();
    unsigned lCount = 0;
    try {
        lPipe->write(bufferOf("hello"), lCount);
        FAIL() << "a message without a reader was written";
    } catch (const ZTCClibWriteFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find("0 of 9"), std::string::npos) << acrException.what();
    }
}

TEST_F(NamedPipeWriting, AReaderThatGoesInTheMiddleOfAMessageIsAnException) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    openWriter(*lPipe);
    const int lCapacity = fcntl(mSensor, F_GETPIPE_SZ);
    const ZTCTestThread lThread([&] {
        unsigned lCount = 0;
        EXPECT_THROW(lPipe->write(bufferOf(std::string(1000000, 'z')), lCount), ZTCClibWriteFailedEx);
    });
    waitUntil([&] { return waitingBytes() == lCapacity; }, "the pipe being full");
    closeSensor();
}

TEST_F(NamedPipeWriting, APipeThatIsNotOpenCannotBeWritten) {
    const ZTCPointer<ZTCNamedPipe> lPipe(newWriter(mPath));
    unsigned lCount = 0;
    EXPECT_THROW(lPipe->write(bufferOf("x"), lCount), ZTCClibWriteFailedEx);
}
