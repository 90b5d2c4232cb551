#include "sensor/client/include/AgentState.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/FileDescriptor.h"
#include "tests/support/TemporaryDirectory.h"

/// Holds the agent's pid file as an agent does.
static ZTCFileDescriptor sHold(const ZTCTemporaryDirectory& acrDirectory, const std::string& acrContent) {
    const std::string lPath = acrDirectory.path("qrv-tvk.pid");
    writeFile(lPath, acrContent);
    ZTCFileDescriptor lFile = ZTCFileDescriptor::open(lPath.c_str(), O_RDWR);
    EXPECT_EQ(flock(lFile.get(), LOCK_EX | LOCK_NB), 0);
    return lFile;
}

TEST(AgentState, WithoutAPidFileThereIsNone) {
    const ZTCTemporaryDirectory lDirectory;
    EXPECT_EQ(lookAtAgent(lDirectory.path()).mPresence, ZTAP_None);
}

TEST(AgentState, AHeldPidFileIsARunningAgent) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFileDescriptor lHeld = sHold(lDirectory, std::to_string(getpid()) + "\n");
    const ZTSAgentState lState = lookAtAgent(lDirectory.path());
    EXPECT_EQ(lState.mPresence, ZTAP_Running);
    EXPECT_EQ(lState.mPid, getpid());
    EXPECT_GT(lState.mHeartbeatSeconds, 0);
}

TEST(AgentState, AHeldPidFileWithoutAPidIsAStartingAgent) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFileDescriptor lHeld = sHold(lDirectory, "");
    EXPECT_EQ(lookAtAgent(lDirectory.path()).mPresence, ZTAP_Starting);
}

TEST(AgentState, AStalePidFileIsNoAgentEvenWhereItsPidIsInUseAgain) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("qrv-tvk.pid"), std::to_string(getpid()) + "\n");
    EXPECT_EQ(lookAtAgent(lDirectory.path()).mPresence, ZTAP_None);
    const pid_t lChild = fork();
    if (lChild == 0) {
        _exit(0);
    }
    ASSERT_EQ(waitpid(lChild, nullptr, 0), lChild);
    writeFile(lDirectory.path("qrv-tvk.pid"), std::to_string(lChild) + "\n");
    EXPECT_EQ(lookAtAgent(lDirectory.path()).mPresence, ZTAP_None);
}

TEST(AgentState, TwoThatLookAtTheSameTimeDoNotTakeEachOtherForAnAgent) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("qrv-tvk.pid");
    writeFile(lPath, std::to_string(getpid()) + "\n");
    const ZTCFileDescriptor lOtherLook = ZTCFileDescriptor::open(lPath.c_str(), O_RDONLY);
    ASSERT_EQ(flock(lOtherLook.get(), LOCK_SH | LOCK_NB), 0);
    EXPECT_EQ(lookAtAgent(lDirectory.path()).mPresence, ZTAP_None);
}

TEST(AgentState, ASymbolicLinkIsNoPidFileOfAnAgent) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCTemporaryDirectory lOther;
    const ZTCFileDescriptor lHeld = sHold(lOther, std::to_string(getpid()) + "\n");
    ASSERT_EQ(symlink(lOther.path("qrv-tvk.pid").c_str(), lDirectory.path("qrv-tvk.pid").c_str()), 0);
    EXPECT_THROW(lookAtAgent(lDirectory.path()), ZTCSystemCallEx);
}
