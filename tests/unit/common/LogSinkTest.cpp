#include "common/include/LogSink.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "tests/support/FailingAllocation.h"
#include "tests/support/ResourceLimit.h"
#include "tests/unit/common/LogTesting.h"

namespace {

std::uint64_t sNowMs = 0;

std::uint64_t sTestClock() noexcept {
    return sNowMs;
}

void sWriteTo(ZTCLogSink& arSink, const char* apFormat, ...) __attribute__((format(printf, 2, 3)));
void sWriteTo(ZTCLogSink& arSink, const char* apFormat, ...) {
    ZTCLogLine lLine("-M-");
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    lLine.finish(apFormat, lArguments);
    va_end(lArguments);
    arSink.write(lLine);
}

/// The same with a stamp; returns the length of the line.
std::size_t sWriteStampedTo(ZTCLogSink& arSink, const char* apFormat, ...) __attribute__((format(printf, 2, 3)));
std::size_t sWriteStampedTo(ZTCLogSink& arSink, const char* apFormat, ...) {
    ZTCLogLine lLine("-M-", 1, "function", "file");
    std::va_list lArguments;
    va_start(lArguments, apFormat);
    lLine.finish(apFormat, lArguments);
    va_end(lArguments);
    arSink.write(lLine);
    return lLine.getLength();
}

/// The lines of a file; those that the log has written about itself are mark and text alone.
std::vector<std::string> sLines(const std::string& acrPath) {
    std::vector<std::string> lLines;
    for (const std::string& lrLine : linesOfFile(acrPath)) {
        const std::string lText = withoutLineNumber(withoutStamp(lrLine));
        const bool lIsOwn = 0 == lText.find("-W- common/src/LogSink:# ");
        lLines.push_back(lIsOwn ? "-W- " + lText.substr(lText.find(": ") + 2) : lrLine);
    }
    return lLines;
}

using Lines = std::vector<std::string>;

/// A file of the test's own, a clock that the test moves, and standard error in the test's hands.
class LogSink : public testing::Test {
protected:
    LogSink() {
        sNowMs = 1000000;
        mpSink->setClock(&sTestClock);
        setLogCode(gcDefaultLogCode);
    }
    ~LogSink() override {
        mpSink->close();
        setLogCode(gcDefaultLogCode);
    }

    std::string lostReport(unsigned aCount, const std::string& acrReason) const {
        return "-W- " + std::to_string(aCount) + " log lines could not be written to '" + mPath +
               "' and went to standard error: " + acrReason;
    }

    ZTCTemporaryDirectory mDirectory;
    std::string mPath = mDirectory.path("log");
    ZTCCapturedStandardError mStandardError;
    std::unique_ptr<ZTCLogSink> mpSink = std::make_unique<ZTCLogSink>();
};

}  // namespace

TEST_F(LogSink, LinesBeforeAPathAreHeldAndWrittenToIt) {
    sWriteTo(*mpSink, "one");
    sWriteTo(*mpSink, "two");
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- one", "-M- two", "-M- three"}), sLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, HeldLinesAreBoundedAndTheRestIsCounted) {
    const std::string lText(1019, 'x');  // 1024 bytes a line, with mark and line break
    for (int i = 0; i < 66; ++i) {
        sWriteTo(*mpSink, "%s", lText.c_str());
    }
    EXPECT_EQ(2 * 1024u, mStandardError.take().size());
    mpSink->setPath(mPath.c_str());
    const Lines lLines = sLines(mPath);
    ASSERT_EQ(65u, lLines.size());
    EXPECT_EQ("-M- " + lText, lLines[63]);
    EXPECT_EQ(lostReport(2, "too many lines before a log file was set"), lLines[64]);
}

TEST_F(LogSink, HeldLinesGoToStandardErrorWhereMemoryIsOut) {
    {
        ZTCFailingAllocation lFailure(1);
        sWriteTo(*mpSink, "one");
        EXPECT_TRUE(lFailure.hasFailed());
    }
    EXPECT_EQ("-M- one\n", mStandardError.take());
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{lostReport(1, "Cannot allocate memory"), "-M- two"}), sLines(mPath));
}

