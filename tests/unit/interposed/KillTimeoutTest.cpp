#include <gtest/gtest.h>
#include <signal.h>

#include <cstdint>
#include <string>

#include "system/include/ProcessInstanceManager.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/interposed/support/Replaced.h"
#include "tests/unit/system/ForkedProcess.h"

TEST(KillTimeout, AnInstanceThatDoesNotStopIsWaitedForFifteenSeconds) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("a.pid");
    ZTCForkedProcess lHolder([&](ZTCForkedProcess& arSelf) {
        signal(SIGTERM, SIG_IGN);
        ZTCProcessInstanceManager lManager{ZTCString(lPath.c_str())};
        lManager.markAsRunning();
        arSelf.tellParent();
        arSelf.waitForParent();
        return 0;
    });
    lHolder.waitForChild();

    // A clock that only sleeping moves on.
    std::int64_t lNow = 1000;
    const ZTCReplacement lClock(gReplaced.mMonotonicMilliseconds, [&] { return lNow; });
    const ZTCReplacement lSleep(gReplaced.mSleep, [&](int aMilliseconds) { lNow += aMilliseconds; });
    ZTCProcessInstanceManager lManager{ZTCString(lPath.c_str())};
    testing::internal::CaptureStdout();
    lManager.killRunningInstance();
    EXPECT_EQ("Asked the running instance, process " + std::to_string(lHolder.getPid()) +
                  ", to stop; it has not ended within 15000 ms\n",
              testing::internal::GetCapturedStdout());
    EXPECT_LE(16000, lNow);
    EXPECT_GE(16100, lNow);
    lHolder.tellChild();
    EXPECT_EQ(0, lHolder.waitForExit());
}
