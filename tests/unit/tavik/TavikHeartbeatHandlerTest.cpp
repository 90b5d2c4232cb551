#include "tavik/include/TavikHeartbeatHandler.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <limits>
#include <stdexcept>

#include "common/include/Exception.h"
#include "common/include/Log.h"
#include "tests/unit/tavik/support/FileTimes.h"
#include "tests/unit/tavik/support/TavikFixture.h"

namespace {

const char* const scQueryText = "-N- Checking the status of the actual sensor process/service";
const char* const scAliveText = "-N- Sensor process still running, but not updating the heartbeat";
const char* const scGoneText = "-H- Failed in getting the status of Sensor";
const char* const scExitText = "-H- Exiting Heartbeat Handler Thread as it is marked for exit.";

/// The thread procedure on the test's own thread, under a clock that the test moves: a wait of the thread sets the
/// clock forward by the time waited for, and lets the test act at that moment. The modification times in the test's
/// directory are those of this clock.
class TavikHeartbeatHandler : public ZTCTavikFixture {
protected:
    TavikHeartbeatHandler() {
        bringUp();
        writeFile(pidFilePath(), std::to_string(getpid()) + "\n");
        mSystem->mMakeThreadsToExit = [this] { ++mExitRequests; };
        mSystem->mTimedWait = [this](unsigned aConditional, unsigned aSeconds) {
            EXPECT_EQ(0u, aConditional);
            mNow += aSeconds;
            ++mPeriod;
            if (mPeriod > mLastPeriod) {
                handler().setForExit();
            } else {
                mAct();
            }
            throw ZTCTimeOutEx();
        };
    }

    void sensorIs(const std::string& acrContent) {
        writeFile(sensorPidFilePath(), acrContent);
        setFileTime(sensorPidFilePath(), mNow);
    }
    void sensorIsThisProcess() { sensorIs(std::to_string(getpid()) + "\n"); }
    void sensorTouches() { setFileTime(sensorPidFilePath(), mNow); }

    ZTCTavikHeartbeatHandler& handler() {
        return dynamic_cast<ZTCTavikHeartbeatHandler&>(*mSystem->threadComponents().get(0));
    }

    /// Runs for so many periods, unless the thread ends by itself before.
    void run(unsigned aPeriods = 10) {
        mLastPeriod = mPeriod + aPeriods;
        ZTSThreadArguments lArguments{&handler(), mSystem.get()};
        EXPECT_EQ(nullptr, TavikHeartbeatThread(&lArguments));
    }

    std::vector<std::string> ownTexts() const { return mLog.texts("", ".//TavikHeartbeatHandler"); }

    std::string unchangedText() const {
        return "-W- Modfication time of the " + sensorPidFilePath() + " hasn't changed";
    }
    std::string noStatText() const { return "-W- Failed in stat on " + sensorPidFilePath() + " file"; }

    std::time_t mNow = 1000000;
    unsigned mPeriod = 0;                ///< that is over
    std::function<void()> mAct = [] {};  ///< at the end of every period, before the thread goes on
    unsigned mExitRequests = 0;

private:
    unsigned mLastPeriod = 0;
};

}  // namespace

// ---- The clock ----

TEST_F(TavikHeartbeatHandler, ASensorThatNeverTouchesItsFileIsQueriedThreePeriodsAfterTheStartAndThenInEachOne) {
    sensorIsThisProcess();
    const std::time_t lStart = mNow;
    std::vector<std::time_t> lQueries;
    std::size_t lQueryLines = 0;
    // What the last cycle logged is seen at the end of the next period.
    mAct = [&] {
        const std::size_t lLines = mLog.count(scQueryText);
        if (lLines != lQueryLines) {
            lQueries.push_back(mNow - 240 - lStart);
        }
        lQueryLines = lLines;
    };
    run(8);
    EXPECT_EQ((std::vector<std::time_t>{720, 960, 1200, 1440, 1680}), lQueries);
    EXPECT_EQ(0u, mExitRequests);
}

