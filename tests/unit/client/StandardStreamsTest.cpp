#include "sensor/client/include/StandardStreams.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <string>
#include <vector>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/ChildFunction.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

/// Closes these descriptors, reserves the standard streams and opens a file. Returns its descriptor.
static int sDescriptorAfterClosing(const std::vector<int>& acrClosed) {
    return statusOfChild([&] {
        for (const int lDescriptor : acrClosed) {
            close(lDescriptor);
        }
        const bool lHadOutput = reserveStandardStreams();
        const bool lExpected = std::find(acrClosed.begin(), acrClosed.end(), STDOUT_FILENO) == acrClosed.end();
        return lHadOutput == lExpected ? open("/dev/null", O_RDONLY) : 0;
    });
}

TEST(StandardStreams, NoOtherFileGetsTheNumberOfAStreamThatTheParentHasClosed) {
    for (const std::vector<int>& lrClosed :
         std::vector<std::vector<int>>{{0}, {1}, {2}, {0, 1}, {1, 2}, {0, 1, 2}, {}}) {
        EXPECT_GT(sDescriptorAfterClosing(lrClosed), STDERR_FILENO) << lrClosed.size() << " were closed";
    }
}

TEST(StandardStreams, WithoutStandardOutputAProgramThatPrintsIsRefused) {
    EXPECT_EQ(statusOfChild([] {
                  close(STDOUT_FILENO);
                  try {
                      requireStandardOutput();
                  } catch (const ZTCSystemCallEx& lrEx) {
                      return lrEx.getErrno() == EBADF ? 7 : 1;
                  }
                  return 2;
              }),
              7);
    EXPECT_EQ(statusOfChild([] {
                  requireStandardOutput();
                  return 7;
              }),
              7);
}

TEST(StandardStreams, AllIsWrittenWhereStandardOutputIsAPipeThatIsFullAndDoesNotBlock) {
    std::string lText;
    for (int i = 0; lText.size() < 1000000; ++i) {
        lText += std::to_string(i) + "\n";
    }
    int lPipe[2];
    ASSERT_EQ(pipe2(lPipe, O_CLOEXEC), 0);
    std::fflush(nullptr);  // a sanitizer's _exit() writes what is left
    const pid_t lChild = fork();
    if (lChild == 0) {
        dup2(lPipe[1], STDOUT_FILENO);
        fcntl(STDOUT_FILENO, F_SETFL, O_NONBLOCK);
        writeOutput(lText);
        _exit(7);
    }
    close(lPipe[1]);
    const auto lSleeps = [lChild] {
        const std::string lStatus = readFile("/proc/" + std::to_string(lChild) + "/stat");
        return lStatus.find(") S ") != std::string::npos;
    };
    waitUntil(lSleeps, "the writer to wait for room without spinning");
    std::string lRead;
    char lBuffer[4096];
    for (ssize_t lCount; (lCount = read(lPipe[0], lBuffer, sizeof(lBuffer))) > 0;) {
        lRead.append(lBuffer, static_cast<std::size_t>(lCount));
    }
    close(lPipe[0]);
    int lStatus = -1;
    ASSERT_EQ(waitpid(lChild, &lStatus, 0), lChild);
    EXPECT_TRUE(WIFEXITED(lStatus) && WEXITSTATUS(lStatus) == 7) << lStatus;
    EXPECT_TRUE(lRead == lText) << lRead.size() << " bytes came, of "
                                << lText.size();  // too much for a comparison of lines
}

TEST(StandardStreams, AnErrorOfTheOutputSaysHowMuchWasWritten) {
    EXPECT_EQ(statusOfChild([] {
                  const int lFull = open("/dev/full", O_WRONLY);
                  dup2(lFull, STDOUT_FILENO);
                  try {
                      writeOutput("abc");
                  } catch (const ZTCSystemCallEx& lrEx) {
                      return std::string(lrEx.what()).find("0 of 3 bytes") != std::string::npos ? 7 : 1;
                  }
                  return 2;
              }),
              7);
}
