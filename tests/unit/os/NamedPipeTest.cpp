#include "os/common/include/NamedPipe.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <pthread.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstring>
#include <string>
#include <thread>

#include "common/include/Exception.h"
#include "common/include/Memory.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/Waiting.h"
#include "tests/unit/os/LogCapture.h"

using std::chrono::milliseconds;

static constexpr unsigned gcLongSeconds = 60;

static std::string sFrame(const std::string& acrBody) {
    std::string lFrame;
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        lFrame += static_cast<char>((acrBody.size() >> lShift) & 0xff);
    }
    return lFrame + acrBody;
}

static ZTCPointer<ZTCBuffer> sBuffer(const std::string& acrText) {
    ZTCPointer<ZTCBuffer> lBuffer(NEW ZTCBuffer());
    lBuffer->append(acrText.data(), static_cast<Size>(acrText.size()));
    return lBuffer;
}

static std::string sReadAll(int aDescriptor, std::size_t aSize) {
    std::string lText(aSize, '\0');
    std::size_t lHad = 0;
    while (lHad < aSize) {
        const ssize_t lCount = read(aDescriptor, lText.data() + lHad, aSize - lHad);
        if (lCount <= 0) {
            ADD_FAILURE() << "the stream ended after " << lHad << " of " << aSize << " bytes";
            break;
        }
        lHad += static_cast<std::size_t>(lCount);
    }
    return lText;
}

/// A FIFO in a directory of the test's own, a log, and events that are down before and after.
class NamedPipe : public testing::Test {
protected:
    NamedPipe() : mPath(mDirectory.path("test.fifo")) {
        signal(SIGPIPE, SIG_IGN);
        getStopEvent().reset();
        getExitEvent().reset();
    }
    ~NamedPipe() override {
        closeSensor();
        getStopEvent().reset();
        getExitEvent().reset();
    }

    /// A reading pipe, and the sensor's end in mSensor.
    void openReader(ZTCNamedPipe& arPipe) {
        arPipe.create();
        arPipe.open();
        mSensor = open(mPath.c_str(), O_WRONLY | O_CLOEXEC);
        ASSERT_GE(mSensor, 0);
    }

    /// A writing pipe, and the sensor's end in mSensor.
    void openWriter(ZTCNamedPipe& arPipe) {
        arPipe.create();
        mSensor = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        ASSERT_GE(mSensor, 0);
        arPipe.open();
        ASSERT_EQ(fcntl(mSensor, F_SETFL, 0), 0);
    }

    void closeSensor() {
        if (mSensor >= 0) {
            close(mSensor);
            mSensor = -1;
        }
    }

    void send(const std::string& acrBytes) {
        ASSERT_EQ(write(mSensor, acrBytes.data(), acrBytes.size()), static_cast<ssize_t>(acrBytes.size()));
    }

    int waitingBytes() const {
        int lCount = -1;
        EXPECT_EQ(ioctl(mSensor, FIONREAD, &lCount), 0);
        return lCount;
    }

    void waitUntilTaken() {
        waitUntil([this] { return waitingBytes() == 0; }, "the pipe being emptied");
    }

    static std::string readMessage(ZTCNamedPipe& arPipe) {
        ZTCPointer<ZTCBuffer> lBuffer;
        unsigned lCount = 0;
        arPipe.read(lBuffer, lCount);
        EXPECT_EQ(lCount, lBuffer->getSize());
        return std::string(reinterpret_cast<const char*>(lBuffer->getData()), lBuffer->getSize());
    }

