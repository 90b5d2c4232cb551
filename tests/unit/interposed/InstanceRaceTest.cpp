#include <gtest/gtest.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <cstdint>
#include <optional>
#include <string>

#include "os/common/include/Clib.h"
#include "os/common/include/Descriptor.h"
#include "system/include/ProcessInstanceManager.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/system/ForkedProcess.h"

namespace {

/// Starts and stops that meet at the worst moment.
class InstanceRace : public testing::Test {
protected:
    ZTCString pathText() const { return ZTCString(mPath.c_str()); }

    /// Whether somebody holds the lock of the file that is at the path now.
    bool isLocked() const {
        const ZTCDescriptor lFile(ClibTryOpen(mPath.c_str(), O_RDONLY));
        return lFile.get() >= 0 && flock(lFile.get(), LOCK_EX | LOCK_NB) != 0;
    }

    ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("a.pid");
};

}  // namespace

TEST_F(InstanceRace, AFileThatIsReplacedBeforeItIsLockedIsNotTheOneThatCounts) {
    ZTCProcessInstanceManager lManager(pathText());
    bool lIsReplaced = false;
    const ZTCReplacement lReplace(gReplaced.mBeforeTryLock, [&](int) {
        if (!lIsReplaced) {
            lIsReplaced = true;
            unlink(mPath.c_str());
            writeFile(mPath, "");
        }
    });
    EXPECT_FALSE(lManager.isAnInstanceRunning());
    EXPECT_TRUE(lIsReplaced);
    EXPECT_TRUE(isLocked()) << "a second one would run beside this one";
}

TEST_F(InstanceRace, TheFileIsRemovedWhileItIsStillLocked) {
    ZTCProcessInstanceManager lManager(pathText());
    lManager.markAsRunning();
    std::optional<bool> lWasLocked;
    const ZTCReplacement lUnlink(gReplaced.mBeforeUnlink, [&](const char*) { lWasLocked = isLocked(); });
    lManager.exitInstanceManagement();
    ASSERT_TRUE(lWasLocked.has_value());
    EXPECT_TRUE(*lWasLocked) << "a start in between would lose its file";
    EXPECT_FALSE(exists(mPath));
}

TEST_F(InstanceRace, ALockThatIsHeldForAMomentIsNoInstance) {
    writeFile(mPath, "");
    const ZTCDescriptor lLooking(ClibOpen(mPath.c_str(), O_RDONLY));
    ASSERT_EQ(0, flock(lLooking.get(), LOCK_EX | LOCK_NB));
    unsigned lTries = 0;
    const ZTCReplacement lSleep(gReplaced.mSleep, [&](int) {
        if (++lTries == 9) {
            flock(lLooking.get(), LOCK_UN);
        }
    });
    ZTCProcessInstanceManager lManager(pathText());
    EXPECT_FALSE(lManager.isAnInstanceRunning());
    EXPECT_EQ(9u, lTries);
}

TEST_F(InstanceRace, ALockThatStaysHeldIsAnInstance) {
    writeFile(mPath, "");
    const ZTCDescriptor lHolding(ClibOpen(mPath.c_str(), O_RDONLY));
    ASSERT_EQ(0, flock(lHolding.get(), LOCK_EX | LOCK_NB));
    const ZTCReplacement lSleep(gReplaced.mSleep, [](int) {});
    ZTCProcessInstanceManager lManager(pathText());
    EXPECT_TRUE(lManager.isAnInstanceRunning());
}

TEST_F(InstanceRace, AnInstanceWhosePlaceAnotherTookAtOnceIsSaidToHaveStopped) {
    const auto lRun = [this](ZTCForkedProcess& arSelf) {
        ZTCProcessInstanceManager lManager(pathText());
        while (lManager.isAnInstanceRunning()) {
        }
        lManager.markAsRunning();
        arSelf.tellParent();
        arSelf.waitForParent();
        return 0;
    };
    ZTCForkedProcess lFirst(lRun);
    lFirst.waitForChild();
    ZTCForkedProcess lSecond(lRun);

    // Each look comes when the second one runs. Only the looks move the clock.
    std::int64_t lNow = 0;
    const ZTCReplacement lClock(gReplaced.mMonotonicMilliseconds, [&] { return lNow; });
    const ZTCReplacement lSleep(gReplaced.mSleep, [&](int aMilliseconds) {
        if (lNow == 0) {
            lFirst.waitForExit();
            lSecond.waitForChild();
        }
        lNow += aMilliseconds;
    });
    ZTCProcessInstanceManager lManager(pathText());
    testing::internal::CaptureStdout();
    lManager.killRunningInstance();
    EXPECT_EQ("Stopped the running instance, process " + std::to_string(lFirst.getPid()) + "\n",
              testing::internal::GetCapturedStdout());
    EXPECT_TRUE(isLocked()) << "the second one runs on";
    lSecond.tellChild();
    EXPECT_EQ(0, lSecond.waitForExit());
}

TEST_F(InstanceRace, AnInstanceThatHasGivenItsFileUpHasStoppedOnlyWhenItsProcessIsGone) {
    ZTCForkedProcess lChild([this](ZTCForkedProcess& arSelf) {
        sigset_t lStop;
        sigemptyset(&lStop);
        sigaddset(&lStop, SIGTERM);
        sigprocmask(SIG_BLOCK, &lStop, nullptr);
        ZTCProcessInstanceManager lManager(pathText());
        lManager.markAsRunning();
        arSelf.tellParent();
        int lSignal = 0;
        sigwait(&lStop, &lSignal);
        lManager.exitInstanceManagement();
        arSelf.tellParent();
        arSelf.waitForParent();
        return 0;
    });
    lChild.waitForChild();
    unsigned lSleeps = 0;
    const ZTCReplacement lClock(gReplaced.mMonotonicMilliseconds, [] { return std::int64_t{0}; });
    const ZTCReplacement lSleep(gReplaced.mSleep, [&](int) {
        ++lSleeps;
        if (lSleeps == 1) {
            lChild.waitForChild();
        } else if (lSleeps == 3) {
            lChild.tellChild();
            EXPECT_EQ(0, lChild.waitForExit());
        }
    });
    ZTCProcessInstanceManager lManager(pathText());
    testing::internal::CaptureStdout();
    lManager.killRunningInstance();
    EXPECT_EQ("Stopped the running instance, process " + std::to_string(lChild.getPid()) + "\n",
              testing::internal::GetCapturedStdout());
    EXPECT_EQ(3u, lSleeps) << "the process ran on until then";
}