TEST_F(LogSink, HeldLinesAreSpilledOnceWhereNoPathIsEverSet) {
    sWriteTo(*mpSink, "one");
    mpSink->spillHeldLines();
    EXPECT_EQ("-M- one\n", mStandardError.take());
    mpSink->spillHeldLines();
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, APathIsMadeAbsoluteWhenItIsSet) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    std::filesystem::current_path(mDirectory.path());
    mpSink->setPath("log");
    std::filesystem::current_path(lFormer);
    std::filesystem::remove(mPath);
    mpSink->reopen();
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, AnEmptyPathChangesNothing) {
    mpSink->setPath(mPath.c_str());
    mpSink->setPath("");
    mpSink->setPath(nullptr);
    EXPECT_EQ(2u, linesOf(mStandardError.take()).size());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, APathThatIsTooLongChangesNothing) {
    mpSink->setPath(mPath.c_str());
    mpSink->setPath(("/" + std::string(PATH_MAX, 'x')).c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("its path is too long"));
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, ANewPathTakesOverFromTheFormerOne) {
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    mpSink->setPath(mDirectory.path("other").c_str());
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
    EXPECT_EQ((Lines{"-M- two"}), sLines(mDirectory.path("other")));
}

TEST_F(LogSink, TheFileIsMade0640LessTheUmask) {
    const mode_t lFormer = umask(0);
    mpSink->setPath(mPath.c_str());
    umask(027);
    mpSink->setPath(mDirectory.path("narrower").c_str());
    umask(077);
    mpSink->setPath(mDirectory.path("narrowest").c_str());
    umask(lFormer);
    struct stat lStatus {};
    ASSERT_EQ(0, stat(mPath.c_str(), &lStatus));
    EXPECT_EQ(0640u, lStatus.st_mode & 07777u);
    ASSERT_EQ(0, stat(mDirectory.path("narrower").c_str(), &lStatus));
    EXPECT_EQ(0640u, lStatus.st_mode & 07777u);
    ASSERT_EQ(0, stat(mDirectory.path("narrowest").c_str(), &lStatus));
    EXPECT_EQ(0600u, lStatus.st_mode & 07777u);
}

TEST_F(LogSink, LinesAreAppendedToAnExistingFile) {
    writeFile(mPath, "before\n");
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"before", "-M- one"}), sLines(mPath));
}

TEST_F(LogSink, AFileThatEndsInsideOfALineIsEndedFirst) {
    writeFile(mPath, "before\ntorn");
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"before", "torn", "-M- one"}), sLines(mPath));
}

TEST_F(LogSink, ASymbolicLinkIsRefusedAndItsTargetUntouched) {
    const std::string lTarget = mDirectory.path("target");
    writeFile(lTarget, "precious\n");
    std::filesystem::create_symlink(lTarget, mPath);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ("precious\n", readFile(lTarget));
    const Lines lSaid = linesOf(mStandardError.take());
    ASSERT_EQ(2u, lSaid.size());
    EXPECT_NE(std::string::npos, lSaid[0].find("Cannot open the log file '" + mPath + "': Too many levels"));
    EXPECT_EQ("-M- one", lSaid[1]);
}

TEST_F(LogSink, ADanglingSymbolicLinkIsNotFollowedEither) {
    std::filesystem::create_symlink(mDirectory.path("target"), mPath);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_FALSE(std::filesystem::exists(mDirectory.path("target")));
}

TEST_F(LogSink, AFifoIsRefusedWithoutWaiting) {
    ASSERT_EQ(0, mkfifo(mPath.c_str(), 0600));
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    const std::string lSaid = mStandardError.take();
    EXPECT_NE(std::string::npos, lSaid.find("neither a regular file nor a character device"));
    EXPECT_NE(std::string::npos, lSaid.find("-M- one\n"));
}

TEST_F(LogSink, ADirectoryIsRefused) {
    mpSink->setPath(mDirectory.path().c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("Is a directory"));
    sWriteTo(*mpSink, "one");
    EXPECT_EQ("-M- one\n", mStandardError.take());
}

TEST_F(LogSink, ACharacterDeviceIsAccepted) {
    mpSink->setPath("/dev/null");
    sWriteTo(*mpSink, "one");
    EXPECT_EQ("", mStandardError.take());
    mpSink->setPath("/dev/full");
    sWriteTo(*mpSink, "two");
    EXPECT_EQ("-M- two\n", mStandardError.take());
}

