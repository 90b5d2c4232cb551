#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>

#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/InstanceTesting.h"

namespace {

using InstanceStopping = ZTCInstanceFixture;

}  // namespace

TEST_F(InstanceStopping, StoppingWhereNoneRunsSaysSo) {
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

TEST_F(InstanceStopping, StoppingWaitsUntilTheProcessIsGone) {
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

TEST_F(InstanceStopping, StoppingWaitsForAProcessThatIsStarting) {
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

TEST_F(InstanceStopping, StoppingGivesUpAfterItsTime) {
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

TEST_F(InstanceStopping, StoppingGivesUpOnALockWithoutAProcess) {
    const ZTCPointer<ZTCProcessInstanceManager> lHolder(newManager());
    EXPECT_FALSE(lHolder->isAnInstanceRunning());
    for (const char* lpContent : {"", "no pid", "0\n", "-1\n", "99999999999\n"}) {
        writeFile(mPath, lpContent);
        const ZTCPointer<ZTCProcessInstanceManager> lManager(newManager(std::chrono::milliseconds(30)));
        const std::string lSaid = killAndCapture(*lManager);
        EXPECT_NE(lSaid.find("named no process"), std::string::npos) << lSaid;
    }
}

TEST_F(InstanceStopping, StoppingLeavesAProcessAloneThatIsNotTheFileOwners) {
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

TEST_F(InstanceStopping, APidFileThatIsTakenOverBelongsToTheProcess) {
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
