#include "common/include/LogSink.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <ctime>
#include <string>
#include <vector>

#include "tests/support/FailingAllocation.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/TestThreads.h"
#include "tests/unit/common/LogSinkTesting.h"

namespace {

using LogSink = ZTCLogSinkFixture;

}  // namespace

TEST_F(LogSink, LinesBeforeAPathAreHeldAndWrittenToIt) {
    writeTo(*mpSink, "one");
    writeTo(*mpSink, "two");
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- one", "-M- two", "-M- three"}), sinkLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, HeldLinesAreBoundedAndTheRestIsCounted) {
    const std::string lText(1019, 'x');  // 1024 bytes a line, with mark and line break
    for (int i = 0; i < 66; ++i) {
        writeTo(*mpSink, "%s", lText.c_str());
    }
    EXPECT_EQ(2 * 1024u, mStandardError.take().size());
    mpSink->setPath(mPath.c_str());
    const Lines lLines = sinkLines(mPath);
    ASSERT_EQ(65u, lLines.size());
    EXPECT_EQ("-M- " + lText, lLines[63]);
    EXPECT_EQ(lostReport(2, "too many lines before a log file was set"), lLines[64]);
}

TEST_F(LogSink, HeldLinesGoToStandardErrorWhereMemoryIsOut) {
    {
        ZTCFailingAllocation lFailure(1);
        writeTo(*mpSink, "one");
        EXPECT_TRUE(lFailure.hasFailed());
    }
    EXPECT_EQ("-M- one\n", mStandardError.take());
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{lostReport(1, "Cannot allocate memory"), "-M- two"}), sinkLines(mPath));
}

TEST_F(LogSink, HeldLinesAreSpilledOnceWhereNoPathIsEverSet) {
    writeTo(*mpSink, "one");
    mpSink->spillHeldLines();
    EXPECT_EQ("-M- one\n", mStandardError.take());
    mpSink->spillHeldLines();
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, HeldLinesThatCannotBeWrittenGoToStandardErrorAndAreCounted) {
    writeTo(*mpSink, "one");
    const std::string lLate = mDirectory.path("late");
    mPath = lLate + "/log";
    mpSink->setPath(mPath.c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("-M- one\n"));
    std::filesystem::create_directory(lLate);
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{lostReport(1, "No such file or directory"), "-M- two"}), sinkLines(mPath));
}

TEST_F(LogSink, LostLinesGoToStandardErrorAreCountedAndReportedWhenWritingWorksAgain) {
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "12345");  // 10 bytes with mark and line break
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 10);
        writeTo(*mpSink, "lost one");
        writeTo(*mpSink, "lost two");
    }
    EXPECT_EQ("-M- lost one\n-M- lost two\n", mStandardError.take());
    EXPECT_EQ((Lines{"-M- 12345"}), sinkLines(mPath));
    writeTo(*mpSink, "after");
    writeTo(*mpSink, "more");
    EXPECT_EQ((Lines{"-M- 12345", lostReport(2, "File too large"), "-M- after", "-M- more"}), sinkLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, OnceClosedItSaysNothingOfTheLinesThatItsFormerFileLost) {
    mpSink->setPath(mPath.c_str());
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 0);
        writeTo(*mpSink, "lost");
    }
    EXPECT_EQ("-M- lost\n", mStandardError.take());
    mpSink->close();
    const std::string lOther = mDirectory.path("other");
    mpSink->setPath(lOther.c_str());
    writeTo(*mpSink, "after");
    EXPECT_EQ((Lines{"-M- after"}), sinkLines(lOther));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, AStandardErrorThatNobodyReadsHoldsNothingUp) {
    ASSERT_EQ(0, fcntl(STDERR_FILENO, F_SETFL, 0)) << "a write that finds no room would wait for ever";
    mpSink->setPath(mPath.c_str());
    const std::string lText(1019, 'x');
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 0);
        for (int i = 0; i < 100; ++i) {
            writeTo(*mpSink, "%s", lText.c_str());
        }
    }
    const Lines lSaid = linesOf(mStandardError.take());
    EXPECT_LT(50u, lSaid.size());
    EXPECT_GT(65u, lSaid.size()) << "a pipe has room for 64 of them";
    EXPECT_EQ(Lines(lSaid.size(), "-M- " + lText), lSaid) << "what finds room is whole";
    writeTo(*mpSink, "after");
    EXPECT_EQ((Lines{lostReport(100, "File too large"), "-M- after"}), sinkLines(mPath));
}

TEST_F(LogSink, ALongLineWaitsForNoStandardErrorThatHasRoomForAPartOfItAlone) {
    ASSERT_EQ(0, fcntl(STDERR_FILENO, F_SETFL, 0)) << "a write that finds no room would wait for ever";
    mpSink->setPath("/dev/full");
    const std::string lText(10000, 'x');
    alarm(20);
    for (int i = 0; i < 20; ++i) {
        writeTo(*mpSink, "%s", lText.c_str());
    }
    alarm(0);
    const std::string lSaid = mStandardError.take();
    EXPECT_GT(lSaid.size(), 50000u);
    EXPECT_LT(lSaid.size(), 20 * lText.size());
}

TEST_F(LogSink, ALineThatIsCutByTheFileIsEndedBeforeTheNextOne) {
    mpSink->setPath(mPath.c_str());
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 10);
        writeTo(*mpSink, "a long line");
        EXPECT_EQ("-M- a long", readFile(mPath));
    }
    EXPECT_EQ("-M- a long line\n", mStandardError.take());
    writeTo(*mpSink, "after");
    EXPECT_EQ((Lines{"-M- a long", lostReport(1, "File too large"), "-M- after"}), sinkLines(mPath));
}