    std::string textOfError() const {
        for (const ZTSLogLine& lcrLine : mLog.file().lines()) {
            if (lcrLine.mMark == "-E-") {
                return lcrLine.mText;
            }
        }
        return "";
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCLogCapture mLog;
    const std::string mPath;
    int mSensor = -1;
};

static ZTCString sPath(const std::string& acrPath) {
    return ZTCString(acrPath.c_str());
}

static ZTCNamedPipe* sNewReader(const std::string& acrPath) {
    return NEW ZTCNamedPipe(sPath(acrPath), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
}

static ZTCNamedPipe* sNewWriter(const std::string& acrPath, ZTEPipeState aState = ZTNPS_Block) {
    return NEW ZTCNamedPipe(sPath(acrPath), ZTFM_Write, aState, ZTCM_Server);
}

// ---- Making and removing ----

TEST_F(NamedPipe, CreatingMakesAFifoForItsOwnerAlone) {
    const mode_t lMask = umask(0);
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    lPipe->create();
    umask(lMask);
    struct stat lStatus {};
    ASSERT_EQ(lstat(mPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode, static_cast<mode_t>(S_IFIFO | 0600));
    lPipe->destroy();
    EXPECT_FALSE(exists(mPath));
    EXPECT_NO_THROW(lPipe->destroy()) << "of a FIFO that is gone";
}

TEST_F(NamedPipe, CreatingTakesOverAFifoThatIsThere) {
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    lPipe->create();
    lPipe->open();
    lPipe->close();
    lPipe->destroy();
    EXPECT_FALSE(exists(mPath));
}

TEST_F(NamedPipe, CreatingRefusesAFileAndLeavesItUntouched) {
    writeFile(mPath, "precious");
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    try {
        lPipe->create();
        FAIL() << "a regular file was taken for a FIFO";
    } catch (const ZTCInvalidEx& acrException) {
        const std::string lText = acrException.what();
        EXPECT_NE(lText.find(mPath), std::string::npos) << lText;
        EXPECT_NE(lText.find("a regular file"), std::string::npos) << lText;
    }
    EXPECT_THROW(lPipe->open(), ZTCInvalidEx);
    lPipe->destroy();
    EXPECT_EQ(readFile(mPath), "precious");
    EXPECT_EQ(mLog.countMark("-W-"), 1u) << "destroying says what it leaves";
}

TEST_F(NamedPipe, CreatingRefusesALinkToAFifo) {
    const std::string lTarget = mDirectory.path("target.fifo");
    ASSERT_EQ(mkfifo(lTarget.c_str(), 0600), 0);
    ASSERT_EQ(symlink(lTarget.c_str(), mPath.c_str()), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    EXPECT_THROW(lPipe->create(), ZTCInvalidEx);
    EXPECT_THROW(lPipe->open(), ZTCInvalidEx);
    lPipe->destroy();
    EXPECT_TRUE(exists(mPath));
}

TEST_F(NamedPipe, CreatingWithoutADirectoryNamesThePath) {
    const std::string lPath = mDirectory.path("no/such.fifo");
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(lPath));
    try {
        lPipe->create();
        FAIL() << "a FIFO without a directory was made";
    } catch (const ZTCClibMkfifoFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find(lPath), std::string::npos);
    }
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
}

TEST_F(NamedPipe, AClientNeitherMakesNorRemovesTheFifo) {
    ZTCNamedPipe lPipe(sPath(mPath), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Client);
    EXPECT_THROW(lPipe.create(), ZTCClibOpenFailedEx);
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    lPipe.create();
    lPipe.open();
    lPipe.accept();
    lPipe.close();
    lPipe.destroy();
    EXPECT_TRUE(isFifo(mPath));
}

TEST_F(NamedPipe, OtherModesAreRefused) {
    for (const ZTEFileMode lMode : {ZTFM_None, ZTFM_ReadWrite, ZTFM_Append}) {
        ZTCNamedPipe lPipe(sPath(mPath), lMode, ZTNPS_NonBlock, ZTCM_Server);
        lPipe.create();
        EXPECT_THROW(lPipe.open(), ZTCNotImplementedEx);
    }
}

TEST_F(NamedPipe, ItIsOpenedOnceAndClosedAsOftenAsOneLikes) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    lPipe->create();
    lPipe->open();
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
    lPipe->close();
    lPipe->close();
    EXPECT_THROW(lPipe->waitForActivity(0u), ZTCClibReadFailedEx);
    EXPECT_NO_THROW(lPipe->open());
}

// ---- Opening for writing ----

TEST_F(NamedPipe, OpeningForWritingWaitsForAReader) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    lPipe->create();
    std::thread lThread([&] { EXPECT_NO_THROW(lPipe->open()); });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");
    mSensor = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    lThread.join();
    EXPECT_EQ(mLog.file().count("Waiting for a reader of '" + mPath + "'", "-N-"), 1u);
}

