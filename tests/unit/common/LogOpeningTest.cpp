#include <fcntl.h>
#include <gtest/gtest.h>
#include <limits.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/Waiting.h"
#include "tests/unit/common/LogSinkTesting.h"

namespace {

using LogOpening = ZTCLogSinkFixture;

/// Runs in place of each pause of the log; empty: the pause is made.
std::function<void()> sPause;

}  // namespace

extern "C" int sRealNanosleep(const timespec* apTime, timespec* apLeft) __asm__("__real_nanosleep");
extern "C" int sWrappedNanosleep(const timespec* apTime, timespec* apLeft) __asm__("__wrap_nanosleep");
int sWrappedNanosleep(const timespec* apTime, timespec* apLeft) {
    if (!sPause) {
        return sRealNanosleep(apTime, apLeft);
    }
    sPause();
    return 0;
}

TEST_F(LogOpening, APathIsMadeAbsoluteWhenItIsSet) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    std::filesystem::current_path(mDirectory.path());
    mpSink->setPath("log");
    std::filesystem::current_path(lFormer);
    std::filesystem::remove(mPath);
    mpSink->reopen();
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, AnEmptyPathChangesNothing) {
    mpSink->setPath(mPath.c_str());
    mpSink->setPath("");
    mpSink->setPath(nullptr);
    EXPECT_EQ(2u, linesOf(mStandardError.take()).size());
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, APathThatIsTooLongChangesNothing) {
    mpSink->setPath(mPath.c_str());
    mpSink->setPath(("/" + std::string(PATH_MAX, 'x')).c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("its path is too long"));
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, ANewPathTakesOverFromTheFormerOne) {
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    mpSink->setPath(mDirectory.path("other").c_str());
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
    EXPECT_EQ((Lines{"-M- two"}), sinkLines(mDirectory.path("other")));
}

TEST_F(LogOpening, TheFileIsMade0640LessTheUmask) {
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

TEST_F(LogOpening, LinesAreAppendedToAnExistingFile) {
    writeFile(mPath, "before\n");
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"before", "-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, AFileThatEndsInsideOfALineIsEndedFirst) {
    writeFile(mPath, "before\ntorn");
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"before", "torn", "-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, ALineThatAnotherProcessIsWritingAtThisMomentIsLeftWhole) {
    writeFile(mPath, "before\nbegun");
    sPause = [this] { std::ofstream(mPath, std::ios::app) << " and ended\n"; };
    mpSink->setPath(mPath.c_str());
    sPause = nullptr;
    writeTo(*mpSink, "one");
    EXPECT_EQ("before\nbegun and ended\n-M- one\n", readFile(mPath));
}

TEST_F(LogOpening, ASymbolicLinkIsRefusedAndItsTargetUntouched) {
    const std::string lTarget = mDirectory.path("target");
    writeFile(lTarget, "precious\n");
    std::filesystem::create_symlink(lTarget, mPath);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ("precious\n", readFile(lTarget));
    const Lines lSaid = linesOf(mStandardError.take());
    ASSERT_EQ(2u, lSaid.size());
    EXPECT_NE(std::string::npos, lSaid[0].find("Cannot open the log file '" + mPath + "': Too many levels"));
    EXPECT_EQ("-M- one", lSaid[1]);
}

TEST_F(LogOpening, ADanglingSymbolicLinkIsNotFollowedEither) {
    std::filesystem::create_symlink(mDirectory.path("target"), mPath);
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    EXPECT_FALSE(std::filesystem::exists(mDirectory.path("target")));
}

TEST_F(LogOpening, AFifoIsRefusedWithoutWaiting) {
    ASSERT_EQ(0, mkfifo(mPath.c_str(), 0600));
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    const std::string lSaid = mStandardError.take();
    EXPECT_NE(std::string::npos, lSaid.find("neither a regular file nor a character device"));
    EXPECT_NE(std::string::npos, lSaid.find("-M- one\n"));
}

TEST_F(LogOpening, ADirectoryIsRefused) {
    mpSink->setPath(mDirectory.path().c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("Is a directory"));
    writeTo(*mpSink, "one");
    EXPECT_EQ("-M- one\n", mStandardError.take());
}

TEST_F(LogOpening, ACharacterDeviceIsAccepted) {
    mpSink->setPath("/dev/null");
    writeTo(*mpSink, "one");
    EXPECT_EQ("", mStandardError.take());
    mpSink->setPath("/dev/full");
    writeTo(*mpSink, "two");
    EXPECT_EQ("-M- two\n", mStandardError.take());
}

TEST_F(LogOpening, ATerminalThatIsFullTakesLinesAgainAsSoonAsItHasRoom) {
    const int lTerminal = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK);
    ASSERT_GE(lTerminal, 0);
    ASSERT_EQ(0, grantpt(lTerminal));
    ASSERT_EQ(0, unlockpt(lTerminal));
    const auto lReadAll = [lTerminal] {
        std::string lText;
        char lBytes[4096];
        for (ssize_t lCount; (lCount = read(lTerminal, lBytes, sizeof(lBytes))) > 0;) {
            lText.append(lBytes, static_cast<std::size_t>(lCount));
        }
        return lText;
    };
    mpSink->setPath(ptsname(lTerminal));
    const std::string lText(1000, 'x');
    std::string lLost;
    for (int i = 0; i < 1000 && lLost.empty(); ++i) {
        writeTo(*mpSink, "%s", lText.c_str());
        lLost = mStandardError.take();
    }
    EXPECT_EQ("-M- " + lText + "\n", lLost);
    // A terminal has room again soon after it was read.
    std::string lRead;
    waitUntil(
        [&] {
            lRead += lReadAll();
            writeTo(*mpSink, "after");
            return lRead.find("-M- after") != std::string::npos;
        },
        "a line that comes without another attempt to open the terminal");
    mpSink->close();
    close(lTerminal);
}

