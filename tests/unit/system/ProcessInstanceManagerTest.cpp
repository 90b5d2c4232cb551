#include "system/include/ProcessInstanceManager.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/InstanceTesting.h"

namespace {

using ProcessInstanceManager = ZTCInstanceFixture;

}  // namespace

TEST_F(ProcessInstanceManager, APidFileThatTakesNoByteIsAnErrorThatNamesIt) {
    ZTCForkedProcess lChild([this](ZTCForkedProcess&) {
        signal(SIGXFSZ, SIG_IGN);
        const rlimit lNone{0, RLIM_INFINITY};
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
        if (lManager->isAnInstanceRunning() || setrlimit(RLIMIT_FSIZE, &lNone) != 0) {
            return 2;
        }
        try {
            lManager->markAsRunning();
        } catch (const ZTCClibWriteFailedEx& acrException) {
            return std::string(acrException.what()).find(mPath) != std::string::npos ? 0 : 1;
        }
        return 3;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, TheFirstProcessWritesItsIdWhenItIsMarkedAsRunning) {
    const mode_t lMask = umask(0);
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_EQ(lManager->getProcessId(), -1);
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    EXPECT_EQ(readFile(mPath), "");
    struct stat lStatus {};
    ASSERT_EQ(lstat(mPath.c_str(), &lStatus), 0);
    umask(lMask);
    EXPECT_EQ(lStatus.st_mode, static_cast<mode_t>(S_IFREG | 0600)) << "others could hold its lock";

    lManager->markAsRunning();
    allowLogRotation(false);
    EXPECT_EQ(readFile(mPath), std::to_string(getpid()) + "\n");
    EXPECT_EQ(lManager->getProcessId(), getpid());
    lManager->exitInstanceManagement();
    EXPECT_FALSE(exists(mPath));
    lManager->exitInstanceManagement();
}

TEST_F(ProcessInstanceManager, MarkingTakesTheLockWhereItWasNotTaken) {
    const ZTCPointer<ZTCProcessInstanceManager> lFirst(newManager());
    const ZTCPointer<ZTCProcessInstanceManager> lSecond(newManager());
    lFirst->markAsRunning();
    allowLogRotation(false);
    EXPECT_TRUE(lSecond->isAnInstanceRunning());
    EXPECT_THROW(lSecond->markAsRunning(), ZTCExistsEx);
    EXPECT_EQ(readFile(mPath), std::to_string(getpid()) + "\n");
    lSecond->exitInstanceManagement();
    EXPECT_TRUE(exists(mPath));
}

TEST_F(ProcessInstanceManager, TheLogIsRotatedWhileTheRecordIsHeldAndNoLonger) {
    const std::string lLog = mDirectory.path("a.log");
    ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
        setLogFilePath(lLog.c_str());
        setLogFileBound(150);
        const auto lFill = [] {
            for (int i = 0; i < 4; ++i) {
                ZT_LOG_NOTICE("%s", "a line of the log");
            }
        };
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
        lManager->isAnInstanceRunning();
        lFill();
        const bool lBefore = exists(lLog + ".1");
        lManager->markAsRunning();
        lFill();
        const bool lMeanwhile = exists(lLog + ".1");
        lManager->exitInstanceManagement();
        unlink((lLog + ".1").c_str());
        lFill();
        const bool lAfter = exists(lLog + ".1");
        return (lBefore ? 1 : 0) + (lMeanwhile ? 2 : 0) + (lAfter ? 4 : 0);
    });
    EXPECT_EQ(lChild.waitForExit(), 2);
}

TEST_F(ProcessInstanceManager, AStalePidFileIsEmptiedAndTakenOver) {
    // The process that it names lives, but holds no lock.
    writeFile(mPath, std::to_string(getppid()) + "\nand more");
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    EXPECT_EQ(readFile(mPath), "");
    lManager->markAsRunning();
    allowLogRotation(false);
    EXPECT_EQ(readFile(mPath), std::to_string(getpid()) + "\n");
}

