#include "system/include/ProcessInstanceManager.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"

class ProcessInstanceManager : public testing::Test {
protected:
    ProcessInstanceManager() : mPath(mDirectory.path("a.pid")) {}

    ZTCProcessInstanceManager* newManager(std::chrono::milliseconds aKillTimeout = std::chrono::milliseconds(20000)) {
        return new ZTCProcessInstanceManager(ZTCString(mPath.c_str()), aKillTimeout);
    }

    /// A process that is marked as running and ends, giving up its record, when it is told to.
    ZTCForkedProcess::Function runningInstance() {
        return [this](ZTCForkedProcess& arSelf) {
            const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
            if (lManager->isAnInstanceRunning()) {
                return 1;
            }
            lManager->markAsRunning();
            arSelf.tellParent();
            arSelf.waitForParent();
            lManager->exitInstanceManagement();
            return 0;
        };
    }

    std::string killAndCapture(ZTCProcessInstanceManager& arManager) {
        testing::internal::CaptureStdout();
        try {
            arManager.killRunningInstance();
        } catch (const ZTCException& acrException) {
            ADD_FAILURE() << acrException.what();
        }
        return testing::internal::GetCapturedStdout();
    }

    ZTCTemporaryDirectory mDirectory;
    const std::string mPath;
};

static std::string sStatusError(const std::string& acrPath) {
    const ZTCProcessInstanceManager lManager(ZTCString("unused"));
    try {
        lManager.getProcStatus(ZTCString(acrPath.c_str()));
    } catch (const ZTCClibGetProcStatusFailedEx& acrException) {
        return acrException.what();
    }
    return "";
}

// ---- The lock and the file ----

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
    EXPECT_EQ(lStatus.st_mode, static_cast<mode_t>(S_IFREG | 0644));

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

// ---- Stopping the running instance ----

TEST_F(ProcessInstanceManager, StoppingWhereNoneRunsSaysSo) {
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_NE(killAndCapture(*lManager).find("No running instance"), std::string::npos);
    EXPECT_FALSE(exists(mPath));

    // The process that a stale file names is left alone.
    ZTCForkedProcess lBystander([](ZTCForkedProcess& arSelf) {
        arSelf.waitForParent();
        return 0;
    });
    writeFile(mPath, std::to_string(lBystander.getPid()) + "\n");
    EXPECT_NE(killAndCapture(*lManager).find("No running instance"), std::string::npos);
    lBystander.tellChild();
    EXPECT_EQ(lBystander.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, StoppingWaitsUntilTheProcessIsGone) {
    ZTCForkedProcess lChild(runningInstance());
    lChild.waitForChild();
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    const std::string lSaid = killAndCapture(*lManager);
    EXPECT_NE(lSaid.find("Stopped"), std::string::npos) << lSaid;
    EXPECT_NE(lSaid.find(std::to_string(lChild.getPid())), std::string::npos) << lSaid;
    siginfo_t lInfo{};
    EXPECT_EQ(waitid(P_PID, static_cast<id_t>(lChild.getPid()), &lInfo, WEXITED | WNOHANG | WNOWAIT), 0);
    EXPECT_EQ(lInfo.si_pid, lChild.getPid()) << "it still runs";
    EXPECT_EQ(lChild.waitForExit(), 1000 + SIGTERM);
}

TEST_F(ProcessInstanceManager, StoppingWaitsForAProcessThatIsStarting) {
    ZTCForkedProcess lChild([this](ZTCForkedProcess& arSelf) {
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
        if (lManager->isAnInstanceRunning()) {
            return 1;
        }
        arSelf.tellParent();
        arSelf.waitForParent();
        lManager->markAsRunning();
        arSelf.waitForParent();
        return 0;
    });
    lChild.waitForChild();
    ZTCForkedProcess lStopper(
        [this](ZTCForkedProcess& arSelf) {
            const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
            arSelf.tellParent();
            lManager->killRunningInstance();
            return 0;
        },
        mDirectory.path("stopper"));
    lStopper.waitForChild();
    lChild.tellChild();
    EXPECT_EQ(lChild.waitForExit(), 1000 + SIGTERM);
    EXPECT_EQ(lStopper.waitForExit(), 0);
    EXPECT_NE(readFile(mDirectory.path("stopper.out")).find("Stopped"), std::string::npos);
}

TEST_F(ProcessInstanceManager, StoppingGivesUpAfterItsTime) {
    ZTCForkedProcess lChild([this](ZTCForkedProcess& arSelf) {
        signal(SIGTERM, SIG_IGN);
        return runningInstance()(arSelf);
    });
    lChild.waitForChild();
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager(std::chrono::milliseconds(50)));
    const std::string lSaid = killAndCapture(*lManager);
    EXPECT_NE(lSaid.find("has not ended"), std::string::npos) << lSaid;
    lChild.tellChild();
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, StoppingGivesUpOnALockWithoutAProcess) {
    const ZTCPointer<ZTCProcessInstanceManager> lHolder(newManager());
    EXPECT_FALSE(lHolder->isAnInstanceRunning());
    for (const char* lpContent : {"", "no pid", "0\n", "-1\n", "99999999999\n"}) {
        writeFile(mPath, lpContent);
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager(std::chrono::milliseconds(30)));
        const std::string lSaid = killAndCapture(*lManager);
        EXPECT_NE(lSaid.find("named no process"), std::string::npos) << lSaid;
    }
}

