#include <cerrno>
#include <filesystem>

#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/ScsiOutcome.h"
#include "tests/unit/linux/EngineFixture.h"

// ---- Rights ----

TEST_F(LinuxEngine, WithNothingButSysfsThereAreAdaptersAndLinks) {
    mKernel.mRefusesFcEvents = true;
    std::filesystem::remove_all(mKernel.tracefs());
    mKernel.addHost(0);
    start();
    EXPECT_EQ(mLog.count("2 no RSCNs, and link states only every 20 ms: FC events cannot be subscribed to: "), 1u);
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: there is no tracefs at "), 1u);
    EXPECT_EQ(mLog.count("3 this host cannot deliver: plogi, prlo, adisc, lsrjt, logo, rscn, fabric-busy, port-busy, "
                         "fcp-read-check, queue-full, device-busy, check-condition, lun-reset, target-reset, "
                         "bus-reset, port-interrupt, temperature"),
              1u)
        << mLog.all();
    EXPECT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_NO_RIGHTS);
    EXPECT_NE(mHandle, 0u);
    EXPECT_EQ(registerPort(0, portName(1), 4, 8), KPM_STATUS_NO_SOURCE);
    EXPECT_EQ(mLog.source(0, 1, 0x20), "no rights (FC events cannot be subscribed to: Operation not permitted)");
    EXPECT_TRUE(mLog.source(0, 4, 4).starts_with("failed (there is no tracefs at ")) << mLog.source(0, 4, 4);
    EXPECT_EQ(mLog.source(0, 4, 8), "no source (the kernel has no generic source for it)");
    EXPECT_EQ(mLog.source(0, 8, 2), "working");
    EXPECT_EQ(mLog.source(0, 16, 1), "working");
    mKernel.setState(0, "Offline");
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    mKernel.addHost(1);
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 arrival");
    mpEngine->stop();
    EXPECT_EQ(mLog.count("no SCSI outcomes"), 1u) << "said once";
}

TEST_F(LinuxEngine, WithEverythingTheLogNamesWhatTheKernelHasNoSourceFor) {
    mKernel.addHost(0);
    start();
    EXPECT_EQ(mLog.count("3 this host cannot deliver: plogi, prlo, adisc, lsrjt, logo, fabric-busy, port-busy, "
                         "fcp-read-check, lun-reset, target-reset, bus-reset, port-interrupt, "
                         "temperature"),
              1u)
        << mLog.all();
    EXPECT_EQ(mLog.count("2 "), 0u) << mLog.all();
}

TEST_F(LinuxEngine, SourcesThatAreRefusedAtTheStartAreTriedAgainAndTheAgentIsToldOfBoth) {
    mKernel.mRefusesFcEvents = true;
    mKernel.mMakeError = EACCES;
    mKernel.addHost(0);
    start();
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: the trace instance "), 1u);
    EXPECT_TRUE(mLog.source(0, 4, 2).starts_with("no rights (the trace instance ")) << mLog.source(0, 4, 2);
    EXPECT_EQ(registerPort(0, portName(1), 4, 2), KPM_STATUS_NO_RIGHTS);
    mKernel.mRefusesFcEvents = false;
    mKernel.mMakeError = 0;
    waitForLog("3 RSCNs are received again");
    waitForLog("3 SCSI outcomes are delivered again");
    waitUntil([&] { return mLog.source(0, 1, 0x20) == "working" && mLog.source(0, 4, 2) == "working"; }, "reports");
    mKernel.sendDone({.mResult = 0x08});
    EXPECT_EQ(mRecorder.waitFor(1).back(), "0 device-busy 0 0");
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_Rscn, .mData = rscnData(3)});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 rscn 6104000800000003");
    EXPECT_EQ(registerPort(0, portName(1), 4, 2), KPM_STATUS_SUCCESS);
    EXPECT_EQ(mLog.sources(0, 4, 2).size(), 2u) << "once a change";
}

TEST_F(LinuxEngine, AFilterThatTheKernelRefusesSwitchesTheOutcomesOffUntilItIsTaken) {
    mKernel.refuseWrites("filter", "host_no == 0", EINVAL, 2);
    mKernel.addHost(0);
    start();
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: the trace event scsi_dispatch_cmd_done cannot be switched on"), 1u);
    waitForLog("3 SCSI outcomes are delivered again");
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(1).back(), "0 queue-full 0 0");
}