TEST_F(NamedPipe, TheStopEventEndsTheOpeningAsAnExitCondition) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    lPipe->create();
    std::atomic<unsigned> lCode{0};
    std::thread lThread([&] {
        try {
            lPipe->open();
        } catch (const ZTCExitConditionEx& acrException) {
            lCode = acrException.getError();
        }
    });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");
    getStopEvent().raise();
    lThread.join();
    EXPECT_EQ(lCode, 19u);
    EXPECT_TRUE(isFifo(mPath));
}

TEST_F(NamedPipe, OpeningForWritingWithoutWaitingNeedsAReaderAtOnce) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath, ZTNPS_NonBlock));
    lPipe->create();
    EXPECT_THROW(lPipe->open(), ZTCClibOpenFailedEx);
    mSensor = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    EXPECT_NO_THROW(lPipe->open());
}

TEST_F(NamedPipe, OpeningForWritingDoesNotWaitForAFifoThatWasReplaced) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    lPipe->create();
    std::atomic<bool> lIsRefused{false};
    std::thread lThread([&] {
        try {
            lPipe->open();
        } catch (const ZTCInvalidEx&) {
            lIsRefused = true;
        }
    });
    mLog.file().waitFor("Waiting for a reader of '" + mPath + "'");

    // Opening a socket fails in the same way as opening a FIFO without a reader.
    struct sockaddr_un lAddress {};
    lAddress.sun_family = AF_UNIX;
    ASSERT_LT(mPath.size() + 4, sizeof(lAddress.sun_path));
    std::strcpy(lAddress.sun_path, (mPath + ".new").c_str());
    const int lSocket = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    ASSERT_EQ(bind(lSocket, reinterpret_cast<struct sockaddr*>(&lAddress), sizeof(lAddress)), 0);
    ASSERT_EQ(rename((mPath + ".new").c_str(), mPath.c_str()), 0);
    lThread.join();
    close(lSocket);
    EXPECT_TRUE(lIsRefused);
}

// ---- Receiving ----

TEST_F(NamedPipe, AMessageIsReadWhole) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(sFrame("hello"));
    lPipe->waitForActivity(gcLongSeconds);
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "hello");
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 1;
    EXPECT_THROW(lPipe->read(lBuffer, lCount), ZTCClibReadFailedEx);
    EXPECT_EQ(lCount, 0u);
}

TEST_F(NamedPipe, MessagesThatWaitAreReadInOrder) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(sFrame("one") + sFrame("two") + sFrame("three"));
    for (const char* lpBody : {"one", "two", "three"}) {
        lPipe->waitForActivity(gcLongSeconds);
        EXPECT_EQ(readMessage(*lPipe), lpBody);
    }
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(0)), ZTCTimeOutEx);
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

TEST_F(NamedPipe, OnlyTheMessageInHandIsTakenOutOfThePipe) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(sFrame("one") + sFrame("two"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(waitingBytes(), 7);
}

TEST_F(NamedPipe, AMessageMayBeCutAtEveryPlace) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    const std::string lcFrames = sFrame("hello") + sFrame("w");
    for (std::size_t lCut = 1; lCut < lcFrames.size(); ++lCut) {
        std::thread lThread([&] {
            lPipe->waitForActivity(gcLongSeconds);
            EXPECT_EQ(readMessage(*lPipe), "hello");
            lPipe->waitForActivity(gcLongSeconds);
            EXPECT_EQ(readMessage(*lPipe), "w");
        });
        send(lcFrames.substr(0, lCut));
        waitUntilTaken();
        send(lcFrames.substr(lCut));
        lThread.join();
    }
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

TEST_F(NamedPipe, TheLargestMessageIsRead) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    const std::string lcBody(1048576, 'q');
    std::thread lThread([&] {
        const std::string lFrame = sFrame(lcBody);
        EXPECT_EQ(write(mSensor, lFrame.data(), lFrame.size()), static_cast<ssize_t>(lFrame.size()));
    });
    lPipe->waitForActivity(gcLongSeconds);
    lThread.join();
    EXPECT_TRUE(readMessage(*lPipe) == lcBody);
}