TEST_F(ProcessInstanceManager, StoppingLeavesAProcessAloneThatIsNotTheFileOwners) {
    // Another user's file that names a process of this one; without root's rights this user's that names process 1.
    ZTCForkedProcess lBystander([](ZTCForkedProcess& arSelf) {
        arSelf.tellParent();
        arSelf.waitForParent();
        return 0;
    });
    lBystander.waitForChild();
    const ZTCPointer<ZTCProcessInstanceManager> lHolder(newManager());
    EXPECT_FALSE(lHolder->isAnInstanceRunning());
    const bool lIsRoot = geteuid() == 0;
    const std::string lPid = std::to_string(lIsRoot ? lBystander.getPid() : 1);
    writeFile(mPath, lPid + "\n");
    EXPECT_EQ(lIsRoot ? chown(mPath.c_str(), 65534, 65534) : 0, 0);
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_EQ(killAndCapture(*lManager), "The pid file '" + mPath + "' names process " + lPid +
                                             ", which is not its owner's; nothing is stopped\n");
    lBystander.tellChild();
    EXPECT_EQ(lBystander.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, APidFileThatIsTakenOverBelongsToTheProcess) {
    writeFile(mPath, "");
    if (geteuid() == 0) {
        ASSERT_EQ(chown(mPath.c_str(), 65534, 65534), 0);
    }
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    EXPECT_FALSE(lManager->isAnInstanceRunning());
    struct stat lStatus {};
    ASSERT_EQ(lstat(mPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_uid, geteuid());
    lManager->exitInstanceManagement();
}

// ---- The status of a process ----

TEST_F(ProcessInstanceManager, TheStatusOfARunningProcessIsNoError) {
    for (const std::string& lcrText :
         {std::to_string(getpid()), std::to_string(getpid()) + "\n", " " + std::to_string(getpid()) + "\r\n"}) {
        writeFile(mPath, lcrText);
        EXPECT_EQ(sStatusError(mPath), "") << lcrText;
    }
}

TEST_F(ProcessInstanceManager, TheStatusThroughAPidFileThatNamesNoProcessIsAnErrorWithFileAndReason) {
    const std::string lMissing = sStatusError(mPath);
    EXPECT_NE(lMissing.find(mPath), std::string::npos) << lMissing;
    EXPECT_NE(lMissing.find("No such file"), std::string::npos) << lMissing;
    for (const char* lpContent :
         {"", "\n", "0", "-1", "+1", "0x1", "1 1", "1x", "x1", "2147483648", "18446744073709551617"}) {
        writeFile(mPath, lpContent);
        EXPECT_NE(sStatusError(mPath).find(mPath), std::string::npos) << lpContent;
    }
    writeFile(mPath, std::to_string(getpid()) + std::string(100, ' '));
    EXPECT_NE(sStatusError(mPath), "");
    EXPECT_NE(sStatusError(mDirectory.path()), "") << "a directory";
    ASSERT_EQ(mkfifo(mDirectory.path("fifo").c_str(), 0600), 0);
    EXPECT_NE(sStatusError(mDirectory.path("fifo")), "");
}

TEST_F(ProcessInstanceManager, TheStatusOfAZombieIsAnError) {
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(0);
    }
    ASSERT_GT(lChild, 0);
    siginfo_t lInfo;
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(lChild), &lInfo, WEXITED | WNOWAIT), 0);
    writeFile(mPath, std::to_string(lChild) + "\n");
    const std::string lError = sStatusError(mPath);
    EXPECT_NE(lError.find(std::to_string(lChild)), std::string::npos) << lError;
    ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
    EXPECT_NE(sStatusError(mPath), "");
}

TEST_F(ProcessInstanceManager, TheStatusOfAProcessThatMayNotBeSignalledIsNoError) {
    writeFile(mPath, "1\n");
    ASSERT_EQ(chmod(mDirectory.path().c_str(), 0755), 0);
    ZTCForkedProcess lChild([this](ZTCForkedProcess&) {
        if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0)) {
            return 2;
        }
        return sStatusError(mPath).empty() ? 0 : 1;
    });
    EXPECT_EQ(lChild.waitForExit(), 0);
}

TEST_F(ProcessInstanceManager, APidFileThatCannotBeOpenedIsAnErrorThatNamesItAndNothingIsStopped) {
    // Links are not followed.
    ASSERT_EQ(symlink(mDirectory.path("elsewhere").c_str(), mPath.c_str()), 0);
    const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager());
    try {
        lManager->killRunningInstance();
        FAIL() << "a link was followed";
    } catch (const ZTCClibOpenFailedEx& acrException) {
        EXPECT_EQ(std::string(acrException.what()),
                  "Opening the pid file '" + mPath + "' failed: " + std::strerror(ELOOP));
    }
}
