// Calls of the collector and of the keeper that fail: the first one, the second ..., alone or with all later ones for a
// while, in a sensor that collects, reloads its settings, is asked for its state, and loses its collector now and then.
// Nothing is lost and nothing counts twice; where the keeper ends, a service manager starts the next one.
//
// A few numbers of each call are tried here; scripts/check-sensor-faults tries all.
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <iostream>

#include "sensor/store/include/History.h"
#include "tests/faults/FaultInjection.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"

/// Milliseconds: shorter than any time after which the agent or the collector counts as hung.
static constexpr unsigned scSpan = 200;
/// Numbers of a call beyond this one are like earlier ones: the loop has come round.
static constexpr unsigned scMostCalls = 100;

static bool sIsWhole() {
    return std::getenv("ZT_SENSOR_FAULTS_WHOLE") != nullptr;
}

struct ZTSFailingCall {
    const char* mpCall;
    int mErrno;
};

static void PrintTo(const ZTSFailingCall& acrCall, std::ostream* apStream) {
    *apStream << acrCall.mpCall << " " << strerrorname_np(acrCall.mErrno);
}

class SensorFaultTest : public testing::Test {
protected:
    void start(const std::string& acrProgram) {
        for (const auto& [lrName, lrValue] : mFaults.getEnvironment(acrProgram)) {
            mSensor.setEnvironment(lrName, lrValue);
        }
        mSensor.start();
        ASSERT_TRUE(mFaults.isAttached());
    }
    /// What the sensor is made to do while calls fail. The library's answers count what it has delivered.
    void exercise() {
        ++mRounds;
        for (const char* lpKind : {"queue-full", "device-busy"}) {
            try {
                mSensor.simulate(std::string(lpKind) + " board=hba0");
                ++mDelivered;
            } catch (const std::runtime_error&) {
                // There is no agent just now.
            }
        }
        if (mSensor.process().hasEnded()) {
            return;
        }
        if (mRounds % 2 == 0) {
            mSensor.process().sendSignal(SIGHUP);
        }
        if (mRounds % 4 == 0) {
            if (const pid_t lCollector = mSensor.findCollector(); lCollector != 0) {
                kill(lCollector, SIGKILL);
            }
        }
        try {
            mSensor.status();
        } catch (const std::exception&) {
            // A collector that is just starting, or one whose call fails, does not answer.
        }
    }
    /// With nothing that fails: it works, or the next one does.
    void waitUntilItWorks() {
        waitUntil(
            [this] {
                if (mSensor.process().hasEnded()) {
                    ++mEnded;
                    mSensor.launch();
                }
                try {
                    return mSensor.simulate("status").find("schedule=done") != std::string::npos &&
                           mSensor.status()["keeper"]["state"] == "running";
                } catch (const std::exception&) {
                    return false;
                }
            },
            "a sensor that works", ZTCDeadline(6 * gcTestPatience));
        mSensor.waitUntilAllIsStored();
    }
    /// Fails the call at each of its numbers until it is made no more. Returns how often it failed.
    unsigned fail(const ZTSFailingCall& acrCall, bool aIsLasting) {
        unsigned lFailures = 0;
        for (unsigned lNth = 1; lNth <= scMostCalls && !HasFailure(); lNth += sIsWhole() ? 1 : 1 + 6 * lNth) {
            SCOPED_TRACE(std::string(acrCall.mpCall) + " number " + std::to_string(lNth) +
                         (aIsLasting ? " and later ones" : ""));
            mFaults.arm({.mCall = acrCall.mpCall,
                         .mNth = lNth,
                         .mErrno = acrCall.mErrno,
                         .mIsLasting = aIsLasting,
                         .mSpan = aIsLasting ? scSpan : 0});
            const ZTCDeadline lEnd(std::chrono::milliseconds(2 * scSpan));
            waitUntil(
                [&] {
                    exercise();
                    // Every call is made at least once, however slow the machine is. Of later numbers nobody knows.
                    const bool lHasFired = mFaults.hasFired();
                    return lHasFired ? !aIsLasting || lEnd.isOver() : lNth > 1 && lEnd.isOver();
                },
                "the end of the failures");
            const bool lHasFired = mFaults.hasFired();
            mFaults.disarm();
            waitUntilItWorks();
            lFailures += lHasFired ? 1 : 0;
            if (!lHasFired) {
                break;
            }
        }
        return lFailures;
    }
    void failEachWay(const ZTSFailingCall& acrCall) {
        for (const bool lIsLasting : {false, true}) {
            mFailures += fail(acrCall, lIsLasting);
        }
        EXPECT_GT(mFailures, 0U) << acrCall.mpCall << " is never called";
        EXPECT_EQ(mSensor.stop(), 0);
        expectSoundHistory(mSensor.stateDirectory());
        std::cout << mFailures << " failures, " << mEnded << " ends of the keeper, " << mDelivered << " events\n";
    }