TEST_F(LinuxEngine, AFilterThatFailsOnceKeepsTheOldOneAndIsTriedAgain) {
    mKernel.addHost(0);
    start();
    mKernel.refuseWrites("filter", "host_no <= 1", ENOMEM, 3);
    mKernel.addHost(1);
    waitForLog(
        "2 no SCSI outcomes of FC hosts that have come since: the filter of the trace event "
        "scsi_dispatch_cmd_done cannot be set: Cannot allocate memory");
    waitForLog("3 SCSI outcomes of all FC hosts are delivered again");
    EXPECT_EQ(mKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/filter"), makeScsiFilter({0, 1}));
    EXPECT_EQ(mLog.count("no SCSI outcomes of FC hosts"), 1u) << "said once";
    waitUntil([&] { return mLog.sources(1, 4, 1).size() == 2; }, "the reports of the new board");
    EXPECT_EQ(mLog.sources(1, 4, 1),
              (ZTCTexts{"failed (the filter of the trace event scsi_dispatch_cmd_done cannot be set: Cannot allocate "
                        "memory)",
                        "working"}));
    EXPECT_EQ(mLog.sources(0, 4, 1), ZTCTexts{"working"}) << "the old filter names this board's host";
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: "), 0u);
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 queue-full 0 0");
}

TEST_F(LinuxEngine, ARegistrationForABoardThatTheKeptFilterLeavesOutIsAnsweredWithAStatusUntilItIsNamed) {
    mKernel.addHost(0);
    start();
    mKernel.refuseWrites("filter", "host_no <= 1", ENOMEM);
    mKernel.addHost(1);
    waitUntil([&] { return mLog.source(1, 4, 4).starts_with("failed (the filter of the trace event"); }, "the report");
    for (const std::uint32_t lSubcategory : {0x01u, 0x02u, 0x04u}) {
        EXPECT_EQ(registerPort(1, portName(2), 4, lSubcategory), KPM_STATUS_NO_RIGHTS) << lSubcategory;
        EXPECT_NE(mHandle, 0u);
        EXPECT_EQ(registerPort(0, portName(1), 4, lSubcategory), KPM_STATUS_SUCCESS) << lSubcategory;
    }
    EXPECT_EQ(registerPort(1, portName(2), 4, 0x40), KPM_STATUS_SUCCESS) << "queue depths have another source";
    EXPECT_EQ(registerPort(1, portName(2), 16, 1), KPM_STATUS_SUCCESS);
    mKernel.allowWrites();
    waitUntil([&] { return mLog.source(1, 4, 1) == "working"; }, "the report of the new filter");
    EXPECT_EQ(registerPort(1, portName(2), 4, 1), KPM_STATUS_SUCCESS);
    mKernel.sendDone({.mHost = 1, .mLun = 3, .mResult = 0x08});
    waitUntil([&] { return mRecorder.events().back() == "1 device-busy 0 3"; },
              "the event of the registration that was answered with a status");
}

TEST_F(LinuxEngine, ABoardWhoseHostIsGoneIsReportedAsFailed) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    start();
    EXPECT_EQ(mLog.source(0, 4, 1), "working");
    mKernel.removeHost(0);
    waitUntil([&] { return mLog.source(0, 4, 1) == "failed (the board's host is gone)"; }, "the report");
    EXPECT_EQ(mLog.source(0, 8, 2), "failed (the board's host is gone)");
    EXPECT_EQ(mLog.source(0, 16, 1), "working");
    EXPECT_EQ(mLog.source(1, 4, 1), "working");
    waitUntil([&] { return mLog.source(0, 4, 0x40) == "failed (the board's host is gone)"; }, "the last report");
    EXPECT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_NO_RIGHTS) << "the host may come back";
    EXPECT_EQ(registerPort(0, portName(1), 16, 1), KPM_STATUS_SUCCESS);
    EXPECT_EQ(registerPort(1, portName(2), 4, 1), KPM_STATUS_SUCCESS);
}

TEST_F(LinuxEngine, EveryKindOfEveryBoardIsReportedBeforeTheFirstRegistration) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(mKernel.options(), mKernel);
    mpEngine->start();
    for (std::uint32_t lBoard = 0; lBoard < 2; ++lBoard) {
        for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
            EXPECT_EQ(mLog.sources(lBoard, lrKind.mDeliveredCategory, lrKind.mDeliveredSubcategory).size(), 1u)
                << lrKind.mpName;
        }
    }
}

// ---- Registrations ----

