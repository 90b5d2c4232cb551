#include "os/common/include/Os.h"

#include <gtest/gtest.h>

#include "os/common/include/Clib.h"

TEST(Os, AMutexThatWasDestroyedIsRefused) {
    ZTSOsMutex lMutex;
    EXPECT_THROW(OsLockMutex(lMutex), ZTCOsMutexEx);
    OsInitMutex(lMutex);
    OsLockMutex(lMutex);
    OsUnlockMutex(lMutex);
    OsDestroyMutex(lMutex);
    EXPECT_THROW(OsDestroyMutex(lMutex), ZTCOsMutexEx);
    EXPECT_THROW(OsUnlockMutex(lMutex), ZTCOsMutexEx);
}

TEST(Os, LockingAMutexTwiceOnOneThreadIsAnErrorAndNoHang) {
    ZTSOsMutex lMutex;
    OsInitMutex(lMutex);
    OsLockMutex(lMutex);
    EXPECT_THROW(OsLockMutex(lMutex), ZTCOsMutexEx);
    OsUnlockMutex(lMutex);
    OsDestroyMutex(lMutex);
}

#if !defined(__SANITIZE_THREAD__)
// The thread sanitizer takes the misuse itself for the finding.
TEST(Os, DestroyingALockedMutexIsAnError) {
    ZTSOsMutex lMutex;
    OsInitMutex(lMutex);
    OsLockMutex(lMutex);
    EXPECT_THROW(OsDestroyMutex(lMutex), ZTCOsMutexEx);
    OsUnlockMutex(lMutex);
    OsDestroyMutex(lMutex);
}
#endif

TEST(Os, AConditionalThatWasDestroyedIsRefused) {
    ZTSOsConditional lConditional;
    EXPECT_THROW(OsBroadcastConditional(lConditional), ZTCOsConditionalEx);
    OsInitConditional(lConditional);
    OsBroadcastConditional(lConditional);
    OsDestroyConditional(lConditional);
    EXPECT_THROW(OsDestroyConditional(lConditional), ZTCOsConditionalEx);
}

TEST(Os, ATimedWaitEndsAtItsDeadlineOnTheMonotonicClock) {
    ZTSOsMutex lMutex;
    ZTSOsConditional lConditional;
    OsInitMutex(lMutex);
    OsInitConditional(lConditional);
    OsLockMutex(lMutex);
    const std::int64_t lDeadline = ClibMonotonicMilliseconds() + 20;
    while (OsTimedWaitConditional(lConditional, lMutex, lDeadline)) {
    }
    EXPECT_GE(ClibMonotonicMilliseconds(), lDeadline);
    OsUnlockMutex(lMutex);
    OsDestroyConditional(lConditional);
    OsDestroyMutex(lMutex);
}

TEST(Os, AThreadRunsItsProcedureWithItsArgument) {
    int lValue = 0;
    ZTSOsThread lThread;
    OsCreateThread(
        lThread,
        [](void* apArgument) -> void* {
            *static_cast<int*>(apArgument) = 7;
            return nullptr;
        },
        &lValue);
    OsJoinThread(lThread);
    EXPECT_EQ(lValue, 7);
}