TEST_F(LogSink, AFileThatCannotBeOpenedIsTriedAgainAtMostOnceASecond) {
    const std::string lLate = mDirectory.path("late");
    const std::string lPath = lLate + "/log";
    mpSink->setPath(lPath.c_str());
    std::filesystem::create_directory(lLate);
    sNowMs += ZTCLogSink::gcRetryIntervalMs - 1;
    sWriteTo(*mpSink, "one");
    EXPECT_FALSE(std::filesystem::exists(lPath));
    sNowMs += 1;
    sWriteTo(*mpSink, "two");
    mPath = lPath;
    EXPECT_EQ((Lines{lostReport(1, "No such file or directory"), "-M- two"}), sLines(lPath));
}

TEST_F(LogSink, HeldLinesThatCannotBeWrittenGoToStandardErrorAndAreCounted) {
    sWriteTo(*mpSink, "one");
    const std::string lLate = mDirectory.path("late");
    mPath = lLate + "/log";
    mpSink->setPath(mPath.c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("-M- one\n"));
    std::filesystem::create_directory(lLate);
    sNowMs += ZTCLogSink::gcRetryIntervalMs;
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{lostReport(1, "No such file or directory"), "-M- two"}), sLines(mPath));
}

TEST_F(LogSink, LostLinesGoToStandardErrorAreCountedAndReportedWhenWritingWorksAgain) {
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "12345");  // 10 bytes with mark and line break
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 10);
        sWriteTo(*mpSink, "lost one");
        sWriteTo(*mpSink, "lost two");
    }
    EXPECT_EQ("-M- lost one\n-M- lost two\n", mStandardError.take());
    EXPECT_EQ((Lines{"-M- 12345"}), sLines(mPath));
    sWriteTo(*mpSink, "after");
    sWriteTo(*mpSink, "more");
    EXPECT_EQ((Lines{"-M- 12345", lostReport(2, "File too large"), "-M- after", "-M- more"}), sLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, AStandardErrorThatNobodyReadsHoldsNothingUp) {
    ASSERT_EQ(0, fcntl(STDERR_FILENO, F_SETFL, 0)) << "a write that finds no room would wait for ever";
    mpSink->setPath(mPath.c_str());
    const std::string lText(1019, 'x');
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 0);
        for (int i = 0; i < 100; ++i) {
            sWriteTo(*mpSink, "%s", lText.c_str());
        }
    }
    const Lines lSaid = linesOf(mStandardError.take());
    EXPECT_LT(50u, lSaid.size());
    EXPECT_GT(65u, lSaid.size()) << "a pipe has room for 64 of them";
    EXPECT_EQ(Lines(lSaid.size(), "-M- " + lText), lSaid) << "what finds room is whole";
    sWriteTo(*mpSink, "after");
    EXPECT_EQ((Lines{lostReport(100, "File too large"), "-M- after"}), sLines(mPath));
}

TEST_F(LogSink, ALineThatIsCutByTheFileIsEndedBeforeTheNextOne) {
    mpSink->setPath(mPath.c_str());
    {
        const ZTCResourceLimit lLimit(RLIMIT_FSIZE, 10);
        sWriteTo(*mpSink, "a long line");
        EXPECT_EQ("-M- a long", readFile(mPath));
    }
    EXPECT_EQ("-M- a long line\n", mStandardError.take());
    sWriteTo(*mpSink, "after");
    EXPECT_EQ((Lines{"-M- a long", lostReport(1, "File too large"), "-M- after"}), sLines(mPath));
}

TEST_F(LogSink, WithoutWarningsTheCountIsKept) {
    mpSink->setPath("/dev/full");
    sWriteTo(*mpSink, "lost");
    setLogCode(ZTLL_Halt);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    setLogCode(gcDefaultLogCode);
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", lostReport(1, "No space left on device"), "-M- two"}), sLines(mPath));
}

TEST_F(LogSink, AClosedPipeAsStandardErrorEndsNothing) {
    const auto lFormer = std::signal(SIGPIPE, SIG_DFL);
    mpSink->setPath("/dev/full");
    mStandardError.closeReader();
    sWriteTo(*mpSink, "lost");
    sWriteTo(*mpSink, "lost too");
    std::signal(SIGPIPE, lFormer);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{lostReport(2, "No space left on device"), "-M- one"}), sLines(mPath));
}

