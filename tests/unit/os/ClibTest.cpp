#include "os/common/include/Clib.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <functional>
#include <string>

#include "tests/support/ChildFunction.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ThrownText.h"

TEST(Clib, GetenvYieldsTheValueAndCopiesItWhereABufferIsGiven) {
    ASSERT_EQ(setenv("ZT_CLIB_TEST", "a value", 1), 0);
    char lBuffer[32] = {};
    EXPECT_STREQ(ClibGetenv("ZT_CLIB_TEST", nullptr), "a value");
    EXPECT_STREQ(ClibGetenv("ZT_CLIB_TEST", lBuffer), "a value");
    EXPECT_STREQ(lBuffer, "a value");
}

TEST(Clib, GetenvYieldsNullForAVariableThatIsUnset) {
    unsetenv("ZT_CLIB_TEST");
    char lBuffer[8] = "kept";
    EXPECT_EQ(ClibGetenv("ZT_CLIB_TEST", lBuffer), nullptr);
    EXPECT_STREQ(lBuffer, "kept");
}

TEST(Clib, StrcpyFillsAnArrayToItsLastByteAndNoFurther) {
    char lBuffer[5] = {};
    EXPECT_STREQ(ClibStrcpy(lBuffer, "/tmp"), "/tmp");
    EXPECT_THROW(ClibStrcpy(lBuffer, "/temp"), ZTCInvalidEx);
    EXPECT_STREQ(lBuffer, "/tmp");
}

TEST(Clib, SprintfCutsWhatDoesNotFit) {
    char lBuffer[5];
    EXPECT_EQ(ClibSprintf(lBuffer, sizeof(lBuffer), "%d", 1234567), 4);
    EXPECT_STREQ(lBuffer, "1234");
    EXPECT_EQ(ClibSprintf(lBuffer, sizeof(lBuffer), "%s", "ab"), 2);
    EXPECT_STREQ(lBuffer, "ab");
    EXPECT_EQ(ClibSprintf(nullptr, 0, "%s", "ab"), 0);
}

TEST(Clib, SprintfOfWhatHasNoCharactersHereIsEmpty) {
    char lBuffer[16] = "former";
    EXPECT_EQ(ClibSprintf(lBuffer, sizeof(lBuffer), "a %ls", L"\x1234"), 0);
    EXPECT_STREQ(lBuffer, "");
}

TEST(Clib, NoBytesMayBeNowhere) {
    char lByte = 'x';
    EXPECT_EQ(ClibMemcpy(nullptr, nullptr, 0), nullptr);
    EXPECT_EQ(ClibMemcpy(&lByte, nullptr, 0), &lByte);
    EXPECT_EQ(ClibMemset(nullptr, 'y', 0), nullptr);
    EXPECT_EQ(lByte, 'x');
}

TEST(Clib, NetworkOrderIsTheOrderOfTheBytes) {
    const unsigned char lcBytes[4] = {0x01, 0x02, 0x03, 0x04};
    std::uint32_t lNumber;
    ClibMemcpy(&lNumber, lcBytes, sizeof(lNumber));
    EXPECT_EQ(ClibNtohl(lNumber), 0x01020304u);
    EXPECT_EQ(ClibHtonl(0x01020304u), lNumber);
}

TEST(Clib, MemoryAndTextCallsDoWhatTheirNamesSay) {
    char lBytes[4];
    ClibMemset(lBytes, 'x', sizeof(lBytes));
    EXPECT_EQ(std::string(lBytes, 4), "xxxx");
    EXPECT_EQ(ClibStrcmp("a", "a"), 0);
    EXPECT_LT(ClibStrcmp("a", "b"), 0);
    EXPECT_GT(ClibStrcmp("b", "a"), 0);
}

