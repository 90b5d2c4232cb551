#include "libkpm/linux/src/EntryPoints.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <thread>

#include "libkpm/linux/src/ExitSwitch.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/linux/FakeKernel.h"
#include "tests/unit/linux/LinuxRecorder.h"

class LinuxEntryPoints : public testing::Test {
protected:
    LinuxEntryPoints() {
        ::setenv("KPM_LINUX_SYSFS", mKernel.sysfs().c_str(), 1);
        // No tracefs that could make instances: one that is not there.
        ::setenv("KPM_LINUX_TRACEFS", (mKernel.tracefs() + "/nowhere").c_str(), 1);
    }
    ~LinuxEntryPoints() override {
        mrList.Close();
        mrList.SetLog(nullptr);
    }

    ZTCLinuxLog mLog;
    ZTCFakeKernel mKernel;
    ZTCLinuxRecorder mRecorder;
    const KPM_FunctionList& mrList = *getLinuxFunctionList();
};

TEST_F(LinuxEntryPoints, TheTableIsWhole) {
    EXPECT_EQ(mrList.version, 1u);
    EXPECT_EQ(mrList.size, KPM_FUNCTION_LIST_SIZE_REPORT);
    EXPECT_NE(mrList.KpmUnregEvent, nullptr);
    EXPECT_NE(mrList.SetLog, nullptr);
    EXPECT_NE(mrList.SetReport, nullptr);
}

TEST_F(LinuxEntryPoints, BeforeInitAndAfterCloseNothingIsThere) {
    mKernel.addHost(0);
    for (int lRound = 0; lRound < 2; ++lRound) {
        HBA_wwn lName{};
        EXPECT_EQ(mrList.GetNumberOfAdapters(), 0u);
        EXPECT_EQ(mrList.IsZtapiSupported(), 0u);
        EXPECT_EQ(mrList.GetAdapterInfo(0, &lName, &lName), ZTLST_NotOpen);
        EXPECT_EQ(mrList.KpmRegEvent(0, FC_REG_LINK_EVENT, nullptr, 168, ZTCLinuxRecorder::linkCallback()), 0u);
        EXPECT_EQ(mrList.KpmUnregEvent(0, 1), ZTLST_NotOpen);
        EXPECT_EQ(mrList.ZtapiUnregEvent(0, lName, 1), ZTLST_NotOpen);
        mrList.Close();
        EXPECT_EQ(mrList.Init(), 0u);
        EXPECT_EQ(mrList.GetNumberOfAdapters(), 1u);
        EXPECT_EQ(mrList.IsZtapiSupported(), 1u);
        EXPECT_EQ(mrList.GetAdapterInfo(0, &lName, &lName), 0u);
        mrList.Close();
    }
}

TEST_F(LinuxEntryPoints, ASecondInitIsRefusedAndChangesNothing) {
    mKernel.addHost(0);
    EXPECT_EQ(mrList.Init(), 0u);
    EXPECT_EQ(mrList.Init(), ZTLST_AlreadyOpen);
    EXPECT_EQ(mLog.count("1 Init: the library is open"), 1u);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 1u);
}

TEST_F(LinuxEntryPoints, WithoutALogFunctionItWorksInSilence) {
    mrList.SetLog(nullptr);
    mKernel.addHost(0);
    EXPECT_EQ(mrList.Init(), 0u);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 1u);
    EXPECT_EQ(mLog.all(), "");
}

TEST_F(LinuxEntryPoints, TheLogFunctionIsUsedFromInitOn) {
    mKernel.addHost(0);
    EXPECT_EQ(mrList.Init(), 0u);
    EXPECT_EQ(mLog.count("3 board 0 is host0"), 1u);
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: there is no tracefs at " + mKernel.tracefs() + "/nowhere"), 1u);
}

TEST_F(LinuxEntryPoints, RegistersDeliversAndUnregistersThroughTheTable) {
    mKernel.addHost(0);
    ASSERT_EQ(mrList.Init(), 0u);
    const std::uint32_t lHandle =
        mrList.KpmRegEvent(0, FC_REG_LINK_EVENT, nullptr, 168, ZTCLinuxRecorder::linkCallback());
    EXPECT_NE(lHandle, 0u);
    std::uint32_t lPortHandle = 0;
    EXPECT_EQ(mrList.ZtapiRegEvent(0, portName(1), 4, 0x08, &mRecorder, &lPortHandle, &ZTCLinuxRecorder::onScope),
              KPM_STATUS_NO_SOURCE);
    EXPECT_EQ(mrList.ZtapiUnregEvent(0, portName(1), lPortHandle), 0u);
    mKernel.setState(0, "Linkdown");
    EXPECT_EQ(mRecorder.waitFor(1), std::vector<std::string>{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    EXPECT_EQ(mrList.KpmUnregEvent(0, lHandle), 0u);
}

TEST_F(LinuxEntryPoints, TheNumberOfAdaptersIsAnsweredWhileACallbackIsHeldUpAndWhileCloseWaits) {
    mKernel.addHost(0);
    std::atomic<bool> lIsIn{false};
    std::atomic<bool> lMayReturn{false};
    mRecorder.setHook([&] {
        lIsIn = true;
        while (!lMayReturn) {
            std::this_thread::yield();
        }
    });
    ASSERT_EQ(mrList.Init(), 0u);
    mrList.KpmRegEvent(0, FC_REG_LINK_EVENT, nullptr, 168, ZTCLinuxRecorder::linkCallback());
    mKernel.setState(0, "Linkdown");
    waitUntil([&] { return lIsIn.load(); }, "the callback");
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 1u);
    ZTCTestThread lCloser([this] { mrList.Close(); });
    waitUntil([this] { return mrList.GetNumberOfAdapters() == 0; }, "Close to have begun");
    lMayReturn = true;
    lCloser.join();
    EXPECT_EQ(mrList.Init(), 0u);
}

/// Exits with 7 where the exit-time code finds the events on and leaves them off.
static void sExitWithTheEventsOn() {
    ZTCFakeKernel& lrKernel = *new ZTCFakeKernel;
    lrKernel.mFormat = doneFormat(false);
    lrKernel.addTypes();
    lrKernel.addHost(0);
    ZTCLinuxEngine& lrEngine = *new ZTCLinuxEngine(lrKernel.options(), lrKernel);
    lrEngine.start();
    ZTCLinuxRecorder& lrRecorder = *new ZTCLinuxRecorder;
    lrRecorder.registerAll(lrEngine, 0);
    lrKernel.sendDone({.mResult = 0x28, .mHasSense = false});
    lrRecorder.waitFor(1);
    const auto lStates = [&] {
        return lrKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/enable") +
               lrKernel.senseFile("events/" + lrKernel.probes().at(0) + "/check_sense/enable");
    };
    const bool lWasOn = lStates() == "11";
    pullLinuxExitSwitch();
    const bool lIsOff = lStates() == "00";
    std::filesystem::remove_all(std::filesystem::path(lrKernel.sysfs()).parent_path());
    std::exit(lWasOn && lIsOff ? 7 : 1);
}

TEST(LinuxEntryPointsDeathTest, AProcessThatExitsWithoutClosingSwitchesTheEventsOffAndJoinsNothing) {
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(sExitWithTheEventsOn(), testing::ExitedWithCode(7), "");
}