TEST_F(TavikHeartbeatHandler, EveryCycleOfASilentSensorThatLivesEarnsItsTwoNotices) {
    sensorIsThisProcess();
    run(6);
    std::vector<std::string> lExpected;
    for (unsigned lCycle = 3; lCycle <= 6; ++lCycle) {
        lExpected.insert(lExpected.end(), {unchangedText(), scQueryText, scAliveText});
    }
    lExpected.emplace_back(scExitText);
    EXPECT_EQ(lExpected, mLog.texts());
}

TEST_F(TavikHeartbeatHandler, ASensorThatTouchesItsFileInEveryPeriodIsNeverQueried) {
    sensorIs("no process\n");
    mAct = [this] { sensorTouches(); };
    run(20);
    EXPECT_EQ(std::vector<std::string>{scExitText}, mLog.texts());
}

TEST_F(TavikHeartbeatHandler, ASensorThatTouchesItsFileInEverySecondPeriodIsNeverQueried) {
    sensorIs("no process\n");
    mAct = [this] {
        if (mPeriod % 2 == 0) {
            sensorTouches();
        }
    };
    run(20);
    EXPECT_EQ(std::vector<std::string>{scExitText}, mLog.texts());
}

TEST_F(TavikHeartbeatHandler, ASensorThatTouchesItsFileInEveryThirdPeriodIsQueriedOnceInBetween) {
    sensorIsThisProcess();
    mAct = [this] {
        if (mPeriod % 3 == 0) {
            sensorTouches();
        }
    };
    // Looks 1 and 2 find the first time; 3 finds it changed; 4 and 5 do not, and so on.
    run(12);
    EXPECT_EQ(3u, mLog.count(scQueryText));
    EXPECT_EQ(3u, mLog.count(scAliveText));
}

TEST_F(TavikHeartbeatHandler, ASensorThatTouchesItsFileAgainIsForgiven) {
    sensorIsThisProcess();
    mAct = [this] {
        if (mPeriod == 6) {
            sensorTouches();
        }
    };
    run(9);
    // Queried in the cycles 3, 4 and 5, not in 6 and 7, and again in 8 and 9.
    EXPECT_EQ(5u, mLog.count(scQueryText));
}

TEST_F(TavikHeartbeatHandler, LooksThatFindNoFileAndLooksThatFindNoChangeShareOneCounter) {
    sensorIsThisProcess();
    mAct = [this] {
        switch (mPeriod) {
            case 2:
                unlink(sensorPidFilePath().c_str());
                break;
            case 3:
                writeFile(sensorPidFilePath(), std::to_string(getpid()));
                setFileTime(sensorPidFilePath(), 1000000);
                break;
            default:
                break;
        }
    };
    run(3);
    EXPECT_EQ((std::vector<std::string>{noStatText(), unchangedText(), scQueryText, scAliveText, scExitText}),
              mLog.texts());
}

TEST_F(TavikHeartbeatHandler, WaitsForItsTimeoutEachTimeAndSaysSo) {
    setLogCode(ZTLL_Debug);
    sensorIsThisProcess();
    run(2);
    EXPECT_EQ(1000000 + 3 * 240, mNow);
    EXPECT_EQ(3u, mLog.count("-T- Going to wait for 240 seconds"));
}

TEST_F(TavikHeartbeatHandler, ASignalOfItsConditionalIsACycleToo) {
    sensorIsThisProcess();
    unsigned lWaits = 0;
    mSystem->mTimedWait = [&](unsigned, unsigned) {
        if (++lWaits == 4) {
            handler().setForExit();
        }
    };
    run();
    EXPECT_EQ((std::vector<std::string>{unchangedText(), scQueryText, scAliveText, scExitText}), mLog.texts());
}

// ---- The own file ----