    ZTCSensorProcess mSensor{"collect.period = 0.1\nagent.heartbeat = 1\nagent.log_level = 1\nhttp.listen = \"\"\n"};
    ZTCFaultSwitch mFaults{mSensor.path("faults")};
    std::uint64_t mDelivered = 0;
    unsigned mRounds = 0;
    unsigned mFailures = 0;
    unsigned mEnded = 0;
};

static std::string sNameOf(const testing::TestParamInfo<ZTSFailingCall>& acrInfo) {
    return std::string(acrInfo.param.mpCall) + "_" + strerrorname_np(acrInfo.param.mErrno);
}

class CollectorFaultTest : public SensorFaultTest, public testing::WithParamInterface<ZTSFailingCall> {};

TEST_P(CollectorFaultTest, LosesNothingAndCountsNothingTwice) {
    start("tavik-collector");
    failEachWay(GetParam());
    EXPECT_EQ(countStored(mSensor.stateDirectory()), mDelivered);
    EXPECT_EQ(countRefused(mSensor.stateDirectory()), 0U);
    EXPECT_TRUE(ZTCHistory(mSensor.stateDirectory()).readGaps().empty());
    EXPECT_EQ(mEnded, 0U) << "the keeper goes on";
}

INSTANTIATE_TEST_SUITE_P(Calls, CollectorFaultTest,
                         testing::Values(ZTSFailingCall{"accept4", EMFILE}, ZTSFailingCall{"close", EIO},
                                         ZTSFailingCall{"fallocate", ENOSPC}, ZTSFailingCall{"fcntl", EMFILE},
                                         ZTSFailingCall{"fstat", EIO}, ZTSFailingCall{"ftruncate", EIO},
                                         ZTSFailingCall{"ioctl", EIO}, ZTSFailingCall{"mkdir", EACCES},
                                         ZTSFailingCall{"open", EMFILE}, ZTSFailingCall{"open", ENOSPC},
                                         ZTSFailingCall{"opendir", EMFILE}, ZTSFailingCall{"poll", EINTR},
                                         ZTSFailingCall{"pread", EIO}, ZTSFailingCall{"read", EIO},
                                         ZTSFailingCall{"recvmsg", ENOBUFS}, ZTSFailingCall{"rename", ENOSPC},
                                         ZTSFailingCall{"sendmsg", ENOBUFS}, ZTSFailingCall{"splice", ENOSPC},
                                         ZTSFailingCall{"unlink", EROFS}, ZTSFailingCall{"write", EIO},
                                         ZTSFailingCall{gcAllocationCall, ENOMEM}),
                         sNameOf);

class KeeperFaultTest : public SensorFaultTest, public testing::WithParamInterface<ZTSFailingCall> {};

TEST_P(KeeperFaultTest, ItGoesOnOrTheNextOneDoes) {
    start("tavik-sensor");
    failEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Calls, KeeperFaultTest,
                         testing::Values(ZTSFailingCall{"close", EIO}, ZTSFailingCall{"fork", EAGAIN},
                                         ZTSFailingCall{"fstat", EIO}, ZTSFailingCall{"open", EMFILE},
                                         ZTSFailingCall{"pipe2", EMFILE}, ZTSFailingCall{"poll", EINTR},
                                         ZTSFailingCall{"poll", ENOMEM}, ZTSFailingCall{"read", EIO},
                                         ZTSFailingCall{"recvmsg", ENOBUFS}, ZTSFailingCall{"sendmsg", ENOBUFS},
                                         ZTSFailingCall{"socketpair", EMFILE},
                                         ZTSFailingCall{"timerfd_settime", EINVAL}, ZTSFailingCall{"futimens", EACCES},
                                         ZTSFailingCall{"write", EIO}, ZTSFailingCall{gcAllocationCall, ENOMEM}),
                         sNameOf);