TEST_F(LogSink, ADescriptorTakenAwayIsReplaced) {
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    // The sink's is the one that names the file.
    for (const auto& lrEntry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code lError;
        if (std::filesystem::read_symlink(lrEntry.path(), lError) == std::filesystem::canonical(mPath)) {
            close(std::stoi(lrEntry.path().filename().string()));
            break;
        }
    }
    sWriteTo(*mpSink, "lost");
    EXPECT_EQ("-M- lost\n", mStandardError.take());
    sNowMs += ZTCLogSink::gcRetryIntervalMs;
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", lostReport(1, "Bad file descriptor"), "-M- two"}), sLines(mPath));
}

TEST_F(LogSink, TheStandardDescriptorsAreLeftAlone) {
    const int lInput = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
    close(STDIN_FILENO);
    mpSink->setPath(mPath.c_str());
    EXPECT_EQ(-1, fcntl(STDIN_FILENO, F_GETFD));
    if (lInput >= 0) {
        dup2(lInput, STDIN_FILENO);
        close(lInput);
    }
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, ProgramsThatAreStartedDoNotInheritTheFile) {
    mpSink->setPath(mPath.c_str());
    bool lIsFound = false;
    for (const auto& lrEntry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code lError;
        if (std::filesystem::read_symlink(lrEntry.path(), lError) == std::filesystem::canonical(mPath)) {
            lIsFound = true;
            EXPECT_EQ(FD_CLOEXEC, fcntl(std::stoi(lrEntry.path().filename().string()), F_GETFD));
        }
    }
    EXPECT_TRUE(lIsFound);
}

TEST_F(LogSink, AtItsBoundTheFileIsRenamedAndBegunAnew) {
    mpSink->allowRotation(true);
    mpSink->setBound(30);
    mpSink->setPath(mPath.c_str());
    for (const char* lpText : {"12345", "23456", "34567"}) {
        sWriteTo(*mpSink, "%s", lpText);
    }
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1")) << "30 bytes are within the bound";
    sWriteTo(*mpSink, "45678");
    EXPECT_EQ((Lines{"-M- 12345", "-M- 23456", "-M- 34567"}), sLines(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 45678"}), sLines(mPath));
    for (const char* lpText : {"56789", "67890", "78901"}) {
        sWriteTo(*mpSink, "%s", lpText);
    }
    EXPECT_EQ((Lines{"-M- 45678", "-M- 56789", "-M- 67890"}), sLines(mPath + ".1")) << "the one before is replaced";
    EXPECT_EQ((Lines{"-M- 78901"}), sLines(mPath));
    EXPECT_FALSE(std::filesystem::exists(mPath + ".2"));
}

TEST_F(LogSink, WhatOthersWriteIntoTheFileCountsTowardsTheBound) {
    constexpr std::uint64_t lcBound = 1024 * 1024;
    mpSink->allowRotation(true);
    mpSink->setBound(lcBound);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    std::filesystem::resize_file(mPath, lcBound);
    sWriteTo(*mpSink, "two");
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- two"}), sLines(mPath));

    // A file that somebody has cut is far from the bound again.
    std::filesystem::resize_file(mPath, lcBound - 1);
    std::filesystem::resize_file(mPath, 0);
    sWriteTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- three"}), sLines(mPath));
    EXPECT_EQ(lcBound, std::filesystem::file_size(mPath + ".1"));
}

TEST_F(LogSink, ManyStampedLinesStayWithinTheBound) {
    constexpr std::uint64_t lcBound = 200 * 1024;
    mpSink->allowRotation(true);
    mpSink->setBound(lcBound);
    mpSink->setPath(mPath.c_str());
    std::uint64_t lWritten = 0;
    while (!std::filesystem::exists(mPath + ".1")) {
        lWritten += sWriteStampedTo(*mpSink, "line");
        ASSERT_LE(std::filesystem::file_size(mPath), lcBound);
    }
    EXPECT_EQ(lWritten, std::filesystem::file_size(mPath + ".1") + std::filesystem::file_size(mPath));
    EXPECT_GT(std::filesystem::file_size(mPath + ".1") + 100, lcBound);
}

TEST_F(LogSink, ALineLongerThanTheBoundIsWrittenIntoAFileOfItsOwn) {
    mpSink->allowRotation(true);
    mpSink->setBound(20);
    mpSink->setPath(mPath.c_str());
    const std::string lLong(50, 'x');
    sWriteTo(*mpSink, "%s", lLong.c_str());
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- " + lLong}), sLines(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, WhoIsNotAllowedToRotateWritesOn) {
    mpSink->setBound(10);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "12345");
    sWriteTo(*mpSink, "23456");
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 12345", "-M- 23456"}), sLines(mPath));
}

TEST_F(LogSink, TheBoundHoldsWhereTheFileCannotBeRenamed) {
    std::filesystem::create_directory(mPath + ".1");
    mpSink->allowRotation(true);
    mpSink->setBound(200);
    mpSink->setPath(mPath.c_str());
    const std::string lLong(190, 'x');
    sWriteTo(*mpSink, "%s", lLong.c_str());
    sWriteTo(*mpSink, "lost one");
    std::filesystem::remove(mPath + ".1");
    sWriteTo(*mpSink, "lost two");  // not yet tried again
    EXPECT_EQ("-M- lost one\n-M- lost two\n", mStandardError.take());
    EXPECT_EQ((Lines{"-M- " + lLong}), sLines(mPath));
    sNowMs += ZTCLogSink::gcRetryIntervalMs;
    mpSink->setBound(400);
    mpSink->setBound(200);
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- " + lLong}), sLines(mPath + ".1"));
    EXPECT_EQ("-M- one", sLines(mPath).back());
}

TEST_F(LogSink, ARenamedFileIsNotRotatedByItsFormerName) {
    mpSink->allowRotation(true);
    mpSink->setBound(10);
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "12345");
    std::filesystem::rename(mPath, mDirectory.path("moved"));
    writeFile(mPath, "foreign\n");
    sWriteTo(*mpSink, "1");
    EXPECT_FALSE(std::filesystem::exists(mPath + ".1"));
    EXPECT_EQ((Lines{"-M- 12345"}), sLines(mDirectory.path("moved")));
    EXPECT_EQ((Lines{"foreign", "-M- 1"}), sLines(mPath));
}