TEST_F(TavikHeartbeatHandler, TheOwnFileIsTouchedOnceACycleBeforeTheSensorIsLookedAt) {
    setLogCode(ZTLL_Debug);
    sensorIsThisProcess();
    std::vector<bool> lWasTouched;
    mAct = [&] {
        lWasTouched.push_back(fileTime(pidFilePath()) != 1000);
        setFileTime(pidFilePath(), 1000);
    };
    run(4);
    EXPECT_EQ(std::vector<bool>(4, true), lWasTouched);
    EXPECT_NE(1000, fileTime(pidFilePath()));
    std::vector<std::string> lSteps;
    for (const ZTSLogLine& lcrLine : mLog.lines()) {
        if (lcrLine.mFunction == "SetHeartbeat" || lcrLine.mFunction == "CheckStatus") {
            lSteps.push_back(lcrLine.mFunction + " " + lcrLine.mText);
        }
    }
    std::vector<std::string> lExpected;
    for (unsigned lCycle = 1; lCycle <= 4; ++lCycle) {
        lExpected.insert(lExpected.end(),
                         {"SetHeartbeat Entered", "SetHeartbeat Setting the mod time of " + pidFilePath(),
                          "SetHeartbeat Left", "CheckStatus Entered", "CheckStatus Left"});
    }
    EXPECT_EQ(lExpected, lSteps);
    EXPECT_EQ(4u, mLog.count("-T- Updating the status"));
    EXPECT_EQ(4u, mLog.count("-T- Checking the status of Sensor"));
}

TEST_F(TavikHeartbeatHandler, AnOwnFileThatCannotBeTouchedEndsTheAgentWithoutALookAtTheSensor) {
    // The sensor's file is missing too: a look at it would be a warning.
    mAct = [this] { unlink(pidFilePath().c_str()); };
    run();
    EXPECT_EQ(std::vector<std::string>{"-H- Failed in updating the status"}, mLog.texts());
    EXPECT_EQ(1u, mExitRequests);
    EXPECT_EQ(1u, mPeriod);
    EXPECT_FALSE(exists(pidFilePath())) << "the file is not made anew";
}

// ---- The sensor's process ----

TEST_F(TavikHeartbeatHandler, ASilentSensorThatIsNoLivingProcessEndsTheAgentInTheThirdCycle) {
    const ZTCZombie lZombie;
    for (const std::string& lcrContent :
         {std::to_string(lZombie.getPid()) + "\n", std::to_string(idOfAGoneProcess()) + "\n", std::string("sensor\n"),
          std::string(""), std::string("0\n"), std::string("-1\n"), std::to_string(getpid()) + "x\n",
          std::string("99999999999999999999\n")}) {
        SCOPED_TRACE(lcrContent);
        // A handler of its own each time: what it has seen lives as long as it.
        ZTCTavikHeartbeatHandler lHandler(mSystem.get(), 240);
        sensorIs(lcrContent);
        mLog.forget();
        mExitRequests = 0;
        const unsigned lFirst = mPeriod;
        unsigned lWaits = 0;
        mSystem->mTimedWait = [&](unsigned, unsigned) {
            ++mPeriod;
            if (++lWaits > 5) {
                lHandler.setForExit();
            }
        };
        ZTSThreadArguments lArguments{&lHandler, mSystem.get()};
        EXPECT_EQ(nullptr, TavikHeartbeatThread(&lArguments));
        EXPECT_EQ((std::vector<std::string>{unchangedText(), scQueryText, scGoneText}), mLog.texts());
        EXPECT_EQ(1u, mExitRequests);
        EXPECT_EQ(3u, mPeriod - lFirst);
    }
}

TEST_F(TavikHeartbeatHandler, APidFileThatCannotBeReadIsNoLivingProcess) {
    // A directory has a time like a file, and no text.
    ASSERT_EQ(0, mkdir(sensorPidFilePath().c_str(), 0700));
    run();
    EXPECT_EQ((std::vector<std::string>{unchangedText(), scQueryText, scGoneText}), mLog.texts());
    EXPECT_EQ(1u, mExitRequests);
}

