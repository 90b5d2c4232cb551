// Calls of the collector and of the keeper that fail: the first one, the second ..., alone, with all later ones for a
// while, or with all later ones for good, in a sensor that collects, reloads its settings, is asked for its state, and
// loses its collector now and then. Nothing is lost and nothing counts twice; where the keeper ends, a service manager
// starts the next one.
//
// A few numbers of each call are tried here; scripts/check-sensor-faults tries all.
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <span>
#include <vector>

#include "sensor/store/include/History.h"
#include "tests/faults/FaultInjection.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/SensorProcess.h"

/// Milliseconds: shorter than any time after which the agent or the collector counts as hung.
static constexpr unsigned scSpan = 200;
/// Numbers of a call beyond this one are like earlier ones: the loop has come round.
static constexpr unsigned scMostCalls = 100;
/// Calls in a look at a process that nobody exercises. One that spins makes many times as many.
static constexpr std::uint32_t scMostCallsInALook = 2000;
static constexpr std::chrono::milliseconds scLook{500};

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
        if (!mIsAsking) {
            return;
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
        waitForSoundHistory(mSensor.stateDirectory());
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

    // ---- for good ----
    bool isAllStored() const {
        try {
            return countStored(mSensor.stateDirectory()) >= mDelivered;
        } catch (const std::exception&) {
            return false;  // the history is just being opened
        }
    }
    /// Whether the sensor's messages since then name the failure. A collector whose writes fail has no voice.
    bool hasSaid(std::size_t aSince, const ZTSFailingCall& acrCall) const {
        const std::string lText = mSensor.standardError().substr(aSince);
        return std::strcmp(acrCall.mpCall, "write") == 0 ||
               lText.find(std::strerror(acrCall.mErrno)) != std::string::npos ||
               lText.find("bad_alloc") != std::string::npos;
    }
    /// Gives responses that could not be read for long, and were set aside, to the next sensor.
    void putBack() const {
        for (const std::string& lrName : listSpool(mSensor.stateDirectory())) {
            if (const std::filesystem::path lPath = mSensor.stateDirectory() + "/spool/" + lrName;
                lPath.extension() == ".unreadable") {
                std::filesystem::rename(lPath, std::filesystem::path(lPath).replace_extension());
            }
        }
    }
    void expectNoSpinning() const {
        const std::uint32_t lBefore = mFaults.countCalls();
        const ZTCDeadline lLook(scLook);
        waitUntil([&] { return lLook.isOver(); }, "the end of the look");
        EXPECT_LT(mFaults.countCalls() - lBefore, scMostCallsInALook) << "it spins";
    }
    /// The call fails from this number on, and never works again: the process goes on, ends, or says so. It does not
    /// spin, and it stops when it is told to. The next sensor works. False: so many calls are not made.
    bool failForGood(const ZTSFailingCall& acrCall, unsigned aNth) {
        SCOPED_TRACE(std::string(acrCall.mpCall) + " number " + std::to_string(aNth) + " and all later ones for good");
        const std::size_t lSaid = mSensor.standardError().size();
        mFaults.arm({.mCall = acrCall.mpCall, .mNth = aNth, .mErrno = acrCall.mErrno, .mIsLasting = true});
        const ZTCDeadline lEnd(std::chrono::milliseconds(2 * scSpan));
        waitUntil(
            [&] {
                exercise();
                mIsAsking = !mFaults.hasFired();  // a sensor that never answers would be waited for each time
                return lEnd.isOver() && (mFaults.hasFired() || aNth > 1);
            },
            "the first failure");
        const bool lHasFired = mFaults.hasFired();
        if (lHasFired) {
            expectNoSpinning();
            waitUntil([&] { return mSensor.process().hasEnded() || isAllStored() || hasSaid(lSaid, acrCall); },
                      "an end, a word, or all of it in the history", ZTCDeadline(3 * gcTestPatience));
        }
        mEnded += mSensor.process().hasEnded() ? 1 : 0;
        EXPECT_LE(mSensor.process().hasEnded() ? mSensor.waitForExit() : mSensor.stop(), 1);
        mFaults.disarm();
        mIsAsking = true;
        putBack();
        mSensor.launch();
        waitUntilItWorks();
        return lHasFired;
    }
    void failForGoodFromEachOn(const ZTSFailingCall& acrCall) {
        for (unsigned lNth = 1; lNth <= (sIsWhole() ? scMostCalls : 1) && !HasFailure(); lNth += 1 + lNth / 2) {
            if (!failForGood(acrCall, lNth)) {
                break;
            }
            ++mFailures;
        }
        EXPECT_GT(mFailures, 0U) << acrCall.mpCall << " is never called";
        EXPECT_EQ(mSensor.stop(), 0);
        expectSoundHistory(mSensor.stateDirectory());
    }
    /// Events in gaps: agents held them when they were ended without a collector.
    std::uint64_t countInGaps() const {
        std::uint64_t lSum = 0;
        for (const ZTSGap& lrGap : ZTCHistory(mSensor.stateDirectory()).readGaps()) {
            lSum += lrGap.getOccurrences();
        }
        return lSum;
    }

    ZTCSensorProcess mSensor{"collect.period = 0.1\nagent.heartbeat = 1\nagent.log_level = 1\nhttp.listen = \"\"\n"};
    ZTCFaultSwitch mFaults{mSensor.path("faults")};
    std::uint64_t mDelivered = 0;
    unsigned mRounds = 0;
    bool mIsAsking = true;
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

static constexpr ZTSFailingCall scCollectorCalls[] = {{"accept4", EMFILE},   {"close", EIO},
                                                      {"fallocate", ENOSPC}, {"fcntl", EMFILE},
                                                      {"fstat", EIO},        {"ftruncate", EIO},
                                                      {"ioctl", EIO},        {"mkdir", EACCES},
                                                      {"open", EMFILE},      {"open", ENOSPC},
                                                      {"opendir", EMFILE},   {"poll", EINTR},
                                                      {"poll", ENOMEM},      {"pread", EIO},
                                                      {"read", EIO},         {"recvmsg", ENOBUFS},
                                                      {"rename", ENOSPC},    {"sendmsg", ENOBUFS},
                                                      {"splice", ENOSPC},    {"unlink", EROFS},
                                                      {"write", EIO},        {gcAllocationCall, ENOMEM}};

static constexpr ZTSFailingCall scKeeperCalls[] = {
    {"close", EIO},       {"fork", EAGAIN},       {"fstat", EIO},
    {"open", EMFILE},     {"pipe2", EMFILE},      {"poll", EINTR},
    {"poll", ENOMEM},     {"read", EIO},          {"recvmsg", ENOBUFS},
    {"sendmsg", ENOBUFS}, {"socketpair", EMFILE}, {"timerfd_settime", EINVAL},
    {"futimens", EACCES}, {"write", EIO},         {gcAllocationCall, ENOMEM}};

INSTANTIATE_TEST_SUITE_P(Calls, CollectorFaultTest, testing::ValuesIn(scCollectorCalls), sNameOf);

class KeeperFaultTest : public SensorFaultTest, public testing::WithParamInterface<ZTSFailingCall> {};

TEST_P(KeeperFaultTest, ItGoesOnOrTheNextOneDoes) {
    start("tavik-sensor");
    failEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Calls, KeeperFaultTest, testing::ValuesIn(scKeeperCalls), sNameOf);

/// Those that fail for good: all, or these few. A signal in each call is nothing that lasts.
static std::vector<ZTSFailingCall> sForGood(std::span<const ZTSFailingCall> aAll, std::vector<ZTSFailingCall> aFew) {
    if (!sIsWhole()) {
        return aFew;
    }
    std::vector<ZTSFailingCall> lCalls(aAll.begin(), aAll.end());
    std::erase_if(lCalls, [](const ZTSFailingCall& acrCall) { return acrCall.mErrno == EINTR; });
    return lCalls;
}

class CollectorFaultForGoodTest : public SensorFaultTest, public testing::WithParamInterface<ZTSFailingCall> {};

TEST_P(CollectorFaultForGoodTest, ItDoesNotSpinItStopsAndTheNextOneLosesNothingButWhatTheAgentHeld) {
    start("tavik-collector");
    failForGoodFromEachOn(GetParam());
    EXPECT_EQ(mEnded, 0U) << "the keeper goes on";
    EXPECT_EQ(countStored(mSensor.stateDirectory()) + countInGaps(), mDelivered);
    EXPECT_EQ(countRefused(mSensor.stateDirectory()), 0U);
    std::cout << mFailures << " failures for good, " << mDelivered << " events, " << countInGaps() << " in gaps\n";
}

INSTANTIATE_TEST_SUITE_P(Calls, CollectorFaultForGoodTest,
                         testing::ValuesIn(sForGood(scCollectorCalls,
                                                    {{"open", EMFILE}, {"read", EIO}, {"splice", ENOSPC}})),
                         sNameOf);

class KeeperFaultForGoodTest : public SensorFaultTest, public testing::WithParamInterface<ZTSFailingCall> {};

TEST_P(KeeperFaultForGoodTest, ItDoesNotSpinItStopsAndTheNextOneWorks) {
    start("tavik-sensor");
    failForGoodFromEachOn(GetParam());
    std::cout << mFailures << " failures for good, " << mEnded << " ends of the keeper, " << mDelivered << " events\n";
}

INSTANTIATE_TEST_SUITE_P(Calls, KeeperFaultForGoodTest,
                         testing::ValuesIn(sForGood(scKeeperCalls,
                                                    {{"fstat", EIO}, {"open", EMFILE}, {"recvmsg", ENOBUFS}})),
                         sNameOf);