TEST_F(LinuxEngine, KindsWithoutASourceAreAcceptedAndSaidSo) {
    mKernel.addHost(0);
    start();
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        if (lrKind.mRegisteredCategory == 0) {
            continue;
        }
        const bool lHasSource = lrKind.mRegisteredCategory == 16 ||
                                (lrKind.mRegisteredCategory == 4 &&
                                 (lrKind.mRegisteredSubcategory <= 4 || lrKind.mRegisteredSubcategory == 0x40));
        EXPECT_EQ(registerPort(0, portName(1), lrKind.mRegisteredCategory, lrKind.mRegisteredSubcategory),
                  lHasSource ? KPM_STATUS_SUCCESS : KPM_STATUS_NO_SOURCE)
            << lrKind.mpName;
        EXPECT_NE(mHandle, 4711u);
    }
    EXPECT_EQ(mpEngine->registerForBoard(0, FC_REG_TEMPERATURE_EVENT, nullptr, ZTCLinuxRecorder::linkCallback()), 0u);
}

TEST_F(LinuxEngine, RefusalsLeaveTheHandleAlone) {
    mKernel.addHost(0);
    start();
    EXPECT_EQ(registerPort(1, portName(1), 4, 1), ZTLST_NoSuchBoard);
    EXPECT_EQ(registerPort(0, portName(2), 4, 1), ZTLST_NotItsPort);
    EXPECT_EQ(registerPort(0, portName(1), 4, 3), ZTLST_NoSuchKind);
    EXPECT_EQ(registerPort(0, portName(1), 0, 1), ZTLST_NoSuchKind) << "links are registered per board";
    EXPECT_EQ(mHandle, 4711u);
    EXPECT_EQ(mpEngine->registerForPort(0, portName(1), 4, 1, nullptr, &mHandle, nullptr), ZTLST_NullPointer);
    EXPECT_EQ(mpEngine->registerForPort(0, portName(1), 4, 1, nullptr, nullptr, &ZTCLinuxRecorder::onScope),
              ZTLST_NullPointer);
    EXPECT_EQ(mpEngine->registerForBoard(1, FC_REG_LINK_EVENT, nullptr, ZTCLinuxRecorder::linkCallback()), 0u);
    EXPECT_EQ(mpEngine->registerForBoard(0, 4, nullptr, ZTCLinuxRecorder::linkCallback()), 0u);
    EXPECT_EQ(mpEngine->registerForBoard(0, FC_REG_LINK_EVENT, nullptr, nullptr), 0u);
}

TEST_F(LinuxEngine, ARegistrationThatEndedIsNotDeliveredAndANewerOneReplacesAnOlder) {
    mKernel.addHost(0);
    start();
    ASSERT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_SUCCESS);
    const std::uint32_t lOld = mHandle;
    ASSERT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_SUCCESS);
    const std::uint32_t lNew = mHandle;
    EXPECT_EQ(mpEngine->unregisterForPort(0, portName(1), lOld), ZTLST_NoSuchHandle);
    mKernel.sendDone({.mLun = 1, .mResult = 0x28});
    mKernel.sendDone({.mLun = 2, .mResult = 0x08});
    EXPECT_EQ(mRecorder.waitFor(2), (ZTCTexts{"0 queue-full 0 1", "0 device-busy 0 2"})) << "each once";
    EXPECT_EQ(mpEngine->unregisterForPort(0, portName(2), lNew), ZTLST_NotItsPort);
    EXPECT_EQ(mpEngine->unregisterForPort(7, portName(1), lNew), ZTLST_NoSuchBoard);
    EXPECT_EQ(mpEngine->unregisterForBoard(0, lNew), ZTLST_NoSuchHandle) << "it is a port's";
    EXPECT_EQ(mpEngine->unregisterForPort(0, portName(1), lNew), ZTLST_Success);
    EXPECT_EQ(mpEngine->unregisterForPort(0, portName(1), lNew), ZTLST_NoSuchHandle);
    const std::uint32_t lLink =
        mpEngine->registerForBoard(0, FC_REG_LINK_EVENT, nullptr, ZTCLinuxRecorder::linkCallback());
    EXPECT_EQ(mpEngine->unregisterForPort(0, portName(1), lLink), ZTLST_NoSuchHandle);
    EXPECT_EQ(mpEngine->unregisterForBoard(0, lLink), ZTLST_Success);
    mKernel.sendDone({.mLun = 3, .mResult = 0x28});
    mKernel.sendDone({.mLun = 4, .mResult = 0x08});
    EXPECT_EQ(mRecorder.waitFor(3).back(), "0 device-busy 0 4");
}
