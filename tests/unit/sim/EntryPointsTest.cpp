#include "libkpm/sim/src/EntryPoints.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <string>
#include <thread>

#include "libkpm/sim/src/ControlClient.h"
#include "libkpm/sim/src/Engine.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestThreads.h"
#include "tests/support/Waiting.h"
#include "tests/unit/sim/Recorder.h"

class EntryPoints : public testing::Test {
protected:
    EntryPoints() {
        for (const char* lpName : {"KPM_SIM_SCENARIO", "KPM_SIM_SOCKET", "KPM_SIM_LOG"}) {
            ::unsetenv(lpName);
        }
    }
    ~EntryPoints() override { mrList.Close(); }

    void useScenario(const std::string& acrText) {
        writeFile(mDirectory.path("s.kpm"), acrText);
        ::setenv("KPM_SIM_SCENARIO", mDirectory.path("s.kpm").c_str(), 1);
    }

    /// Init's status, with what it says on standard error in mErrors.
    std::uint32_t init() {
        testing::internal::CaptureStderr();
        const std::uint32_t lStatus = mrList.Init();
        mErrors = testing::internal::GetCapturedStderr();
        return lStatus;
    }

    std::uint32_t registerScope(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory) {
        HBA_wwn lNode{};
        HBA_wwn lPort{};
        EXPECT_EQ(mrList.GetAdapterInfo(aBoard, &lNode, &lPort), 0u);
        std::uint32_t lHandle = 0;
        return mrList.ZtapiRegEvent(aBoard, lPort, aCategory, aSubcategory, &mRecorder, &lHandle, ZTCRecorder::onScope);
    }

    const KPM_FunctionList& mrList = *getSimFunctionList();
    ZTCTemporaryDirectory mDirectory;
    ZTCRecorder mRecorder;
    std::string mErrors;
};

TEST_F(EntryPoints, TheTableIsWhole) {
    EXPECT_EQ(mrList.version, 1u);
    EXPECT_GE(mrList.size, KPM_FUNCTION_LIST_SIZE_V1);
    EXPECT_NE(mrList.KpmUnregEvent, nullptr);
}

TEST_F(EntryPoints, WithoutAScenarioThereAreTwoAdapters) {
    EXPECT_EQ(init(), 0u);
    EXPECT_EQ(mErrors, "");
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 2u);
    EXPECT_EQ(mrList.IsZtapiSupported(), 1u);
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    EXPECT_EQ(mrList.GetAdapterInfo(1, &lNode, &lPort), 0u);
    EXPECT_EQ(lPort.wwn[0], 0x30);
}

TEST_F(EntryPoints, AnEmptyVariableCountsAsUnset) {
    ::setenv("KPM_SIM_SCENARIO", "", 1);
    ::setenv("KPM_SIM_SOCKET", "", 1);
    EXPECT_EQ(init(), 0u);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 2u);
}

TEST_F(EntryPoints, BeforeInitAndAfterCloseNothingIsThere) {
    for (int lRound = 0; lRound < 2; ++lRound) {
        EXPECT_EQ(mrList.GetNumberOfAdapters(), 0u);
        EXPECT_EQ(mrList.IsZtapiSupported(), 0u);
        HBA_wwn lName{};
        EXPECT_EQ(mrList.GetAdapterInfo(0, &lName, &lName), ZTLST_NotOpen);
        EXPECT_EQ(mrList.KpmRegEvent(0, FC_REG_LINK_EVENT, nullptr, 168, nullptr), 0u);
        EXPECT_EQ(mrList.KpmUnregEvent(0, 1), ZTLST_NotOpen);
        mrList.Close();
        EXPECT_EQ(init(), 0u);
        EXPECT_EQ(mrList.GetNumberOfAdapters(), 2u);
        mrList.Close();
    }
}

TEST_F(EntryPoints, AScenarioThatDoesNotParseIsRefusedWithItsLine) {
    useScenario("ztapi yes\nqueue-ful board=0\n");
    ::setenv("KPM_SIM_LOG", mDirectory.path("log").c_str(), 1);
    EXPECT_EQ(init(), ZTLST_BadScenario);
    const std::string lExpected =
        mDirectory.path("s.kpm") + ":2: \"queue-ful\" is neither a directive nor an event kind\n";
    EXPECT_EQ(mErrors, lExpected);
    EXPECT_EQ(readFile(mDirectory.path("log")), lExpected);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 0u);
}

TEST_F(EntryPoints, AScenarioThatIsNotThereIsRefused) {
    const std::string lPath = mDirectory.path("none.kpm");
    ::setenv("KPM_SIM_SCENARIO", lPath.c_str(), 1);
    EXPECT_EQ(init(), ZTLST_NoScenario);
    EXPECT_EQ(mErrors, lPath + ": No such file or directory\n");
    ::setenv("KPM_SIM_SCENARIO", mDirectory.path().c_str(), 1);
    EXPECT_EQ(init(), ZTLST_NoScenario);
    EXPECT_EQ(mErrors, mDirectory.path() + ": is not a regular file\n");
}

TEST_F(EntryPoints, InitFailsAsToldAndCanBeCalledAgain) {
    useScenario("init status=77\n");
    EXPECT_EQ(init(), 77u);
    EXPECT_EQ(mErrors, "");
    useScenario(gcTwoAdapters);
    EXPECT_EQ(init(), 0u);
}

TEST_F(EntryPoints, ASecondInitIsRefusedAndChangesNothing) {
    EXPECT_EQ(init(), 0u);
    EXPECT_EQ(init(), ZTLST_AlreadyOpen);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 2u);
}