TEST_F(LogSink, ReopeningFollowsAFileThatWasRenamed) {
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "one");
    std::filesystem::rename(mPath, mDirectory.path("moved"));
    sWriteTo(*mpSink, "two");
    EXPECT_FALSE(std::filesystem::exists(mPath));
    mpSink->reopen();
    sWriteTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- one", "-M- two"}), sLines(mDirectory.path("moved")));
    EXPECT_EQ((Lines{"-M- three"}), sLines(mPath));
}

TEST_F(LogSink, ReopeningAfterARemovalMakesTheFileAnew) {
    mpSink->setPath(mPath.c_str());
    std::filesystem::remove(mPath);
    sWriteTo(*mpSink, "into the removed one");
    EXPECT_FALSE(std::filesystem::exists(mPath));
    mpSink->reopen();
    sWriteTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, AFailedReopeningKeepsTheFormerFileAndIsTriedAgain) {
    mpSink->setPath(mPath.c_str());
    const std::string lMoved = mDirectory.path("moved");
    std::filesystem::rename(mPath, lMoved);
    std::filesystem::create_directory(mPath);
    mpSink->reopen();
    sWriteTo(*mpSink, "one");
    std::filesystem::remove(mPath);
    sWriteTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-W- Cannot open the log file '" + mPath +
                         "' anew (Is a directory): lines go on into the former one until it can be opened",
                     "-M- one", "-M- two"}),
              sLines(lMoved));
    sNowMs += ZTCLogSink::gcRetryIntervalMs;
    sWriteTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- three"}), sLines(mPath));
}

TEST_F(LogSink, ReopeningWithoutAPathDoesNothing) {
    mpSink->reopen();
    sWriteTo(*mpSink, "one");
    mpSink->setPath(mPath.c_str());
    EXPECT_EQ((Lines{"-M- one"}), sLines(mPath));
}

