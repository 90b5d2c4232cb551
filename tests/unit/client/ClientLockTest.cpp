#include "sensor/client/include/ClientLock.h"

#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <functional>
#include <utility>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

/// Runs between the opening of a lock file and its lock, in place of what another process may do there.
static std::function<void()> sBeforeLock;

/// In place of the C library's.
extern "C" int flock(int aDescriptor, int aOperation) noexcept {
    if (sBeforeLock) {
        std::exchange(sBeforeLock, nullptr)();
    }
    return static_cast<int>(syscall(SYS_flock, aDescriptor, aOperation));
}

TEST(ClientLock, AFileThatIsReplacedBeforeItIsLockedIsNotTheLock) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("qrv-sn.lock");
    ZTCClientLock lLock(lDirectory.path());
    sBeforeLock = [&] {
        ASSERT_EQ(unlink(lPath.c_str()), 0);
        writeFile(lPath, "");
    };
    EXPECT_FALSE(lLock.tryAcquire());
    EXPECT_FALSE(lLock.isHeld());
    EXPECT_TRUE(lLock.tryAcquire());
}

TEST(ClientLock, NobodyElseMayOpenTheFile) {
    const mode_t lMask = umask(0);
    const ZTCTemporaryDirectory lDirectory;
    ZTCClientLock lLock(lDirectory.path());
    EXPECT_TRUE(lLock.tryAcquire());
    umask(lMask);
    struct stat lStatus {};
    ASSERT_EQ(stat(lLock.getPath().c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 0777U, 0600U);
}

TEST(ClientLock, ASymbolicLinkIsNotFollowed) {
    const ZTCTemporaryDirectory lDirectory;
    ASSERT_EQ(symlink(lDirectory.path("elsewhere").c_str(), lDirectory.path("qrv-sn.lock").c_str()), 0);
    ZTCClientLock lLock(lDirectory.path());
    EXPECT_THROW(lLock.tryAcquire(), ZTCSystemCallEx);
    EXPECT_FALSE(exists(lDirectory.path("elsewhere")));
}

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

TEST(ClientLock, AClientThatHoldsItIsNotNamed) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCClientLock lHolder(lDirectory.path());
    ASSERT_TRUE(lHolder.tryAcquire());
    ZTCClientLock lOther(lDirectory.path());
    EXPECT_FALSE(lOther.tryAcquire());
    EXPECT_EQ(lOther.getNamedHolder(), 0);
    EXPECT_EQ(lOther.describeHolder(), "another client holds " + lDirectory.path("qrv-sn.lock"));
}

TEST(ClientLock, ASensorThatHoldsItIsNamed) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("qrv-sn.lock"), std::to_string(getppid()) + "\n");
    const ZTCClientLock lLock(lDirectory.path());
    EXPECT_EQ(lLock.getNamedHolder(), getppid());
    EXPECT_EQ(lLock.describeHolder(),
              "a sensor runs, process " + std::to_string(getppid()) + ", and holds " + lDirectory.path("qrv-sn.lock"));
}

TEST(ClientLock, TheNameOfAKilledSensorIsTakenAwayByTheNextHolder) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("qrv-sn.lock"), std::to_string(getppid()) + "\n");
    ZTCClientLock lLock(lDirectory.path());
    ASSERT_TRUE(lLock.tryAcquire());
    EXPECT_EQ(readFile(lDirectory.path("qrv-sn.lock")), "");
    lLock.nameHolder();
    EXPECT_EQ(readFile(lDirectory.path("qrv-sn.lock")), std::to_string(getpid()) + "\n");
    EXPECT_EQ(lLock.getNamedHolder(), 0) << "oneself is nobody to wait for";
}
