#include "tavik/include/CheckHeartbeat.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/unit/tavik/support/FileTimes.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

class CheckHeartbeat : public ZTCTavikFixture {
protected:
    CheckHeartbeat() : mCheck(ZTCPointer<ZTCString>(new ZTCString(sensorPidFilePath().c_str())), mSystem.get()) {
        mSystem->preInit();
        mLog.forget();
    }

    void touch(std::time_t aSeconds) {
        if (!exists(sensorPidFilePath())) {
            writeFile(sensorPidFilePath(), std::to_string(getpid()) + "\n");
        }
        setFileTime(sensorPidFilePath(), aSeconds);
    }

    /// One look; whether it found the sensor to have failed.
    bool lookFails() {
        try {
            mCheck.CheckStatus();
            return false;
        } catch (const ZTCHeartbeatFailedEx& lcrException) {
            EXPECT_STREQ("", lcrException.what());
            EXPECT_EQ(492u, lcrException.getError());
            return true;
        }
    }

    std::string unchangedText() const {
        return "-W- Modfication time of the " + sensorPidFilePath() + " hasn't changed";
    }
    std::string noStatText() const { return "-W- Failed in stat on " + sensorPidFilePath() + " file"; }

    /// Whether the process that the file names counts as running.
    bool isRunning(const std::string& acrContent) {
        writeFile(sensorPidFilePath(), acrContent);
        try {
            mCheck.getProcStatus();
            return true;
        } catch (const ZTCClibGetProcStatusFailedEx&) {
            return false;
        }
    }

    ZTCCheckHeartbeat mCheck;
};

}  // namespace

TEST_F(CheckHeartbeat, WithoutProgressTheThirdLookIsTheFirstToFail) {
    touch(1000);
    EXPECT_FALSE(lookFails());
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(mLog.texts().empty());
    EXPECT_TRUE(lookFails());
    EXPECT_EQ(std::vector<std::string>{unchangedText()}, mLog.texts());
}

TEST_F(CheckHeartbeat, EveryFurtherLookFailsUntilTheTimeChanges) {
    touch(1000);
    lookFails();
    lookFails();
    for (unsigned lLook = 0; lLook < 5; ++lLook) {
        EXPECT_TRUE(lookFails());
    }
    touch(1001);
    EXPECT_FALSE(lookFails());
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(lookFails());
    EXPECT_EQ(6u, mLog.count(unchangedText()));
}

TEST_F(CheckHeartbeat, ATouchInEveryPeriodNeverFails) {
    for (std::time_t lPeriod = 0; lPeriod < 20; ++lPeriod) {
        touch(1000 + lPeriod);
        EXPECT_FALSE(lookFails());
    }
}

TEST_F(CheckHeartbeat, ATouchInEverySecondPeriodNeverFails) {
    for (std::time_t lPeriod = 0; lPeriod < 20; ++lPeriod) {
        touch(1000 + lPeriod / 2);
        EXPECT_FALSE(lookFails()) << "period " << lPeriod;
    }
}

TEST_F(CheckHeartbeat, AnEarlierTimeIsAChangeToo) {
    touch(1000);
    lookFails();
    lookFails();
    touch(999);
    EXPECT_FALSE(lookFails());
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(lookFails());
}

TEST_F(CheckHeartbeat, WithoutAFileTheSecondLookFails) {
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(lookFails());
    EXPECT_TRUE(lookFails());
    EXPECT_EQ((std::vector<std::string>{noStatText(), noStatText(), noStatText()}), mLog.texts());
}

TEST_F(CheckHeartbeat, UnreadableAndUnchangedLooksShareOneCounter) {
    touch(1000);
    EXPECT_FALSE(lookFails());
    EXPECT_FALSE(lookFails());
    unlink(sensorPidFilePath().c_str());
    EXPECT_TRUE(lookFails());
    EXPECT_EQ(std::vector<std::string>{noStatText()}, mLog.texts());
}

TEST_F(CheckHeartbeat, AnUnreadableLookKeepsTheTimeSeenLast) {
    touch(1000);
    EXPECT_FALSE(lookFails());
    unlink(sensorPidFilePath().c_str());
    EXPECT_FALSE(lookFails());
    touch(1000);
    EXPECT_TRUE(lookFails());
    EXPECT_EQ((std::vector<std::string>{noStatText(), unchangedText()}), mLog.texts());
}

TEST_F(CheckHeartbeat, TheFirstSuccessfulLookDoesNotResetTheCounter) {
    EXPECT_FALSE(lookFails());
    touch(1000);
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(lookFails());
}

TEST_F(CheckHeartbeat, ATimeOfZeroIsNothingSeenYet) {
    touch(0);
    for (unsigned lLook = 0; lLook < 5; ++lLook) {
        EXPECT_FALSE(lookFails());
    }
    touch(1000);
    EXPECT_FALSE(lookFails());
    EXPECT_FALSE(lookFails());
    EXPECT_TRUE(lookFails());
}

TEST_F(CheckHeartbeat, TheTraceEndsBeforeTheWarningOfAnUnchangedTime) {
    touch(1000);
    lookFails();
    lookFails();
    mLog.forget();
    setLogCode(ZTLL_Debug | ZTLL_Warning);
    EXPECT_TRUE(lookFails());
    EXPECT_EQ((std::vector<std::string>{"-T- Entered", "-T- Entered", "-T- Left", "-T- Left", unchangedText()}),
              mLog.texts("", ".//CheckHeartbeat"));
}

TEST_F(CheckHeartbeat, ARunningProcessIsFoundRunning) {
    EXPECT_TRUE(isRunning(std::to_string(getpid()) + "\n"));
    EXPECT_TRUE(isRunning(std::to_string(getpid())));
    EXPECT_TRUE(isRunning("1\n")) << "a process that may not be signalled exists";
}

TEST_F(CheckHeartbeat, AProcessThatIsGoneIsNotRunning) {
    EXPECT_FALSE(isRunning(std::to_string(idOfAGoneProcess()) + "\n"));
}

TEST_F(CheckHeartbeat, AZombieIsNotRunning) {
    const ZTCZombie lZombie;
    EXPECT_FALSE(isRunning(std::to_string(lZombie.getPid()) + "\n"));
}

TEST_F(CheckHeartbeat, AFileThatNamesNoProcessIsNoRunningProcess) {
    for (const char* lpContent : {"", "\n", "sensor\n", "0\n", "-1\n", "99999999999999999999\n", "0x10\n", "1x\n"}) {
        EXPECT_FALSE(isRunning(lpContent)) << '"' << lpContent << '"';
    }
    unlink(sensorPidFilePath().c_str());
    EXPECT_THROW(mCheck.getProcStatus(), ZTCClibGetProcStatusFailedEx);
}

TEST_F(CheckHeartbeat, AnInterfaceThatIsNoSystemHasNoProcessStatus) {
    ZTCSystemInterface lInterface;
    writeFile(sensorPidFilePath(), std::to_string(getpid()));
    ZTCCheckHeartbeat lCheck(ZTCPointer<ZTCString>(new ZTCString(sensorPidFilePath().c_str())), &lInterface);
    EXPECT_THROW(lCheck.getProcStatus(), ZTCClibGetProcStatusFailedEx);
}