TEST_F(LogOpening, AFileThatCannotBeOpenedIsTriedAgainAtMostOnceASecond) {
    const std::string lLate = mDirectory.path("late");
    const std::string lPath = lLate + "/log";
    mpSink->setPath(lPath.c_str());
    std::filesystem::create_directory(lLate);
    gNowMs += ZTCLogFile::gcRetryIntervalMs - 1;
    writeTo(*mpSink, "one");
    EXPECT_FALSE(std::filesystem::exists(lPath));
    gNowMs += 1;
    writeTo(*mpSink, "two");
    mPath = lPath;
    EXPECT_EQ((Lines{lostReport(1, "No such file or directory"), "-M- two"}), sinkLines(lPath));
}

TEST_F(LogOpening, TheStandardDescriptorsAreLeftAlone) {
    const int lInput = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
    close(STDIN_FILENO);
    mpSink->setPath(mPath.c_str());
    EXPECT_EQ(-1, fcntl(STDIN_FILENO, F_GETFD));
    const std::vector<int> lDescriptors = descriptorsOf(mPath);
    ASSERT_EQ(1u, lDescriptors.size());
    EXPECT_LT(STDERR_FILENO, lDescriptors[0]);
    EXPECT_EQ(FD_CLOEXEC, fcntl(lDescriptors[0], F_GETFD)) << "nor does a program that is started inherit the file";
    if (lInput >= 0) {
        dup2(lInput, STDIN_FILENO);
        close(lInput);
    }
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, ProgramsThatAreStartedDoNotInheritTheFile) {
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

TEST_F(LogOpening, ReopeningFollowsAFileThatWasRenamed) {
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "one");
    std::filesystem::rename(mPath, mDirectory.path("moved"));
    writeTo(*mpSink, "two");
    EXPECT_FALSE(std::filesystem::exists(mPath));
    mpSink->reopen();
    writeTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- one", "-M- two"}), sinkLines(mDirectory.path("moved")));
    EXPECT_EQ((Lines{"-M- three"}), sinkLines(mPath));
}

TEST_F(LogOpening, ReopeningAfterARemovalMakesTheFileAnew) {
    mpSink->setPath(mPath.c_str());
    std::filesystem::remove(mPath);
    writeTo(*mpSink, "into the removed one");
    EXPECT_FALSE(std::filesystem::exists(mPath));
    mpSink->reopen();
    writeTo(*mpSink, "one");
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogOpening, AFailedReopeningKeepsTheFormerFileAndIsTriedAgain) {
    mpSink->setPath(mPath.c_str());
    const std::string lMoved = mDirectory.path("moved");
    std::filesystem::rename(mPath, lMoved);
    std::filesystem::create_directory(mPath);
    mpSink->reopen();
    writeTo(*mpSink, "one");
    std::filesystem::remove(mPath);
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-W- Cannot open the log file '" + mPath +
                         "' anew (Is a directory): lines go on into the former one until it can be opened",
                     "-M- one", "-M- two"}),
              sinkLines(lMoved));
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    writeTo(*mpSink, "three");
    EXPECT_EQ((Lines{"-M- three"}), sinkLines(mPath));
}

TEST_F(LogOpening, ReopeningWithoutAPathDoesNothing) {
    mpSink->reopen();
    writeTo(*mpSink, "one");
    mpSink->setPath(mPath.c_str());
    EXPECT_EQ((Lines{"-M- one"}), sinkLines(mPath));
}

