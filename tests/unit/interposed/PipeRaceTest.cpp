#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "os/common/include/Descriptor.h"
#include "os/common/include/NamedPipe.h"
#include "os/common/include/ProcessEvents.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/os/LogCapture.h"

namespace {

class PipeRace : public testing::Test {
protected:
    PipeRace() { mPipe.create(); }

    std::vector<int> findWaits(const std::string& acrFirstBytes);

    ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("a.fifo");
    ZTCNamedPipe mPipe{ZTCString(mPath.c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server};
};

/// The time of each wait of a pipe that waits for 3 s, on a clock that only this test moves: 2 s pass before each of
/// the two messages, of which the pipe gets these bytes.
std::vector<int> PipeRace::findWaits(const std::string& acrFirstBytes) {
    mPipe.open();
    const ZTCDescriptor lWriter(open(mPath.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC));
    std::int64_t lNow = 1000;
    std::vector<int> lWaits;
    const ZTCReplacement lClock(gReplaced.mMonotonicMilliseconds, [&] { return lNow; });
    const ZTCReplacement lPoll(gReplaced.mBeforePoll, [&](const struct pollfd*, unsigned aCount, int aMilliseconds) {
        if (aCount != 2) {
            return;
        }
        lWaits.push_back(aMilliseconds);
        if (lWaits.size() > 1) {
            getExitEvent().raise();
            return;
        }
        lNow += 2000;
        EXPECT_EQ(static_cast<ssize_t>(acrFirstBytes.size()),
                  write(lWriter.get(), acrFirstBytes.data(), acrFirstBytes.size()));
    });
    mPipe.waitForActivity(std::chrono::seconds(3));
    getExitEvent().reset();
    return lWaits;
}

}  // namespace

TEST_F(PipeRace, AFifoThatIsReplacedBetweenItsTwoOpensIsRefused) {
    unsigned lOpens = 0;
    int lOther = -1;  // somebody who reads the one that took its place
    const ZTCReplacement lOpen(gReplaced.mBeforeOpen, [&](const char*) {
        if (++lOpens == 2) {
            unlink(mPath.c_str());
            ASSERT_EQ(0, mkfifo(mPath.c_str(), 0600));
            lOther = open(mPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        }
    });
    try {
        mPipe.open();
        FAIL() << "the reader would wait on one FIFO and its own writer hold another";
    } catch (const ZTCClibOpenFailedEx& acrException) {
        EXPECT_EQ("Opening the FIFO '" + mPath + "' failed: it was replaced meanwhile",
                  std::string(acrException.what()));
    }
    EXPECT_EQ(2u, lOpens);
    close(lOther);
}

TEST_F(PipeRace, AWriterSaysOnceThatItWaitsHoweverOftenItTries) {
    const ZTCLogCapture lLog;
    const std::string lPath = mDirectory.path("b.fifo");
    ZTCNamedPipe lWriter(ZTCString(lPath.c_str()), ZTFM_Write, ZTNPS_Block, ZTCM_Server);
    lWriter.create();
    unsigned lWaits = 0;
    int lReader = -1;
    const ZTCReplacement lPoll(gReplaced.mBeforePoll, [&](const struct pollfd*, unsigned, int) {
        if (++lWaits == 3) {
            lReader = open(lPath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        }
    });
    lWriter.open();
    EXPECT_LE(3u, lWaits);
    EXPECT_EQ(1u, lLog.file().count("Waiting for a reader of '" + lPath + "'", "-N-"));
    close(lReader);
}

TEST_F(PipeRace, AMessageOfNoLengthGoesWithAllThatItsWriterHasBehindIt) {
    ZTCLogCapture lLog(63);
    mPipe.open();
    const ZTCDescriptor lWriter(open(mPath.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC));
    ASSERT_GE(lWriter.get(), 0);
    // A length of 0, and zeros behind it: more than the pipe holds, written on whenever it is waited for.
    std::size_t lLeft = 200 * 1024;
    const auto lWriteOn = [&] {
        const std::vector<char> lZeros(lLeft, 0);
        const ssize_t lCount = write(lWriter.get(), lZeros.data(), lZeros.size());
        lLeft -= lCount > 0 ? static_cast<std::size_t>(lCount) : 0;
    };
    lWriteOn();
    ASSERT_GT(lLeft, 0u);
    {
        const ZTCReplacement lPoll(gReplaced.mBeforePoll, [&](const struct pollfd*, unsigned, int) { lWriteOn(); });
        EXPECT_THROW(mPipe.waitForActivity(std::chrono::milliseconds(1)), ZTCTimeOutEx);
    }
    EXPECT_EQ(0u, lLeft);
    EXPECT_EQ(1u, lLog.countMark("-E-")) << "one message, one line";

    // The next message is served.
    ASSERT_EQ(5, write(lWriter.get(), "\0\0\0\1x", 5));
    mPipe.waitForActivity(std::chrono::seconds(20));
    ZTCPointer<ZTCBuffer> lBuffer;
    unsigned lCount = 0;
    mPipe.read(lBuffer, lCount);
    EXPECT_EQ(1u, lCount);
    EXPECT_EQ('x', lBuffer->getData()[0]);
}

TEST_F(PipeRace, WhileAMessageArrivesTheTimeCountsFromItsLastByte) {
    EXPECT_EQ((std::vector<int>{3000, 3000}), findWaits(std::string("\0\0\0\5h", 5)));
}

TEST_F(PipeRace, ABrokenMessageProlongsNoWait) {
    const ZTCLogCapture lLog(63);
    EXPECT_EQ((std::vector<int>{3000, 1000}), findWaits(std::string(4, '\0')));
    EXPECT_EQ(1u, lLog.countMark("-E-"));
}