TEST_F(NamedPipe, ABrokenLengthThrowsAwayWhatWaitsAndTheNextMessageIsServed) {
    const struct {
        std::string mHeader;
        std::string mShown;
    } lcRows[] = {{std::string("\0\0\0\0", 4), " 0 "},
                  {std::string("\x00\x10\x00\x01", 4), "1048577"},
                  {"\xff\xff\xff\xff", "4294967295"}};
    for (const auto& lcrRow : lcRows) {
        ZTCLogCapture lLog;
        const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
        openReader(*lPipe);
        send(lcrRow.mHeader + sFrame("thrown away") + std::string(5000, 'x'));
        EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
        EXPECT_EQ(waitingBytes(), 0);
        send(sFrame("good"));
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

TEST_F(NamedPipe, AMessageWhoseRestDoesNotComeIsThrownAwayAndTheNextOneServed) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(sFrame("hello").substr(0, 7));
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
    ASSERT_EQ(mLog.countMark("-E-"), 1u);
    EXPECT_NE(textOfError().find("7 of 9"), std::string::npos) << textOfError();
    send(sFrame("good"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "good");
}

TEST_F(NamedPipe, ALengthWhoseRestDoesNotComeIsThrownAway) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(std::string("\0", 1));
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(20)), ZTCTimeOutEx);
    ASSERT_EQ(mLog.countMark("-E-"), 1u);
    EXPECT_NE(textOfError().find("1 of 4"), std::string::npos) << textOfError();
}

TEST_F(NamedPipe, AnIdleWaitTimesOutWithoutALine) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    lPipe->create();
    lPipe->open();
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(5)), ZTCTimeOutEx);
    EXPECT_TRUE(mLog.file().rawLines().empty());
}

TEST_F(NamedPipe, ASensorThatGoesLeavesNoEndOfFileBehind) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    send(sFrame("first"));
    closeSensor();
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "first");
    EXPECT_THROW(lPipe->waitForActivity(milliseconds(5)), ZTCTimeOutEx);
    mSensor = open(mPath.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
    send(sFrame("second"));
    lPipe->waitForActivity(gcLongSeconds);
    EXPECT_EQ(readMessage(*lPipe), "second");
}

TEST_F(NamedPipe, TheExitEventEndsAnIdleWait) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    lPipe->create();
    lPipe->open();
    std::thread lThread([&] { EXPECT_NO_THROW(lPipe->waitForActivity(gcLongSeconds)); });
    getExitEvent().raise();
    lThread.join();
    EXPECT_NO_THROW(lPipe->waitForActivity(gcLongSeconds)) << "every later wait as well";
}

TEST_F(NamedPipe, ATrickleDoesNotHoldUpAnExit) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    std::atomic<bool> lHasReturned{false};
    std::thread lWaiter([&] {
        EXPECT_NO_THROW(lPipe->waitForActivity(gcLongSeconds));
        lHasReturned = true;
    });
    send(std::string("\x00\x10\x00\x00", 4));
    for (int lByte = 0; lByte < 5; ++lByte) {
        send("x");
        waitUntilTaken();
    }
    EXPECT_FALSE(lHasReturned);
    getExitEvent().raise();
    // The trickle goes on for as long as the wait does.
    while (!lHasReturned) {
        ASSERT_EQ(write(mSensor, "x", 1), 1);
        std::this_thread::yield();
    }
    lWaiter.join();
    EXPECT_EQ(mLog.countMark("-E-"), 0u);
}

static void sDoNothing(int) {}

TEST_F(NamedPipe, ASignalToTheThreadDoesNotEndItsWait) {
    struct sigaction lAction {};
    lAction.sa_handler = sDoNothing;
    ASSERT_EQ(sigaction(SIGUSR1, &lAction, nullptr), 0);
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewReader(mPath));
    openReader(*lPipe);
    std::atomic<bool> lHasReturned{false};
    std::thread lThread([&] {
        EXPECT_NO_THROW(lPipe->waitForActivity(gcLongSeconds));
        lHasReturned = true;
    });
    for (int lRound = 0; lRound < 20; ++lRound) {
        ASSERT_EQ(pthread_kill(lThread.native_handle(), SIGUSR1), 0);
        std::this_thread::sleep_for(milliseconds(1));
    }
    EXPECT_FALSE(lHasReturned);
    send(sFrame("x"));
    lThread.join();
    EXPECT_EQ(readMessage(*lPipe), "x");
}

// ---- Sending ----

