#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

#include <string>

#include "sensor/client/include/FifoConversation.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"

using testing::HasSubstr;

/// Fills a FIFO again whenever it has room, for as long as it lives. Gives up by itself when a test has hung.
class ZTCEndlessWriter {
public:
    explicit ZTCEndlessWriter(const std::string& acrPath)
        : mReader(ZTCFileDescriptor::open(acrPath.c_str(), O_RDONLY | O_NONBLOCK)),
          mWriter(ZTCFileDescriptor::open(acrPath.c_str(), O_WRONLY | O_NONBLOCK)),
          mThread([this](const std::stop_token& acrStop) { run(acrStop); }) {
        pollfd lBytes{.fd = mReader.get(), .events = POLLIN, .revents = 0};
        EXPECT_EQ(poll(&lBytes, 1, ZTCDeadline().remainingMilliseconds()), 1);
    }

private:
    void run(const std::stop_token& acrStop) {
        const std::string lBytes(4096, 'x');
        for (const ZTCDeadline lDeadline; !acrStop.stop_requested() && !lDeadline.isOver();) {
            if (write(mWriter.get(), lBytes.data(), lBytes.size()) < 0) {
                pollfd lRoom{.fd = mWriter.get(), .events = POLLOUT, .revents = 0};
                poll(&lRoom, 1, 20);
            }
        }
    }

    const ZTCFileDescriptor mReader;  ///< keeps the FIFO's bytes while nobody else reads it
    const ZTCFileDescriptor mWriter;
    ZTCTestThread mThread;  ///< ends first
};

TEST(StaleBytes, WithoutAnEndAreGivenUpAtTheTimeLimit) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::silent()});
    const ZTCEndlessWriter lWriter(lDirectory.path("qrvtvkout.fifo"));
    ZTCFifoConversation lConversation(lDirectory.path());
    try {
        lConversation.connect(ZTCTimeLimit(std::chrono::milliseconds(60)));
        ADD_FAILURE() << "it has taken an earlier answer without an end for ended";
    } catch (const ZTCNoAnswerEx& lrEx) {
        EXPECT_EQ(lrEx.getReason(), ZTNA_Silence);
        EXPECT_THAT(lrEx.what(), HasSubstr("is still sending an earlier answer"));
    }
    EXPECT_FALSE(lConversation.isConnected());
}