TEST(Clib, MkdirSaysThatThePathExists) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("made");
    ClibMkdir(lPath.c_str(), 0700);
    EXPECT_THROW(ClibMkdir(lPath.c_str(), 0700), ZTCExistsEx);
    try {
        ClibMkdir(lDirectory.path("no/such").c_str(), 0700);
        FAIL() << "a directory without its parent was made";
    } catch (const ZTCClibMkdirFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find(lDirectory.path("no/such")), std::string::npos);
    }
}

#ifdef SYS_mkdir
static constexpr unsigned scMkdir = SYS_mkdir;
#else
static constexpr unsigned scMkdir = SYS_mkdirat;
#endif

/// Has the kernel answer this system call with EPERM from now on, as a service manager's filters do.
static bool sRefuseSystemCall(unsigned aNumber) {
    sock_filter lSteps[] = {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
                            BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, aNumber, 0, 1),
                            BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
                            BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)};
    const sock_fprog lProgram = {.len = 4, .filter = lSteps};
    return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 && prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &lProgram) == 0;
}

TEST(Clib, MkdirSaysThatThePathExistsWhereAFilterRefusesTheCall) {
    ZTCTemporaryDirectory lDirectory;
    const int lStatus = statusOfChild([&] {
        if (!sRefuseSystemCall(scMkdir)) {
            return 2;
        }
        const bool lIsSeen =
            thrownText<ZTCExistsEx>([&] { ClibMkdir(lDirectory.path().c_str(), 03777); }) != "nothing was thrown";
        const bool lIsRefused = thrownText<ZTCClibMkdirFailedEx>([&] {
                                    ClibMkdir(lDirectory.path("new").c_str(), 0700);
                                }).find("Operation not permitted") != std::string::npos;
        return lIsSeen && lIsRefused ? 0 : 1;
    });
    EXPECT_EQ(0, lStatus);
}

TEST(Clib, StatAndUtimeNameTheFileThatIsMissing) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("missing");
    struct stat lStatus {};
    EXPECT_THROW(ClibStat(lPath.c_str(), &lStatus), ZTCClibStatFailedEx);
    EXPECT_FALSE(ClibLstat(lPath.c_str(), &lStatus));
    EXPECT_FALSE(ClibUnlink(lPath.c_str()));
    try {
        ClibUtime(lPath.c_str());
        FAIL() << "the times of a missing file were set";
    } catch (const ZTCClibUtimeFailedEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find(lPath), std::string::npos);
        EXPECT_NE(std::string(acrException.what()).find(std::strerror(ENOENT)), std::string::npos);
    }
}

TEST(Clib, UtimeSetsTheTimesToNow) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("file");
    writeFile(lPath, "x");
    const struct timespec lOld[2] = {{1000, 0}, {1000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, lPath.c_str(), lOld, 0), 0);
    ClibUtime(lPath.c_str());
    struct stat lStatus {};
    ClibStat(lPath.c_str(), &lStatus);
    EXPECT_GT(lStatus.st_mtim.tv_sec, 1000);
    EXPECT_GT(lStatus.st_atim.tv_sec, 1000);
}

TEST(Clib, UtimeOfASymbolicLinkLeavesTheTimesOfWhatItLeadsTo) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("file");
    const std::string lLink = lDirectory.path("link");
    writeFile(lPath, "x");
    ASSERT_EQ(symlink(lPath.c_str(), lLink.c_str()), 0);
    const struct timespec lOld[2] = {{1000, 0}, {1000, 0}};
    for (const std::string& lcrPath : {lPath, lLink}) {
        ASSERT_EQ(utimensat(AT_FDCWD, lcrPath.c_str(), lOld, AT_SYMLINK_NOFOLLOW), 0);
    }
    ClibUtime(lLink.c_str());
    struct stat lStatus {};
    ClibStat(lLink.c_str(), &lStatus);
    EXPECT_EQ(lStatus.st_mtim.tv_sec, 1000);
    ASSERT_TRUE(ClibLstat(lLink.c_str(), &lStatus));
    EXPECT_GT(lStatus.st_mtim.tv_sec, 1000);
}

