#include "os/common/include/Mutex.h"

#include <gtest/gtest.h>

#include "tests/support/TestThreads.h"
#include "tests/unit/os/LogCapture.h"

TEST(Mutex, OneThreadAtATimeIsInside) {
    ZTCMutex lMutex;
    int lCount = 0;
    runOnThreads(4, [&](unsigned) {
        for (int lRound = 0; lRound < 1000; ++lRound) {
            ZTCMutexLock lLock(lMutex);
            ++lCount;
        }
    });
    EXPECT_EQ(lCount, 4000);
}

TEST(Mutex, TheLockOfAScopeEndsWithIt) {
    ZTCMutex lMutex;
    { ZTCMutexLock lLock(lMutex); }
    lMutex.lock();
    lMutex.unlock();
}

TEST(Mutex, UnlockingWhatIsNotLockedThrows) {
    ZTCMutex lMutex;
    const auto lUnlock = [&]() ZT_NO_THREAD_SAFETY_ANALYSIS { lMutex.unlock(); };
    EXPECT_THROW(lUnlock(), ZTCOsMutexEx);
}

TEST(Mutex, AFailureOfItsDestructionIsTracedAndIgnored) {
    ZTCLogCapture lLog;
    {
        ZTCMutex lMutex;
        OsDestroyMutex(lMutex.getOsMutex());
    }
    const auto lLines = lLog.file().containing("Ignoring exception in Mutex destruction ...");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-T-");
    EXPECT_EQ(lLines[0].mLabel, "os/common/include/Mutex");
    EXPECT_EQ(lLines[0].mText, "Ignoring exception in Mutex destruction ...");
}

TEST(Mutex, AnOrdinaryDestructionLogsNothing) {
    ZTCLogCapture lLog;
    { ZTCMutex lMutex; }
    EXPECT_TRUE(lLog.file().rawLines().empty());
}
