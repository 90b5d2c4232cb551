/// What the tests of a named pipe share: a FIFO in a directory of the test's own, the sensor's end of it, a log, and
/// events that are down before and after.
#ifndef TESTS_UNIT_OS_NAMEDPIPETESTING_H
#define TESTS_UNIT_OS_NAMEDPIPETESTING_H

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <chrono>
#include <string>

#include "common/include/Memory.h"
#include "os/common/include/NamedPipe.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/support/Waiting.h"
#include "tests/unit/os/LogCapture.h"

inline constexpr unsigned gcLongSeconds = 60;

inline std::string frameOf(const std::string& acrBody) {
    std::string lFrame;
    for (int lShift = 24; lShift >= 0; lShift -= 8) {
        lFrame += static_cast<char>((acrBody.size() >> lShift) & 0xff);
    }
    return lFrame + acrBody;
}

inline ZTCPointer<ZTCBuffer> bufferOf(const std::string& acrText) {
    ZTCPointer<ZTCBuffer> lBuffer(NEW ZTCBuffer());
    lBuffer->append(acrText.data(), static_cast<Size>(acrText.size()));
    return lBuffer;
}

inline std::string readAll(int aDescriptor, std::size_t aSize) {
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
class ZTCNamedPipeFixture : public testing::Test {
protected:
    ZTCNamedPipeFixture() : mPath(mDirectory.path("test.fifo")) {
        signal(SIGPIPE, SIG_IGN);
        getStopEvent().reset();
        getExitEvent().reset();
    }
    ~ZTCNamedPipeFixture() override {
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

inline ZTCString pathText(const std::string& acrPath) {
    return ZTCString(acrPath.c_str());
}

inline ZTCNamedPipe* newReader(const std::string& acrPath) {
    return NEW ZTCNamedPipe(pathText(acrPath), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server);
}

inline ZTCNamedPipe* newWriter(const std::string& acrPath, ZTEPipeState aState = ZTNPS_Block) {
    return NEW ZTCNamedPipe(pathText(acrPath), ZTFM_Write, aState, ZTCM_Server);
}

#endif