TEST_F(LogSink, WithoutWarningsTheCountIsKept) {
    mpSink->setPath("/dev/full");
    writeTo(*mpSink, "lost");
    setLogCode(ZTLL_Halt);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    setLogCode(gcDefaultLogCode);
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", lostReport(1, "No space left on device"), "-M- two"}), sinkLines(mPath));
}

TEST_F(LogSink, AClosedPipeAsStandardErrorEndsNothing) {
    const auto lFormer = std::signal(SIGPIPE, SIG_DFL);
    mpSink->setPath("/dev/full");
    mStandardError.closeReader();
    writeTo(*mpSink, "lost");
    writeTo(*mpSink, "lost too");
    std::signal(SIGPIPE, lFormer);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{lostReport(2, "No space left on device"), "-M- one"}), sinkLines(mPath));
}

TEST_F(LogSink, ADescriptorTakenAwayIsReplaced) {
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    // The sink's is the one that names the file.
    for (const auto& lrEntry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code lError;
        if (std::filesystem::read_symlink(lrEntry.path(), lError) == std::filesystem::canonical(mPath)) {
            close(std::stoi(lrEntry.path().filename().string()));
            break;
        }
    }
    writeTo(*mpSink, "lost");
    EXPECT_EQ("-M- lost\n", mStandardError.take());
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", lostReport(1, "Bad file descriptor"), "-M- two"}), sinkLines(mPath));
}

TEST_F(LogSink, LinesOfManyThreadsNeverInterleave) {
    constexpr int lcThreads = 8;
    constexpr int lcLines = 300;
    mpSink->setPath(mPath.c_str());
    runOnThreads(lcThreads, [this](unsigned aThread) {
        for (int i = 0; i < lcLines; ++i) {
            const std::string lText(static_cast<std::size_t>(i * 17 % 3000), static_cast<char>('a' + aThread));
            writeTo(*mpSink, "%u %d %s", aThread, i, lText.c_str());
        }
    });
    std::vector<int> lNext(lcThreads, 0);
    const Lines lLines = linesOfFile(mPath);
    ASSERT_EQ(static_cast<std::size_t>(lcThreads * lcLines), lLines.size());
    for (const std::string& lrLine : lLines) {
        int lThread = -1;
        int lNumber = -1;
        ASSERT_EQ(2, std::sscanf(lrLine.c_str(), "-M- %d %d ", &lThread, &lNumber));
        ASSERT_EQ(lNext.at(static_cast<std::size_t>(lThread))++, lNumber);
        const std::string lText(static_cast<std::size_t>(lNumber * 17 % 3000), static_cast<char>('a' + lThread));
        ASSERT_EQ("-M- " + std::to_string(lThread) + " " + std::to_string(lNumber) + " " + lText, lrLine);
    }
}

TEST_F(LogSink, ProcessesThatShareAFileDoNotInterleave) {
    std::vector<pid_t> lChildren;
    for (int lChild = 0; lChild < 2; ++lChild) {
        const pid_t lPid = fork();
        ASSERT_GE(lPid, 0);
        if (lPid == 0) {
            mpSink->setPath(mPath.c_str());
            const std::string lText(200, static_cast<char>('a' + lChild));
            for (int i = 0; i < 500; ++i) {
                writeTo(*mpSink, "%s", lText.c_str());
            }
            _exit(0);
        }
        lChildren.push_back(lPid);
    }
    for (const pid_t lPid : lChildren) {
        int lStatus = -1;
        ASSERT_EQ(lPid, waitpid(lPid, &lStatus, 0));
        EXPECT_EQ(0, lStatus);
    }
    const Lines lLines = linesOfFile(mPath);
    EXPECT_EQ(1000u, lLines.size());
    for (const std::string& lrLine : lLines) {
        ASSERT_TRUE("-M- " + std::string(200, 'a') == lrLine || "-M- " + std::string(200, 'b') == lrLine) << lrLine;
    }
}

TEST_F(LogSink, ALineSurvivesTheProcessBeingKilledRightAfterTheCall) {
    const pid_t lPid = fork();
    ASSERT_GE(lPid, 0);
    if (lPid == 0) {
        mpSink->setPath(mPath.c_str());
        writeTo(*mpSink, "last words");
        raise(SIGKILL);
        _exit(0);
    }
    int lStatus = 0;
    ASSERT_EQ(lPid, waitpid(lPid, &lStatus, 0));
    EXPECT_TRUE(WIFSIGNALED(lStatus));
    EXPECT_EQ((Lines{"-M- last words"}), sinkLines(mPath));
}

TEST_F(LogSink, StampsAreLocalTimeAndNeverGoBack) {
    mpSink->setPath(mPath.c_str());
    const std::time_t lBefore = std::time(nullptr);
    for (int i = 0; i < 100; ++i) {
        ZTCLogLine lLine("-N-", 1, "function", "File");
        std::va_list lNone = {};
        lLine.finish("text", lNone);
        mpSink->write(lLine);
    }
    const std::time_t lAfter = std::time(nullptr);
    std::string lFormer;
    for (const std::string& lrLine : linesOfFile(mPath)) {
        EXPECT_EQ("-N- File:1 function: text", withoutStamp(lrLine));
        const std::string lStamp = lrLine.substr(0, ZTCLogLine::gcStampLength);
        EXPECT_LE(lFormer, lStamp);
        lFormer = lStamp;
        std::tm lLocal{};
        ASSERT_NE(nullptr, strptime(lStamp.c_str(), "%Y-%m-%d %H:%M:%S", &lLocal));
        lLocal.tm_isdst = -1;
        const std::time_t lTime = std::mktime(&lLocal);
        EXPECT_GE(lTime, lBefore);
        EXPECT_LE(lTime, lAfter);
    }
    EXPECT_FALSE(lFormer.empty());
}
