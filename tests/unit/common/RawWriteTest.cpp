#include "common/include/RawWrite.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

/// In a process of its own: what the signals do by default, whatever started the tests.
void sHandleByDefault(int aSignal) {
    signal(aSignal, SIG_DFL);
    sigset_t lSignals;
    sigemptyset(&lSignals);
    sigaddset(&lSignals, aSignal);
    pthread_sigmask(SIG_UNBLOCK, &lSignals, nullptr);
}

[[noreturn]] void sWriteToAFileAtItsLimit() {
    sHandleByDefault(SIGXFSZ);
    std::FILE* const lpFile = std::tmpfile();
    dup2(fileno(lpFile), STDERR_FILENO);
    const struct rlimit lLimit = {4, 4};
    setrlimit(RLIMIT_FSIZE, &lLimit);
    writeToStandardError("four", 4);
    writeToStandardError("more", 4);
    std::_Exit(lseek(fileno(lpFile), 0, SEEK_END) == 4 ? 0 : 1);
}

[[noreturn]] void sWriteToAPipeThatNobodyReads() {
    sHandleByDefault(SIGPIPE);
    int lEnds[2];
    if (pipe(lEnds) != 0) {
        std::_Exit(1);
    }
    dup2(lEnds[1], STDERR_FILENO);
    close(lEnds[0]);
    writeToStandardError("lost", 4);
    std::_Exit(0);
}

}  // namespace

TEST(RawWrite, AStandardErrorAtTheLimitOnFileSizesEndsNoProcess) {
    EXPECT_EXIT(sWriteToAFileAtItsLimit(), testing::ExitedWithCode(0), "");
}

TEST(RawWrite, AStandardErrorThatNobodyReadsEndsNoProcess) {
    EXPECT_EXIT(sWriteToAPipeThatNobodyReads(), testing::ExitedWithCode(0), "");
}

TEST(RawWrite, WhatAFullPipeTakesIsCountedBeforeTheErrorIsReturned) {
    int lEnds[2];
    ASSERT_EQ(0, pipe2(lEnds, O_NONBLOCK | O_CLOEXEC));
    const auto lRoom = static_cast<std::size_t>(fcntl(lEnds[1], F_GETPIPE_SZ));
    const std::string lBytes(lRoom + 1000, 'x');
    std::size_t lWritten = 0;
    EXPECT_EQ(EAGAIN, writeAll(lEnds[1], lBytes.data(), lBytes.size(), lWritten));
    EXPECT_EQ(lRoom, lWritten);
    close(lEnds[0]);
    close(lEnds[1]);
}

TEST(RawWrite, ADescriptorThatIsNotOpenIsAnError) {
    std::size_t lWritten = 1;
    EXPECT_EQ(EBADF, writeAll(-1, "x", 1, lWritten));
    EXPECT_EQ(0U, lWritten);
}