TEST_F(NamedPipe, AMessageIsWrittenBehindItsLength) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    for (const std::string& lcrBody : {std::string("hello"), std::string(), std::string(5000, 'y')}) {
        unsigned lCount = 99;
        lPipe->write(sBuffer(lcrBody), lCount);
        EXPECT_EQ(lCount, lcrBody.size());
        EXPECT_EQ(sReadAll(mSensor, lcrBody.size() + 4), sFrame(lcrBody));
    }
}

TEST_F(NamedPipe, AMessageLargerThanThePipeIsWrittenAsItIsRead) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    std::string lBody(3000001, '\0');
    for (std::size_t lIndex = 0; lIndex < lBody.size(); ++lIndex) {
        lBody[lIndex] = static_cast<char>(lIndex % 251);
    }
    std::string lGot;
    std::thread lThread([&] { lGot = sReadAll(mSensor, lBody.size() + 4); });
    unsigned lCount = 0;
    lPipe->write(sBuffer(lBody), lCount);
    lThread.join();
    EXPECT_EQ(lCount, lBody.size());
    EXPECT_TRUE(lGot == sFrame(lBody));
}

TEST_F(NamedPipe, TheExitEventCutsAWriteWhoseReaderHasStoppedReading) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    const int lCapacity = fcntl(mSensor, F_GETPIPE_SZ);
    unsigned lCount = 0;
    std::string lText;
    std::thread lThread([&] {
        try {
            lPipe->write(sBuffer(std::string(1000000, 'z')), lCount);
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

TEST_F(NamedPipe, AMessageThatFitsIsWrittenEvenWhenTheThreadsAreToExit) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    getExitEvent().raise();
    unsigned lCount = 0;
    lPipe->write(sBuffer("bye"), lCount);
    EXPECT_EQ(sReadAll(mSensor, 7), sFrame("bye"));
}

TEST_F(NamedPipe, AReaderThatHasGoneIsAnException) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    closeSensor();
    unsigned lCount = 0;
    try {
        lPipe->write(sBuffer("hello"), lCount);
        FAIL() << "a message without a reader was written";
    } catch (const ZTCClibWriteFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find("0 of 9"), std::string::npos) << acrException.what();
    }
}

TEST_F(NamedPipe, AReaderThatGoesInTheMiddleOfAMessageIsAnException) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    openWriter(*lPipe);
    const int lCapacity = fcntl(mSensor, F_GETPIPE_SZ);
    std::atomic<bool> lIsRefused{false};
    std::thread lThread([&] {
        unsigned lCount = 0;
        try {
            lPipe->write(sBuffer(std::string(1000000, 'z')), lCount);
        } catch (const ZTCClibWriteFailedEx&) {
            lIsRefused = true;
        }
    });
    waitUntil([&] { return waitingBytes() == lCapacity; }, "the pipe being full");
    closeSensor();
    lThread.join();
    EXPECT_TRUE(lIsRefused);
}

TEST_F(NamedPipe, APipeThatIsNotOpenCannotBeWritten) {
    const ZTCPointer<ZTCNamedPipe> lPipe(sNewWriter(mPath));
    unsigned lCount = 0;
    EXPECT_THROW(lPipe->write(sBuffer("x"), lCount), ZTCClibWriteFailedEx);
}

TEST_F(NamedPipe, TakingOverAFifoThatOthersMayOpenDrawsAWarning) {
    for (const auto& [lMode, lWarnings] :
         {std::pair<mode_t, unsigned>{0600, 0}, {0400, 0}, {0620, 1}, {0602, 1}, {0644, 1}}) {
        ZTCLogCapture lLog;
        ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
        ASSERT_EQ(chmod(mPath.c_str(), lMode), 0);
        ZTCNamedPipe lPipe(ZTCString(mPath.c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
        lPipe.create();
        EXPECT_EQ(lLog.countMark("-W-"), lWarnings) << lMode;
        lPipe.destroy();
    }
}

TEST_F(NamedPipe, AFifoOfItsOwnDrawsNoWarning) {
    ZTCLogCapture lLog;
    ZTCNamedPipe lPipe(ZTCString(mPath.c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
    lPipe.create();
    EXPECT_EQ(lLog.countMark("-W-"), 0u);
}