TEST_F(TavikHeartbeatHandler, WithoutASensorFileTheAgentEndsInTheSecondCycle) {
    run();
    EXPECT_EQ((std::vector<std::string>{noStatText(), noStatText(), scQueryText, scGoneText}), mLog.texts());
    EXPECT_EQ(1u, mExitRequests);
    EXPECT_EQ(2u, mPeriod);
}

TEST_F(TavikHeartbeatHandler, ASensorThatDiesBetweenTwoCyclesEndsTheAgentInTheNext) {
    sensorIsThisProcess();
    const std::time_t lTime = mNow;
    mAct = [&] {
        if (mPeriod == 5) {
            sensorIs(std::to_string(idOfAGoneProcess()));
            setFileTime(sensorPidFilePath(), lTime);
        }
    };
    run();
    EXPECT_EQ(5u, mPeriod);
    EXPECT_EQ(2u, mLog.count(scAliveText));
    EXPECT_EQ(1u, mLog.count(scGoneText));
}

// ---- The end of the thread ----

TEST_F(TavikHeartbeatHandler, AnExitDuringTheWaitIsSaidAtHaltLevelAndNothingIsTouchedAnyMore) {
    setLogCode(ZTLL_Halt);
    sensorIsThisProcess();
    setFileTime(pidFilePath(), 1000);
    run(0);
    EXPECT_EQ(std::vector<std::string>{scExitText}, mLog.texts());
    EXPECT_EQ(1000, fileTime(pidFilePath()));
    EXPECT_EQ(0u, mExitRequests);
}

TEST_F(TavikHeartbeatHandler, AnExitBeforeTheWaitIsNotSaid) {
    setLogCode(255);
    handler().setForExit();
    run();
    EXPECT_EQ((std::vector<std::string>{"-T- Entered", "-T- Left"}), ownTexts());
    EXPECT_EQ(0u, mPeriod);
}

TEST_F(TavikHeartbeatHandler, AnyOtherExceptionLeavesTheThread) {
    mSystem->mTimedWait = [](unsigned, unsigned) { throw ZTCOsConditionalEx("broken"); };
    EXPECT_THROW(run(), ZTCOsConditionalEx);
    mSystem->mTimedWait = [](unsigned, unsigned) { throw std::runtime_error("foreign"); };
    EXPECT_THROW(run(), std::runtime_error);
    EXPECT_EQ(0u, mExitRequests);
    EXPECT_TRUE(mLog.texts().empty());
}

TEST_F(TavikHeartbeatHandler, AnArgumentOfAnotherKindEndsThisThreadAlone) {
    const char* const lpText = "-A- Dynamic cast of base class failed, error. Exiting the thread abnormally.";
    ZTCSystemInterface lInterface;
    ZTSThreadArguments lNoSystem{&handler(), &lInterface};
    EXPECT_EQ(nullptr, TavikHeartbeatThread(&lNoSystem));
    ZTSThreadArguments lNoHandler{mSystem->threadComponents().get(1).get(), mSystem.get()};
    EXPECT_EQ(nullptr, TavikHeartbeatThread(&lNoHandler));
    EXPECT_EQ(std::vector<std::string>(2, lpText), mLog.texts());
    EXPECT_EQ(0u, mPeriod);
    EXPECT_EQ(0u, mExitRequests);
}

TEST_F(TavikHeartbeatHandler, AMissingArgumentEndsTheProcess) {
    EXPECT_EXIT(
        {
            prepareToDie();
            TavikHeartbeatThread(nullptr);
        },
        testing::ExitedWithCode(1), failedAssertion("0 != lpArgs"));
}

TEST_F(TavikHeartbeatHandler, TakesAnyTimeout) {
    for (const unsigned lTimeout : {0u, 1u, std::numeric_limits<unsigned>::max()}) {
        const ZTCTavikHeartbeatHandler lHandler(mSystem.get(), lTimeout);
        EXPECT_EQ(lTimeout, lHandler.getWaitTime());
        EXPECT_STREQ("TavikHeartbeatThread", lHandler.getName().get());
        EXPECT_EQ(&TavikHeartbeatThread, lHandler.getProcedure());
    }
}