TEST_F(EntryPoints, PlaysNoAdaptersAndNoEventSupport) {
    useScenario("ztapi no\n");
    EXPECT_EQ(init(), 0u);
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 0u);
    EXPECT_EQ(mrList.IsZtapiSupported(), 0u);
}

TEST_F(EntryPoints, RegistersDeliversAndUnregistersThroughTheTable) {
    useScenario(std::string(gcTwoAdapters) + "start first\nbus-reset at=0\n");
    ::setenv("KPM_SIM_SOCKET", mDirectory.path("socket").c_str(), 1);
    ASSERT_EQ(init(), 0u);
    EXPECT_EQ(registerScope(0, 4, 0x20), 0u);
    mRecorder.waitForCount(1);
    const std::uint32_t lHandle = mrList.KpmRegEvent(0, FC_REG_TEMPERATURE_EVENT, nullptr, 0,
                                                     ZTCRecorder::getEventCallback(FC_REG_TEMPERATURE_EVENT));
    EXPECT_NE(lHandle, 0u);
    ZTCSimControlClient lClient(mDirectory.path("socket"));
    EXPECT_EQ(lClient.ask("temperature"), "ok 1");
    EXPECT_EQ(mrList.KpmUnregEvent(0, lHandle), 0u);
    EXPECT_EQ(lClient.ask("temperature"), "ok 0");
    EXPECT_EQ(mRecorder.getCount(), 2u);
}

TEST_F(EntryPoints, CloseRemovesTheSocketAndEndsItsClients) {
    ::setenv("KPM_SIM_SOCKET", mDirectory.path("socket").c_str(), 1);
    ASSERT_EQ(init(), 0u);
    ZTCSimControlClient lClient(mDirectory.path("socket"));
    EXPECT_EQ(lClient.ask("status").substr(0, 14), "ok delivered=0");
    mrList.Close();
    EXPECT_FALSE(exists(mDirectory.path("socket")));
    EXPECT_THROW(lClient.ask("status"), ZTCSimNobodyListens);
}

TEST_F(EntryPoints, ASocketThatCannotBeMadeFailsInit) {
    writeFile(mDirectory.path("file"), "");
    ::setenv("KPM_SIM_SOCKET", mDirectory.path("file").c_str(), 1);
    EXPECT_EQ(init(), ZTLST_NoSocket);
    EXPECT_EQ(mErrors, mDirectory.path("file") + ": exists and is not a socket\n");
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 0u);
}

TEST_F(EntryPoints, CloseEndsAnInjectionThatIsUnderWay) {
    ::setenv("KPM_SIM_SOCKET", mDirectory.path("socket").c_str(), 1);
    ASSERT_EQ(init(), 0u);
    EXPECT_EQ(registerScope(0, 4, 0x20), 0u);
    ZTCTestThread lInjector([this] {
        try {
            ZTCSimControlClient(mDirectory.path("socket")).ask("bus-reset times=1000000000");
        } catch (const ZTCSimNobodyListens&) {
            // The library is closed before it has answered, or after: both end the injection.
            return;
        }
    });
    mRecorder.waitForCount(100);
    mrList.Close();
    lInjector.join();
    const std::size_t lCount = mRecorder.getCount();
    EXPECT_LT(lCount, 1000000000u);
    EXPECT_EQ(mRecorder.getCount(), lCount);
}

TEST_F(EntryPoints, TheNumberOfAdaptersIsAnsweredWhileACallbackIsHeldUpAndWhileCloseWaits) {
    useScenario(std::string(gcTwoAdapters) + "start first\nbus-reset every=1 times=forever\n");
    ASSERT_EQ(init(), 0u);
    std::atomic<bool> lIsIn{false};
    std::atomic<bool> lMayReturn{false};
    mRecorder.setHook([&] {
        lIsIn = true;
        while (!lMayReturn) {
            std::this_thread::yield();
        }
    });
    EXPECT_EQ(registerScope(0, 4, 0x20), 0u);
    waitUntil([&] { return lIsIn.load(); }, "the callback");
    EXPECT_EQ(mrList.GetNumberOfAdapters(), 2u);
    ZTCTestThread lCloser([this] { mrList.Close(); });
    waitUntil([this] { return mrList.GetNumberOfAdapters() == 0; }, "Close to have begun");
    lMayReturn = true;
    lCloser.join();
    EXPECT_EQ(init(), 0u);
}

TEST_F(EntryPoints, CloseNotesItsCountsInTheLog) {
    ::setenv("KPM_SIM_LOG", mDirectory.path("log").c_str(), 1);
    ASSERT_EQ(init(), 0u);
    mrList.Close();
    EXPECT_EQ(readFile(mDirectory.path("log")), "libkpm-sim: closed after 0 delivered and 0 dropped events\n");
}

static void sExitInAStorm() {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("s.kpm"), std::string(gcTwoAdapters) +
                                            "start first\nstorm count=1000000000 threads=4 kind=bus-reset board=0\n"
                                            "bus-reset every=1 times=forever\n");
    ::setenv("KPM_SIM_SCENARIO", lDirectory.path("s.kpm").c_str(), 1);
    const KPM_FunctionList& lrList = *getSimFunctionList();
    lrList.Init();
    // Never destroyed: callbacks go on while the process exits.
    ZTCRecorder& lrRecorder = *new ZTCRecorder;
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    lrList.GetAdapterInfo(0, &lNode, &lPort);
    std::uint32_t lHandle = 0;
    lrList.ZtapiRegEvent(0, lPort, 4, 0x20, &lrRecorder, &lHandle, ZTCRecorder::onScope);
    lrRecorder.waitForCount(1000);
    std::exit(7);
}

TEST(EntryPointsDeathTest, AProcessExitsInTheMiddleOfAStormWithoutClosing) {
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(sExitInAStorm(), testing::ExitedWithCode(7), "");
}
