#include "sensor/client/include/ClientLock.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

TEST(ClientLock, OneClientAtATimeHoldsIt) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCClientLock lFirst(lDirectory.path());
    ZTCClientLock lSecond(lDirectory.path());
    EXPECT_TRUE(lFirst.tryAcquire());
    EXPECT_TRUE(lFirst.tryAcquire());
    EXPECT_FALSE(lSecond.tryAcquire());
    EXPECT_FALSE(lSecond.isHeld());
    lFirst.release();
    EXPECT_TRUE(lSecond.tryAcquire());
    EXPECT_FALSE(lFirst.tryAcquire());
    EXPECT_TRUE(exists(lDirectory.path("qrv-sn.lock")));
}

TEST(ClientLock, ALockFileThatCannotBeOpenedIsNamed) {
    const ZTCTemporaryDirectory lDirectory;
    ASSERT_EQ(mkdir(lDirectory.path("qrv-sn.lock").c_str(), 0700), 0);
    ZTCClientLock lLock(lDirectory.path());
    try {
        lLock.tryAcquire();
        FAIL() << "a directory was locked";
    } catch (const ZTCSystemCallEx& lrEx) {
        EXPECT_NE(std::string(lrEx.what()).find(lDirectory.path("qrv-sn.lock")), std::string::npos);
    }
}
