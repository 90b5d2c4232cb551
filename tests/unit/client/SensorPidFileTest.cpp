#include "sensor/client/include/SensorPidFile.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

static std::string sPidLine() {
    return std::to_string(getpid()) + "\n";
}

TEST(SensorPidFile, HoldsTheOwnPidAndGoesWithItsOwner) {
    const ZTCTemporaryDirectory lDirectory;
    {
        const ZTCSensorPidFile lFile(lDirectory.path());
        EXPECT_EQ(readFile(lDirectory.path("qrv-sn.pid")), sPidLine());
    }
    EXPECT_FALSE(exists(lDirectory.path("qrv-sn.pid")));
}

TEST(SensorPidFile, TouchingMovesItsModificationTime) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCSensorPidFile lFile(lDirectory.path());
    const std::string lPath = lDirectory.path("qrv-sn.pid");
    const timespec lLongAgo[2] = {{1000, 0}, {1000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, lPath.c_str(), lLongAgo, 0), 0);
    lFile.touch();
    struct stat lStatus {};
    ASSERT_EQ(stat(lPath.c_str(), &lStatus), 0);
    EXPECT_GT(lStatus.st_mtime, 1000);
}

TEST(SensorPidFile, AFileThatWasRemovedComesBackWithTheNextTouch) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCSensorPidFile lFile(lDirectory.path());
    ASSERT_EQ(unlink(lDirectory.path("qrv-sn.pid").c_str()), 0);
    lFile.touch();
    EXPECT_EQ(readFile(lDirectory.path("qrv-sn.pid")), sPidLine());
}

TEST(SensorPidFile, ASecondOneIsRefusedAndChangesNothing) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCSensorPidFile lFile(lDirectory.path());
    EXPECT_THROW(ZTCSensorPidFile{lDirectory.path()}, ZTCSensorBusyEx);
    EXPECT_EQ(readFile(lDirectory.path("qrv-sn.pid")), sPidLine());
}

TEST(SensorPidFile, AProcessThatRunsKeepsItsFile) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lOther = std::to_string(getppid()) + "\n";
    writeFile(lDirectory.path("qrv-sn.pid"), lOther);
    EXPECT_THROW(ZTCSensorPidFile{lDirectory.path()}, ZTCSensorBusyEx);
    EXPECT_EQ(readFile(lDirectory.path("qrv-sn.pid")), lOther);
}

TEST(SensorPidFile, AStaleFileIsTakenOver) {
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(0);
    }
    ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
    for (const std::string& lrContent : {std::to_string(lChild) + "\n", std::string("rubbish"), std::string()}) {
        const ZTCTemporaryDirectory lDirectory;
        writeFile(lDirectory.path("qrv-sn.pid"), lrContent);
        const ZTCSensorPidFile lFile(lDirectory.path());
        EXPECT_EQ(readFile(lDirectory.path("qrv-sn.pid")), sPidLine());
    }
}

TEST(SensorPidFile, AnotherOnesFileIsNotRemoved) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("qrv-sn.pid");
    {
        const ZTCSensorPidFile lFile(lDirectory.path());
        ASSERT_EQ(unlink(lPath.c_str()), 0);
        writeFile(lPath, "1\n");
    }
    EXPECT_EQ(readFile(lPath), "1\n");
}

TEST(SensorPidFile, TheOwnFileStaysWhereItNamesAnotherProcess) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("qrv-sn.pid");
    {
        const ZTCSensorPidFile lFile(lDirectory.path());
        writeFile(lPath, "1\n");  // the same file, with another content
    }
    EXPECT_EQ(readFile(lPath), "1\n");
}

TEST(SensorPidFile, AFileThatReplacedTheOwnOneStaysEvenWhereItHasTheSameContent) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("qrv-sn.pid");
    {
        const ZTCSensorPidFile lFile(lDirectory.path());
        ASSERT_EQ(unlink(lPath.c_str()), 0);
        writeFile(lPath, sPidLine());
    }
    EXPECT_EQ(readFile(lPath), sPidLine());
}

TEST(SensorPidFile, ASymbolicLinkIsNotFollowed) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("precious"), "precious");
    ASSERT_EQ(symlink(lDirectory.path("precious").c_str(), lDirectory.path("qrv-sn.pid").c_str()), 0);
    EXPECT_THROW(ZTCSensorPidFile{lDirectory.path()}, ZTCSystemCallEx);
    EXPECT_EQ(readFile(lDirectory.path("precious")), "precious");
}

TEST(SensorPidFile, AProcessOfAnotherUserIsAlive) {
    // The superuser may signal everybody: an ordinary user looks at process 1 in its place.
    const pid_t lChild = fork();
    if (lChild == 0) {
        if (geteuid() == 0 && setuid(65534) != 0) {
            _exit(2);
        }
        _exit(isProcessAlive(1) ? 0 : 1);
    }
    int lStatus = 0;
    ASSERT_EQ(waitpid(lChild, &lStatus, 0), lChild);
    EXPECT_EQ(lStatus, 0);
}

TEST(SensorPidFile, AZombieIsNotAlive) {
    EXPECT_TRUE(isProcessAlive(getpid()));
    EXPECT_FALSE(isProcessAlive(0));
    EXPECT_FALSE(isProcessAlive(-1));
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(0);
    }
    siginfo_t lInfo{};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(lChild), &lInfo, WEXITED | WNOWAIT), 0);
    EXPECT_FALSE(isProcessAlive(lChild));
    ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
    EXPECT_FALSE(isProcessAlive(lChild));
}