TEST_F(LogOpening, APathFromAnywhereInTheTreeIsTheSameAfterTheDirectoryWasLeft) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    const std::pair<const char*, std::string> lcRows[] = {{"/", mPath.substr(1)}, {mDirectory.path().c_str(), "other"}};
    for (const auto& [lpDirectory, lcrPath] : lcRows) {
        std::filesystem::current_path(lpDirectory);
        mpSink->setPath(lcrPath.c_str());
        std::filesystem::current_path(lFormer);
        writeTo(*mpSink, "%s", lcrPath.c_str());
    }
    EXPECT_EQ(Lines{"-M- " + mPath.substr(1)}, sinkLines(mPath));
    EXPECT_EQ(Lines{"-M- other"}, sinkLines(mDirectory.path("other")));
}

TEST_F(LogOpening, WithoutACurrentDirectoryARelativePathIsUsedAsItStandsAndThatIsSaid) {
    const std::filesystem::path lFormer = std::filesystem::current_path();
    const std::string lGone = mDirectory.path("gone");
    std::filesystem::create_directory(lGone);
    std::filesystem::current_path(lGone);
    std::filesystem::remove(lGone);
    mpSink->setPath("relative.log");
    std::filesystem::current_path(mDirectory.path());
    gNowMs += 60000;
    writeTo(*mpSink, "a line");
    std::filesystem::current_path(lFormer);
    EXPECT_EQ(Lines{"-M- a line"}, sinkLines(mDirectory.path("relative.log")));
    EXPECT_NE(std::string::npos, mStandardError.take().find("Cannot make the path of the log file absolute "
                                                            "'relative.log': no current directory"));
}

TEST_F(LogOpening, AFileThatMayOnlyBeWrittenIsWritten) {
    const uid_t lFormer = geteuid();
    std::filesystem::permissions(mDirectory.path(), std::filesystem::perms::all);
    { std::ofstream lFile(mPath); }
    ASSERT_EQ(0, chmod(mPath.c_str(), 0222));
    if (lFormer == 0) {
        // Root may read everything.
        ASSERT_EQ(0, seteuid(65534));
    }
    mpSink->setPath(mPath.c_str());
    writeTo(*mpSink, "a line");
    ASSERT_EQ(0, seteuid(lFormer));
    ASSERT_EQ(0, chmod(mPath.c_str(), 0644));
    EXPECT_EQ(Lines{"-M- a line"}, sinkLines(mPath));
    EXPECT_EQ("", mStandardError.take());
}

TEST_F(LogOpening, APathFitsUpToExactlyItsLimit) {
    // The same file by a longer and longer way.
    const auto lPathOf = [this](std::size_t aLength) {
        const std::string lName = "/log";
        return mDirectory.path() + std::string(aLength - mDirectory.path().size() - lName.size(), '/') + lName;
    };
    mpSink->setPath(lPathOf(PATH_MAX - 1).c_str());
    writeTo(*mpSink, "one");
    EXPECT_EQ("", mStandardError.take());
    EXPECT_EQ(Lines{"-M- one"}, sinkLines(mPath));
    mpSink->setPath(lPathOf(PATH_MAX).c_str());
    EXPECT_NE(std::string::npos, mStandardError.take().find("its path is too long"));
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", "-M- two"}), sinkLines(mPath)) << "the log goes on as before";
}

TEST_F(LogOpening, WhatIsNoFileForALogIsClosedAgainAtEachAttempt) {
    const std::string lFifo = mDirectory.path("fifo");
    ASSERT_EQ(0, mkfifo(lFifo.c_str(), 0600));
    mpSink->setPath(lFifo.c_str());
    for (int i = 0; i < 5; ++i) {
        gNowMs += ZTCLogFile::gcRetryIntervalMs;
        writeTo(*mpSink, "lost");
    }
    EXPECT_EQ(std::vector<int>{}, descriptorsOf(lFifo));
}

TEST_F(LogOpening, AReopeningThatWasMadeUpForIsNotDoneAgain) {
    mpSink->setPath(mPath.c_str());
    std::filesystem::rename(mPath, mDirectory.path("moved"));
    std::filesystem::create_directory(mPath);
    mpSink->reopen();
    std::filesystem::remove(mPath);
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    writeTo(*mpSink, "one");
    // The file goes on to be the one that is open, under whatever name.
    std::filesystem::rename(mPath, mDirectory.path("moved again"));
    gNowMs += ZTCLogFile::gcRetryIntervalMs;
    writeTo(*mpSink, "two");
    EXPECT_EQ((Lines{"-M- one", "-M- two"}), sinkLines(mDirectory.path("moved again")));
    EXPECT_FALSE(std::filesystem::exists(mPath));
}