TEST_F(LogSink, LinesOfManyThreadsNeverInterleave) {
    constexpr int lcThreads = 8;
    constexpr int lcLines = 300;
    mpSink->setPath(mPath.c_str());
    std::vector<std::thread> lThreads;
    for (int lThread = 0; lThread < lcThreads; ++lThread) {
        lThreads.emplace_back([this, lThread] {
            for (int i = 0; i < lcLines; ++i) {
                const std::string lText(static_cast<std::size_t>(i * 17 % 3000), static_cast<char>('a' + lThread));
                sWriteTo(*mpSink, "%d %d %s", lThread, i, lText.c_str());
            }
        });
    }
    for (std::thread& lrThread : lThreads) {
        lrThread.join();
    }
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

TEST_F(LogSink, ManyThreadsLoseNothingOverRotationsAndReopenings) {
    constexpr int lcThreads = 4;
    constexpr int lcLines = 200;
    mpSink->allowRotation(true);
    mpSink->setBound(lcThreads * lcLines * 7 / 2);  // one rotation in all
    mpSink->setPath(mPath.c_str());
    std::vector<std::thread> lThreads;
    for (int lThread = 0; lThread < lcThreads; ++lThread) {
        lThreads.emplace_back([this] {
            for (int i = 0; i < lcLines; ++i) {
                sWriteTo(*mpSink, "xx");  // 7 bytes with mark and line break
                if (0 == i % 50) {
                    mpSink->reopen();
                }
            }
        });
    }
    for (std::thread& lrThread : lThreads) {
        lrThread.join();
    }
    EXPECT_EQ(static_cast<std::size_t>(lcThreads * lcLines), sLines(mPath).size() + sLines(mPath + ".1").size());
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogSink, ProcessesThatShareAFileDoNotInterleave) {
    std::vector<pid_t> lChildren;
    for (int lChild = 0; lChild < 2; ++lChild) {
        const pid_t lPid = fork();
        ASSERT_GE(lPid, 0);
        if (0 == lPid) {
            mpSink->setPath(mPath.c_str());
            const std::string lText(200, static_cast<char>('a' + lChild));
            for (int i = 0; i < 500; ++i) {
                sWriteTo(*mpSink, "%s", lText.c_str());
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
    if (0 == lPid) {
        mpSink->setPath(mPath.c_str());
        sWriteTo(*mpSink, "last words");
        raise(SIGKILL);
        _exit(0);
    }
    int lStatus = 0;
    ASSERT_EQ(lPid, waitpid(lPid, &lStatus, 0));
    EXPECT_TRUE(WIFSIGNALED(lStatus));
    EXPECT_EQ((Lines{"-M- last words"}), sLines(mPath));
}

TEST_F(LogSink, APathFromAnywhereInTheTreeIsTheSameAfterTheDirectoryWasLeft) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    const std::pair<const char*, std::string> lcRows[] = {{"/", mPath.substr(1)}, {mDirectory.path().c_str(), "other"}};
    for (const auto& [lpDirectory, lcrPath] : lcRows) {
        std::filesystem::current_path(lpDirectory);
        mpSink->setPath(lcrPath.c_str());
        std::filesystem::current_path(lFormer);
        sWriteTo(*mpSink, "%s", lcrPath.c_str());
    }
    EXPECT_EQ(Lines{"-M- " + mPath.substr(1)}, sLines(mPath));
    EXPECT_EQ(Lines{"-M- other"}, sLines(mDirectory.path("other")));
}

TEST_F(LogSink, WithoutACurrentDirectoryARelativePathIsUsedAsItStandsAndThatIsSaid) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    const std::string lGone = mDirectory.path("gone");
    std::filesystem::create_directory(lGone);
    std::filesystem::current_path(lGone);
    std::filesystem::remove(lGone);
    mpSink->setPath("relative.log");
    std::filesystem::current_path(mDirectory.path());
    sNowMs += 60000;
    sWriteTo(*mpSink, "a line");
    std::filesystem::current_path(lFormer);
    EXPECT_EQ(Lines{"-M- a line"}, sLines(mDirectory.path("relative.log")));
    EXPECT_NE(std::string::npos, mStandardError.take().find("Cannot make the path of the log file absolute "
                                                            "'relative.log': no current directory"));
}

TEST_F(LogSink, AFileThatMayOnlyBeWrittenIsWritten) {
    const uid_t lFormer = geteuid();
    std::filesystem::permissions(mDirectory.path(), std::filesystem::perms::all);
    { std::ofstream lFile(mPath); }
    ASSERT_EQ(0, chmod(mPath.c_str(), 0222));
    if (lFormer == 0) {
        // Root may read everything.
        ASSERT_EQ(0, seteuid(65534));
    }
    mpSink->setPath(mPath.c_str());
    sWriteTo(*mpSink, "a line");
    ASSERT_EQ(0, seteuid(lFormer));
    ASSERT_EQ(0, chmod(mPath.c_str(), 0644));
    EXPECT_EQ(Lines{"-M- a line"}, sLines(mPath));
    EXPECT_EQ("", mStandardError.take());
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
