#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "common/include/Exception.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/InstanceTesting.h"

namespace {

using InstanceStatus = ZTCInstanceFixture;

std::string sStatusError(const std::string& acrPath) {
    const ZTCProcessInstanceManager lManager(ZTCString("unused"));
    try {
        lManager.getProcStatus(ZTCString(acrPath.c_str()));
    } catch (const ZTCClibGetProcStatusFailedEx& acrException) {
        return acrException.what();
    }
    return "";
}

}  // namespace

TEST_F(InstanceStatus, TheStatusOfARunningProcessIsNoError) {
    for (const std::string& lcrText :
         {std::to_string(getpid()), std::to_string(getpid()) + "\n", " " + std::to_string(getpid()) + "\r\n"}) {
        writeFile(mPath, lcrText);
        EXPECT_EQ(sStatusError(mPath), "") << lcrText;
    }
}

TEST_F(InstanceStatus, TheStatusThroughAPidFileThatNamesNoProcessIsAnErrorWithFileAndReason) {
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

TEST_F(InstanceStatus, TheStatusOfAZombieIsAnError) {
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

TEST_F(InstanceStatus, TheStatusOfAProcessThatMayNotBeSignalledIsNoError) {
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

TEST_F(InstanceStatus, APidFileThatCannotBeOpenedIsAnErrorThatNamesItAndNothingIsStopped) {
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
