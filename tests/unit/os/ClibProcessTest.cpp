#include "os/common/include/Clib.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <functional>
#include <iterator>
#include <string>

#include "tests/support/ChildFunction.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ThrownText.h"

TEST(ClibProcess, AZombieIsNotAlive) {
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(0);
    }
    ASSERT_GT(lChild, 0);
    siginfo_t lInfo;
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(lChild), &lInfo, WEXITED | WNOWAIT), 0);
    EXPECT_EQ(kill(lChild, 0), 0) << "the zombie is gone before it was looked at";
    EXPECT_FALSE(ClibIsProcessAlive(lChild));
    ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
    EXPECT_FALSE(ClibIsProcessAlive(lChild));
    EXPECT_FALSE(ClibKill(lChild, 0));
    EXPECT_TRUE(ClibIsProcessAlive(getpid()));
    EXPECT_FALSE(ClibIsProcessAlive(0));
    EXPECT_FALSE(ClibIsProcessAlive(-1));
}

TEST(ClibProcess, AProcessMayHaveAnyNameWhateverItsState) {
    for (const char* lpName : {") Z 1 (", ") S 1 (", ")", "a) X"}) {
        SCOPED_TRACE(lpName);
        int lToParent[2];
        int lToChild[2];
        ASSERT_EQ(pipe2(lToParent, O_CLOEXEC), 0);
        ASSERT_EQ(pipe2(lToChild, O_CLOEXEC), 0);
        const pid_t lChild = fork();
        if (lChild == 0) {
            prctl(PR_SET_NAME, lpName);
            char lByte = 0;
            const bool lIsTold = write(lToParent[1], "x", 1) == 1 && read(lToChild[0], &lByte, 1) == 1;
            _exit(lIsTold ? 0 : 1);
        }
        ASSERT_GT(lChild, 0);
        char lByte = 0;
        ASSERT_EQ(read(lToParent[0], &lByte, 1), 1);
        EXPECT_TRUE(ClibIsProcessAlive(lChild));
        ASSERT_EQ(write(lToChild[1], "x", 1), 1);
        siginfo_t lInfo;
        ASSERT_EQ(waitid(P_PID, static_cast<id_t>(lChild), &lInfo, WEXITED | WNOWAIT), 0);
        EXPECT_FALSE(ClibIsProcessAlive(lChild)) << "a zombie";
        ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
        for (const int lEnd : {lToParent[0], lToParent[1], lToChild[0], lToChild[1]}) {
            close(lEnd);
        }
    }
}

TEST(ClibProcess, AStandardStreamThatIsReplacedTakesNoFurtherDescriptor) {
    const auto lNumberOfDescriptors = [] {
        const std::filesystem::directory_iterator lOpen("/proc/self/fd");
        return std::distance(begin(lOpen), end(lOpen));
    };
    EXPECT_EQ(statusOfChild([&] {
                  ClibRedirect(STDIN_FILENO, "/dev/null", O_RDONLY);
                  const auto lBefore = lNumberOfDescriptors();
                  ClibRedirect(STDIN_FILENO, "/dev/null", O_RDONLY);
                  ClibRedirect(STDOUT_FILENO, "/dev/null", O_WRONLY);
                  ClibRedirect(STDERR_FILENO, "/dev/null", O_WRONLY);
                  return lNumberOfDescriptors() == lBefore ? 0 : 1;
              }),
              0);
}

TEST(ClibProcess, AProcessThatMayNotBeSignalledIsAlive) {
    if (geteuid() != 0) {
        EXPECT_TRUE(ClibIsProcessAlive(1));
        return;
    }
    const pid_t lChild = fork();
    if (lChild == 0) {
        const bool lIsNobody = setgid(65534) == 0 && setuid(65534) == 0;
        const bool lIsRefused = kill(1, 0) != 0 && errno == EPERM;
        _exit(lIsNobody && lIsRefused && ClibIsProcessAlive(1) ? 0 : 1);
    }
    ASSERT_GT(lChild, 0);
    int lStatus = -1;
    ASSERT_EQ(waitpid(lChild, &lStatus, 0), lChild);
    EXPECT_EQ(lStatus, 0);
}

TEST(ClibProcess, ChdirChangesTheWorkingDirectoryOfTheProcess) {
    const ZTCTemporaryDirectory lDirectory;
    EXPECT_EQ(statusOfChild([&] {
                  ClibChdir(lDirectory.path().c_str());
                  return std::filesystem::equivalent(std::filesystem::current_path(), lDirectory.path()) ? 0 : 1;
              }),
              0);
}

TEST(ClibProcess, OneWhoLeadsASessionCannotMakeAnotherOne) {
    EXPECT_EQ(statusOfChild([] {
                  ClibSetsid();
                  if (getsid(0) != getpid()) {
                      return 1;
                  }
                  return thrownText<ZTCClibSessionFailedEx>([] { ClibSetsid(); }) ==
                                 std::string("Making a session failed: ") + std::strerror(EPERM)
                             ? 0
                             : 2;
              }),
              0);
}

TEST(ClibProcess, WhoMayNeitherForkNorSignalIsToldSo) {
    EXPECT_EQ(statusOfChild([] {
                  // Root is not bound by the limit; and nobody else may signal the first process.
                  const uid_t lFormer = geteuid();
                  if (lFormer == 0 && setresuid(65534, 65534, 0) != 0) {
                      return 1;
                  }
                  const ZTCResourceLimit lLimit(RLIMIT_NPROC, 0);
                  const std::string lFork = thrownText<ZTCClibForkFailedEx>([] {
                      if (ClibFork() == 0) {
                          _exit(0);
                      }
                  });
                  const std::string lKill = thrownText<ZTCClibKillFailedEx>([] { ClibKill(1, 0); });
                  if (lFormer == 0 && setresuid(0, 0, 0) != 0) {
                      return 2;
                  }
                  return lFork == std::string("Making a process failed: ") + std::strerror(EAGAIN) &&
                                 lKill == std::string("Signalling process 1 failed: ") + std::strerror(EPERM)
                             ? 0
                             : 3;
              }),
              0);
}

TEST(ClibProcess, AProcessWhoseStateCannotBeReadIsTakenForAlive) {
    const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 0);
    EXPECT_TRUE(ClibIsProcessAlive(getpid()));
    EXPECT_FALSE(ClibIsProcessAlive(0x7fffffff));
}