TEST_F(ProcessInstanceManager, APidFileThatOthersMayOpenIsClosedToThemWhenItIsTakenOver) {
    writeFile(mPath, "1234567\n");
    ASSERT_EQ(chmod(mPath.c_str(), 0666), 0);
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    struct stat lStatus {};
    ASSERT_EQ(lstat(mPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode, static_cast<mode_t>(S_IFREG | 0600));
    lManager->exitInstanceManagement();
}

TEST_F(ProcessInstanceManager, ASecondProcessIsToldWhoRunsAndChangesNothing) {
    ZTCForkedProcess lChild(runningInstance());
    lChild.waitForChild();
    {
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
        EXPECT_TRUE(lManager->isAnInstanceRunning());
        EXPECT_EQ(lManager->getProcessId(), lChild.getPid());
        lManager->exitInstanceManagement();
    }
    EXPECT_EQ(readFile(mPath), std::to_string(lChild.getPid()) + "\n");
    lChild.tellChild();
    EXPECT_EQ(lChild.waitForExit(), 0);
    EXPECT_FALSE(exists(mPath));
}

TEST_F(ProcessInstanceManager, AKilledProcessLeavesNoLockBehind) {
    ZTCForkedProcess lChild(runningInstance());
    lChild.waitForChild();
    lChild.sendSignal(SIGKILL);
    EXPECT_EQ(lChild.waitForExit(), 1000 + SIGKILL);
    EXPECT_TRUE(exists(mPath));
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    EXPECT_EQ(readFile(mPath), "");
}

TEST_F(ProcessInstanceManager, TheLockIsKeptOverAFork) {
    ZTCForkedProcess lChild([this](ZTCForkedProcess& arSelf) {
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
        if (lManager->isAnInstanceRunning()) {
            return 1;
        }
        if (fork() != 0) {
            _exit(0);
        }
        lManager->markAsRunning();
        arSelf.tellParent();
        arSelf.waitForParent();
        lManager->exitInstanceManagement();
        arSelf.tellParent();
        return 0;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
    lChild.waitForChild();
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_TRUE(lManager->isAnInstanceRunning());
    EXPECT_EQ(readFile(mPath), std::to_string(lManager->getProcessId()) + "\n");
    EXPECT_NE(lManager->getProcessId(), lChild.getPid());
    lChild.tellChild();
    lChild.waitForChild();
    EXPECT_FALSE(exists(mPath));
}

TEST_F(ProcessInstanceManager, AFileThatReplacedTheOwnOneIsNotRemoved) {
    ZTCLogCapture lLog;
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    lManager->markAsRunning();
    allowLogRotation(false);
    ASSERT_EQ(unlink(mPath.c_str()), 0);
    writeFile(mPath, "another's");
    lManager->exitInstanceManagement();
    EXPECT_EQ(readFile(mPath), "another's");
    EXPECT_EQ(lLog.countMark("-W-"), 1u);
}

TEST_F(ProcessInstanceManager, AReplacedFileCanBeLockedByAnother) {
    const ZTCPointer<ZTCProcessInstanceManager> lFirst(newManager());
    EXPECT_FALSE(lFirst->isAnInstanceRunning());
    ASSERT_EQ(unlink(mPath.c_str()), 0);
    const ZTCPointer<ZTCProcessInstanceManager> lSecond(newManager());
    EXPECT_FALSE(lSecond->isAnInstanceRunning());
    lFirst->exitInstanceManagement();
    EXPECT_TRUE(exists(mPath)) << "the second one's file was removed";
}

TEST_F(ProcessInstanceManager, ManyThatStartAtOnceAreOneInTheEnd) {
    // Each takes the lock, gives it up and removes the file in turn, or is refused: never two inside.
    const std::string lInside = mDirectory.path("inside");
    const auto lRun = [&](ZTCForkedProcess&) {
        for (int lRound = 0; lRound < 50; ++lRound) {
            const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
            if (lManager->isAnInstanceRunning()) {
                continue;
            }
            if (mkdir(lInside.c_str(), 0700) != 0) {
                return 1;
            }
            rmdir(lInside.c_str());
            lManager->exitInstanceManagement();
        }
        return 0;
    };
    ZTCForkedProcess lFirst(lRun);
    ZTCForkedProcess lSecond(lRun);
    ZTCForkedProcess lThird(lRun);
    EXPECT_EQ(lFirst.waitForExit(), 0);
    EXPECT_EQ(lSecond.waitForExit(), 0);
    EXPECT_EQ(lThird.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, SomethingElseAtThePathIsRefusedUntouched) {
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    try {
        lManager->isAnInstanceRunning();
        FAIL() << "a FIFO was taken for a pid file";
    } catch (const ZTCInvalidEx& acrException) {
        EXPECT_NE(std::string(acrException.what()).find(mPath), std::string::npos);
        EXPECT_NE(std::string(acrException.what()).find("a FIFO"), std::string::npos);
    }
    EXPECT_TRUE(isFifo(mPath));
    ASSERT_EQ(unlink(mPath.c_str()), 0);

    const std::string lTarget = mDirectory.path("target");
    writeFile(lTarget, "precious");
    ASSERT_EQ(symlink(lTarget.c_str(), mPath.c_str()), 0);
    EXPECT_THROW(lManager->isAnInstanceRunning(), ZTCClibOpenFailedEx);
    EXPECT_EQ(readFile(lTarget), "precious");
}