TEST(Clib, FileKindsHaveNames) {
    EXPECT_STREQ(ClibFileKind(S_IFIFO | 0600), "a FIFO");
    EXPECT_STREQ(ClibFileKind(S_IFREG | 0644), "a regular file");
    EXPECT_STREQ(ClibFileKind(S_IFDIR), "a directory");
    EXPECT_STREQ(ClibFileKind(S_IFLNK), "a symbolic link");
    EXPECT_STREQ(ClibFileKind(S_IFSOCK), "a socket");
    EXPECT_STREQ(ClibFileKind(S_IFCHR), "a character device");
    EXPECT_STREQ(ClibFileKind(S_IFBLK), "a block device");
    EXPECT_STREQ(ClibFileKind(0), "something unknown");
}

TEST(Clib, EveryDescriptorIsCloseOnExec) {
    const int lFile = ClibOpen("/dev/null", O_RDONLY);
    const int lEvent = ClibEventFd();
    EXPECT_EQ(fcntl(lFile, F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
    EXPECT_EQ(fcntl(lEvent, F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
    ClibClose(lFile);
    ClibClose(lEvent);
}

TEST(ClibDeathTest, ADescriptorIsNeverAStandardOne) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            close(0);
            close(1);
            const int lFile = ClibOpen("/dev/null", O_RDONLY);
            const int lEvent = ClibEventFd();
            const bool lAreFree = fcntl(0, F_GETFD) < 0 && fcntl(1, F_GETFD) < 0;
            _exit(lFile > 2 && lEvent > 2 && fcntl(lFile, F_GETFD) == FD_CLOEXEC && lAreFree ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
}

TEST(Clib, OpenNamesThePathAndTheReason) {
    try {
        ClibOpen("/no/such/file", O_RDONLY);
        FAIL() << "a missing file was opened";
    } catch (const ZTCClibOpenFailedEx& acrException) {
        EXPECT_STREQ(acrException.what(),
                     (std::string("Opening '/no/such/file' failed: ") + std::strerror(ENOENT)).c_str());
    }
    EXPECT_EQ(ClibTryOpen("/no/such/file", O_RDONLY), -ENOENT);
}

TEST(Clib, ReadAndWriteTellTheirOrdinaryOutcomesApart) {
    signal(SIGPIPE, SIG_IGN);
    int lPipe[2];
    ASSERT_EQ(pipe2(lPipe, O_CLOEXEC | O_NONBLOCK), 0);
    char lText[4] = {};
    EXPECT_EQ(ClibRead(lPipe[0], lText, sizeof(lText)), -EAGAIN);

    char lOut[] = "ab";
    const struct iovec lPart = {lOut, 2};
    EXPECT_EQ(ClibWritev(lPipe[1], &lPart, 1), 2);
    EXPECT_EQ(ClibBytesWaiting(lPipe[0]), 2u);
    EXPECT_EQ(ClibRead(lPipe[0], lText, sizeof(lText)), 2);
    close(lPipe[1]);
    EXPECT_EQ(ClibRead(lPipe[0], lText, sizeof(lText)), 0);
    close(lPipe[0]);

    ASSERT_EQ(pipe2(lPipe, O_CLOEXEC | O_NONBLOCK), 0);
    close(lPipe[0]);
    EXPECT_EQ(ClibWritev(lPipe[1], &lPart, 1), -EPIPE);
    close(lPipe[1]);
    EXPECT_THROW(ClibRead(-1, lText, 1), ZTCClibReadFailedEx);
    EXPECT_THROW(ClibWritev(-1, &lPart, 1), ZTCClibWriteFailedEx);
}

TEST(Clib, ALockIsHeldByOneOpenFileAtATime) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("lock");
    const int lFirst = ClibOpen(lPath.c_str(), O_RDWR | O_CREAT, 0600);
    const int lSecond = ClibOpen(lPath.c_str(), O_RDONLY);
    EXPECT_TRUE(ClibTryLock(lFirst));
    EXPECT_FALSE(ClibTryLock(lSecond));
    ClibClose(lFirst);
    EXPECT_TRUE(ClibTryLock(lSecond));
    ClibClose(lSecond);
}

TEST(Clib, AFailureNamesItsDescriptorAndTheReason) {
    const std::string lcReason = std::string(" -1 failed: ") + std::strerror(EBADF);
    struct stat lStatus {};
    EXPECT_EQ(thrownText<ZTCClibStatFailedEx>([&] { ClibFstat(-1, &lStatus); }),
              "Getting the status of descriptor" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibReadFailedEx>([] { ClibBytesWaiting(-1); }),
              "Counting the bytes of descriptor" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibReadFailedEx>([] { ClibPipeCapacity(-1); }),
              "Getting the capacity of descriptor" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibLockFailedEx>([] { ClibTryLock(-1); }), "Locking descriptor" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibTruncateFailedEx>([] { ClibFtruncate(-1, 0); }), "Cutting descriptor" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibWriteFailedEx>([] { ClibPwriteAll(-1, "x", 1, 0); }),
              "Writing to descriptor" + lcReason);
}

TEST(Clib, AFailureNamesItsPathAndTheReason) {
    const std::string lcReason = std::string(" '/dev/null/none' failed: ") + std::strerror(ENOTDIR);
    struct stat lStatus {};
    EXPECT_EQ(thrownText<ZTCClibStatFailedEx>([&] { ClibLstat("/dev/null/none", &lStatus); }),
              "Getting the status of" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibUnlinkFailedEx>([] { ClibUnlink("/dev/null/none"); }), "Removing" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibMkfifoFailedEx>([] { ClibMkfifo("/dev/null/none", 0600); }),
              "Making the FIFO" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibOpenFailedEx>([] { ClibChdir("/dev/null/none"); }),
              "Changing into the directory" + lcReason);
    EXPECT_EQ(thrownText<ZTCClibDupFailedEx>([] { ClibRedirect(-1, "/dev/null", O_RDONLY); }),
              std::string("Replacing a standard stream by '/dev/null' failed: ") + std::strerror(EBADF));
}

TEST(Clib, AnEventWhoseCounterIsFullStaysRaised) {
    const int lEvent = ClibEventFd();
    const std::uint64_t lcMost = UINT64_MAX - 1;
    ASSERT_EQ(write(lEvent, &lcMost, sizeof(lcMost)), static_cast<ssize_t>(sizeof(lcMost)));
    ClibRaiseEvent(lEvent);
    std::uint64_t lCount = 0;
    EXPECT_EQ(read(lEvent, &lCount, sizeof(lCount)), static_cast<ssize_t>(sizeof(lCount)));
    EXPECT_EQ(lCount, lcMost);
    ClibClose(lEvent);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST(Clib, WithoutADescriptorLeftEachCallSaysSo) {
    const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 0);
    EXPECT_EQ(ClibTryOpen("/dev/null", O_RDONLY), -EMFILE);
    EXPECT_EQ(thrownText<ZTCClibEventFailedEx>([] { ClibEventFd(); }),
              std::string("Making an event counter failed: ") + std::strerror(EMFILE));
}
#endif

TEST(Clib, ADescriptorThatCannotBeLiftedIsClosedAndAnError) {
    EXPECT_EQ(statusOfChild([] {
                  close(0);
                  const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 3);
                  return ClibTryOpen("/dev/null", O_RDONLY) < 0 && fcntl(0, F_GETFD) < 0 && errno == EBADF ? 0 : 1;
              }),
              0);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST(Clib, AWaitOnMoreDescriptorsThanAProcessMayHaveIsAnError) {
    const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 0);
    struct pollfd lDescriptor = {-1, POLLIN, 0};
    EXPECT_EQ(thrownText<ZTCClibPollFailedEx>([&] { ClibPoll(&lDescriptor, 1, 0); }),
              std::string("Waiting on 1 descriptors failed: ") + std::strerror(EINVAL));
}
#endif
