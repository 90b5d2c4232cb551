#include "libkpm/linux/src/Engine.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>
#include <thread>

#include "tests/support/ResourceLimit.h"
#include "tests/support/Waiting.h"
#include "tests/unit/linux/FakeKernel.h"
#include "tests/unit/linux/LinuxRecorder.h"

using ZTCTexts = std::vector<std::string>;

class LinuxEngine : public testing::Test {
protected:
    ~LinuxEngine() override { mpEngine.reset(); }

    /// Starts the engine, and registers everything on the boards there are.
    void start() {
        mpEngine = std::make_unique<ZTCLinuxEngine>(mKernel.options(), mKernel);
        mpEngine->start();
        for (std::uint32_t lBoard = 0; lBoard < mpEngine->getNumberOfAdapters(); ++lBoard) {
            mRecorder.registerAll(*mpEngine, lBoard);
        }
    }

    std::uint32_t registerPort(std::uint32_t aBoard, const HBA_wwn& acrPort, std::uint32_t aCategory,
                               std::uint32_t aSubcategory) {
        mHandle = 4711;
        return mpEngine->registerForPort(aBoard, acrPort, aCategory, aSubcategory, &mRecorder, &mHandle,
                                         &ZTCLinuxRecorder::onScope);
    }

    void waitForLog(const std::string& acrText) {
        waitUntil([&] { return mLog.count(acrText) != 0; }, "the line " + acrText);
    }

    ZTCLinuxLog mLog;
    ZTCFakeKernel mKernel;
    ZTCLinuxRecorder mRecorder;
    std::unique_ptr<ZTCLinuxEngine> mpEngine;
    std::uint32_t mHandle = 0;
};

// ---- Adapters ----

TEST_F(LinuxEngine, HostsAreBoardsInTheOrderOfTheirNumbers) {
    mKernel.addHost(10);
    mKernel.addHost(9);
    start();
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    EXPECT_EQ(mpEngine->getAdapterInfo(0, &lNode, &lPort), 0u);
    EXPECT_TRUE(isSameName(lPort, portName(10)));
    EXPECT_TRUE(isSameName(lNode, nodeName(10)));
    EXPECT_EQ(mpEngine->getAdapterInfo(1, &lNode, &lPort), 0u);
    EXPECT_TRUE(isSameName(lPort, portName(11)));
    EXPECT_EQ(mpEngine->getAdapterInfo(2, &lNode, &lPort), ZTLST_NoSuchBoard);
    EXPECT_EQ(mpEngine->getAdapterInfo(0, nullptr, &lPort), ZTLST_NullPointer);
    EXPECT_EQ(mLog.count("3 board 1 is host10, node 20:00:00:00:00:00:00:0b, port 10:00:00:00:00:00:00:0b"), 1u);
}

TEST_F(LinuxEngine, WithoutHostsNoSourceIsOpened) {
    start();
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 0u);
    EXPECT_TRUE(mKernel.instances().empty());
}

TEST_F(LinuxEngine, AHostThatComesLaterIsTheNextBoardAndAnArrivalOnEveryBoardThatIsRegistered) {
    mKernel.addHost(4);
    mKernel.addHost(5);
    start();
    mKernel.addHost(1);
    EXPECT_EQ(mRecorder.waitFor(2), (ZTCTexts{"0 arrival", "1 arrival"}));
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 3u);
    HBA_wwn lNode{};
    HBA_wwn lPort{};
    EXPECT_EQ(mpEngine->getAdapterInfo(2, &lNode, &lPort), 0u);
    EXPECT_TRUE(isSameName(lPort, portName(2)));
    EXPECT_EQ(mKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/filter"), makeScsiFilter({1, 4, 5}));
    // The new board is like any other, once it is registered.
    mRecorder.registerAll(*mpEngine, 2);
    mKernel.sendDone({.mHost = 1, .mResult = 0x08});
    EXPECT_EQ(mRecorder.waitFor(3).back(), "2 device-busy 0 0");
}

TEST_F(LinuxEngine, AHostThatLeavesTakesItsLinkDownAndNoOtherBoardAlong) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    start();
    mKernel.removeHost(0);
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    waitForLog("3 board 0: its host is gone");
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
    waitUntil([&] { return mKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/filter") == makeScsiFilter({1}); },
              "the filter to be renewed");
    mKernel.sendDone({.mHost = 1, .mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "1 queue-full 0 0");
    // It comes back, under another number.
    mKernel.addHost(8, 1);
    const ZTCTexts lEvents = mRecorder.waitFor(5);
    EXPECT_EQ(ZTCTexts(lEvents.begin() + 2, lEvents.end()),
              (ZTCTexts{"0 arrival", "1 arrival", "0 link up tag=2 up=1 down=1 id=10001 1 1"}));
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
}

TEST_F(LinuxEngine, AHostWithoutReadableAttributesIsABoardAndStopsNothing) {
    mKernel.addHost(0);
    mKernel.setHost(0, "port_name", "garbage\n");
    mKernel.setHost(0, "port_state", "\xff\n");
    mKernel.addHost(1);
    start();
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
    EXPECT_EQ(mLog.count("2 host0: its port name cannot be read from sysfs"), 1u);
    EXPECT_EQ(registerPort(0, HBA_wwn{}, 4, 1), KPM_STATUS_SUCCESS) << "by the name that it was given out with";
    mKernel.setState(1, "Linkdown");
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"1 link down tag=1 up=0 down=1 id=0 2 2"});
}

TEST_F(LinuxEngine, AClassThatCannotBeReadForAWhileTakesNoHostAway) {
    mKernel.addHost(0);
    const std::string lClass = mKernel.sysfs() + "/class/fc_host";
    const std::string lLoop = mKernel.sysfs() + "/loop";
    std::filesystem::create_symlink("fc_host", lLoop);
    const auto lExchange = [&] {
        return ::renameat2(AT_FDCWD, lClass.c_str(), AT_FDCWD, lLoop.c_str(), RENAME_EXCHANGE);
    };
    start();
    ASSERT_EQ(lExchange(), 0);
    waitForLog("events are lost: they could not be read or handled");
    ASSERT_EQ(lExchange(), 0);
    mKernel.setState(0, "Linkdown");
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    EXPECT_EQ(mLog.count("its host is gone"), 0u);
}

#ifndef __SANITIZE_ADDRESS__  // its runtime takes a descriptor to look at memory with
TEST_F(LinuxEngine, WithFewerDescriptorsAllowedThanAreOpenItWaitsForMoreAndSaysSo) {
    mKernel.addHost(0);
    start();
    {
        const ZTCResourceLimit lLimit(RLIMIT_NOFILE, 1);
        waitForLog("events are lost: they could not be read or handled");
    }
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 queue-full 0 0"});
    EXPECT_EQ(mLog.count("its host is gone"), 0u);
}
#endif

// ---- Links ----

TEST_F(LinuxEngine, AChangeOfStateIsFoundWithoutAnyMessage) {
    mKernel.addHost(0);
    start();
    mKernel.setState(0, "Linkdown");
    mRecorder.waitFor(1);
    mKernel.setState(0, "Online");
    EXPECT_EQ(mRecorder.waitFor(2),
              (ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1", "0 link up tag=2 up=1 down=1 id=10001 1 1"}));
}

TEST_F(LinuxEngine, AMessageMakesItLookAtOnceAndHoweverManyThereAreTheChangeIsOne) {
    mKernel.addHost(0);
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    std::uint32_t lNumber = 0;
    for (const std::uint32_t lCode : {1u, 2u, 3u, 4u}) {
        const char* const lpState = lCode % 2 == 1 ? "Linkdown" : "Online";
        mKernel.setState(0, lpState);
        for (int lTimes = 0; lTimes < 500; ++lTimes) {
            mKernel.sendFc({.mHost = 0, .mNumber = ++lNumber, .mCode = lCode});
        }
        mRecorder.waitFor(lCode);
    }
    waitUntil([&] { return mKernel.isFcDrained(); }, "all messages to be read");
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), 4u);
    EXPECT_EQ(mRecorder.events().back(), "0 link up tag=4 up=2 down=2 id=10001 1 1");
    EXPECT_EQ(mLog.count("2 "), 0u) << mLog.all();
}

TEST_F(LinuxEngine, AFlapThatOnlyMessagesTellIsBothChanges) {
    mKernel.addHost(0);
    start();
    mKernel.holdFc();
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_LinkDown});
    mKernel.sendFc({.mNumber = 2, .mCode = ZTLFC_LinkUp});
    mKernel.releaseFc();
    EXPECT_EQ(mRecorder.waitFor(2),
              (ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1", "0 link up tag=2 up=1 down=1 id=10001 1 1"}));
}

TEST_F(LinuxEngine, AMessageOfAHostThatNobodyHasSeenMakesItLook) {
    mKernel.addHost(0);
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    mKernel.addHost(1);
    mKernel.sendFc({.mHost = 1, .mNumber = 1, .mCode = ZTLFC_LinkUp});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 arrival"});
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
}

// ---- RSCNs and losses of messages ----

TEST_F(LinuxEngine, AnRscnIsDeliveredAsOnTheWire) {
    mKernel.addHost(3);
    start();
    mKernel.sendFc({.mHost = 3, .mNumber = 9, .mCode = ZTLFC_Rscn, .mData = rscnData(0x000A0B0C)});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 rscn 61040008000a0b0c"});
}

TEST_F(LinuxEngine, EventsOfOtherCodesAreNothing) {
    mKernel.addHost(0);
    start();
    std::uint32_t lNumber = 0;
    for (const std::uint32_t lCode : {0x103u, 0x200u, 0x204u, 0x205u, 0x500u, 0x501u, 0xFFFFu, 0u, 6u}) {
        mKernel.sendFc({.mNumber = ++lNumber, .mCode = lCode});
    }
    mKernel.sendFc({.mNumber = ++lNumber, .mCode = ZTLFC_Rscn, .mData = rscnData(1)});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 rscn 6104000800000001"});
}

TEST_F(LinuxEngine, AMessageOfAnotherSenderIsDroppedAndCounted) {
    mKernel.addHost(0);
    start();
    mKernel.sendFc(ZTLR_Foreign, ZTSFcMessage{.mCode = ZTLFC_Rscn}.make());
    mKernel.sendFc({.mNumber = 9, .mCode = ZTLFC_Rscn, .mData = rscnData(2)});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 rscn 6104000800000002"});
    waitForLog("2 1 FC messages are dropped: the kernel did not send them (1 since the start)");
}

TEST_F(LinuxEngine, AMessageThatDoesNotParseIsCountedAndTheNextIsServed) {
    mKernel.addHost(0);
    start();
    mKernel.holdFc();
    mKernel.sendFc(ZTLR_Datagram, {1, 2, 3});
    mKernel.sendFc(ZTLR_Truncated);
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_Rscn, .mData = {1, 2, 3}});
    mKernel.sendFc({.mNumber = 2, .mCode = ZTLFC_Rscn, .mData = rscnData(3)});
    mKernel.releaseFc();
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 rscn 6104000800000003"});
    waitForLog("2 3 FC messages are dropped: they do not parse (3 since the start)");
}

TEST_F(LinuxEngine, AnOverrunIsCountedAndTheStateIsReadAgain) {
    mKernel.addHost(0);
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    mKernel.setState(0, "Linkdown");
    mKernel.sendFc(ZTLR_Overrun);
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    waitForLog("2 1 times the FC event socket overran");
}

TEST_F(LinuxEngine, AGapInTheNumbersIsCountedAndTheStateIsReadAgain) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    mKernel.setState(0, "Linkdown");
    mKernel.sendFc({.mHost = 1, .mNumber = 10, .mCode = 0x500});
    mKernel.sendFc({.mHost = 1, .mNumber = 15, .mCode = 0x500});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    waitForLog("2 4 FC events are lost: their numbers were passed over");
}

TEST_F(LinuxEngine, ASocketThatFailsIsLeftAloneUntilTheNextLookAndTheStateIsStillRead) {
    mKernel.addHost(0);
    start();
    mKernel.sendFc(ZTLR_Failed);
    waitForLog("2 1 events are lost: they could not be read or handled");
    mKernel.setState(0, "Linkdown");
    mRecorder.waitFor(1);
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_Rscn, .mData = rscnData(3)});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 rscn 6104000800000003");
}

// ---- SCSI outcomes ----

TEST_F(LinuxEngine, OutcomesAreDeliveredWithTheirPortAndLun) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    mKernel.addTarget(1, 0, 5, portNameText(0x55));
    start();
    mKernel.sendDone({.mHost = 1, .mTarget = 5, .mLun = 0x11, .mResult = 0x28});
    mRecorder.waitFor(1);
    mKernel.sendDone({.mHost = 1, .mTarget = 5, .mLun = 0x12, .mResult = 0x08}, 1);
    mRecorder.waitFor(2);
    mKernel.sendDone({.mHost = 1,
                      .mTarget = 5,
                      .mLun = 0x13,
                      .mResult = 0x02,
                      .mOpcode = 0x2A,
                      .mSenseKey = 6,
                      .mAsc = 0x29,
                      .mAscq = 3});
    EXPECT_EQ(mRecorder.waitFor(3),
              (ZTCTexts{"1 queue-full 55 11", "1 device-busy 55 12", "1 check-condition 55 13 2a 6 29 3"}));
}

TEST_F(LinuxEngine, WithoutSenseDataACheckConditionSaysThatTheyAreUnknown) {
    mKernel.mFormat = doneFormat(false);
    mKernel.addHost(0);
    start();
    mKernel.sendDone({.mResult = 2, .mHasSense = false});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 check-condition 0 0 28 ffffffff ffffffff ffffffff"});
    EXPECT_EQ(mLog.count("this kernel's trace has no sense data"), 1u);
}

TEST_F(LinuxEngine, OtherStatusesOtherHostsAndOtherTraceEventsAreNothing) {
    mKernel.addHost(0);
    start();
    for (const std::uint32_t lResult : {0x00u, 0x18u, 0x30u, 0x40u, 0x0A0000u, 0x22u, 0x20u}) {
        mKernel.sendDone({.mResult = lResult});
    }
    mKernel.sendDone({.mHost = 1, .mResult = 0x28});
    mKernel.sendDone({.mResult = 0x28, .mId = gcDoneId + 1});
    mKernel.sendDone({.mLun = 9, .mResult = 0x0E0028});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 queue-full 0 9"});
}

TEST_F(LinuxEngine, APortThatIsGoneIsZeroAndTheEventIsDelivered) {
    mKernel.addHost(0);
    mKernel.addTarget(0, 0, 0, portNameText(0x33));
    start();
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(1).back(), "0 queue-full 33 0");
    mKernel.removeClass("fc_transport/target0:0:0");
    std::size_t lCount = 1;
    waitUntil(
        [&] {
            mKernel.sendDone({.mResult = 0x28});
            return mRecorder.waitFor(++lCount).back() == "0 queue-full 0 0";
        },
        "the name to be gone");
    mKernel.addTarget(0, 0, 0, portNameText(0x34));
    waitUntil(
        [&] {
            mKernel.sendDone({.mResult = 0x28});
            return mRecorder.waitFor(++lCount).back() == "0 queue-full 34 0";
        },
        "the new name");
}

TEST_F(LinuxEngine, AnRscnRenewsTheNamesAtOnce) {
    mKernel.addHost(0);
    mKernel.addTarget(0, 0, 0, portNameText(0x33));
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    mKernel.addTarget(0, 0, 0, portNameText(0x34));
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 queue-full 33 0");
    mKernel.sendFc({.mNumber = 1, .mCode = ZTLFC_Rscn, .mData = rscnData(1)});
    mRecorder.waitFor(3);
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(4).back(), "0 queue-full 34 0");
}

TEST_F(LinuxEngine, WhatDoesNotParseInATracePageIsCountedAndTheNextPageIsServed) {
    mKernel.addHost(0);
    start();
    ZTCBytes lShort = ZTSDoneRecord{.mResult = 0x28}.make();
    lShort.resize(20);
    mKernel.sendPage(ZTCPageBuilder().addShort(lShort).make());
    mKernel.sendPage(ZTCPageBuilder().makeWithLength(4081));
    mKernel.sendDone({.mLun = 1, .mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 queue-full 0 1"});
    waitUntil([&] { return mLog.count("trace records are dropped: they do not parse (2 since the start)") == 1; },
              "both to be told");
}

TEST_F(LinuxEngine, ARecordThatIsTooShortToTellItsEventIsCounted) {
    const std::string lPlace = "common_type;\toffset:0;";
    mKernel.mFormat.replace(mKernel.mFormat.find(lPlace), lPlace.size(), "common_type;\toffset:200;");
    mKernel.addHost(0);
    start();
    mKernel.sendDone({.mResult = 0x28});
    waitForLog("2 1 trace records are dropped: they do not parse");
    EXPECT_EQ(mRecorder.count(), 0u);
}

TEST_F(LinuxEngine, AnOverrunOfTheTraceIsCounted) {
    mKernel.addHost(0);
    start();
    writeFile(mKernel.instance() + "/per_cpu/cpu1/stats", "overrun: 12\n");
    mKernel.sendDone({.mResult = 0x28}, 1);
    waitForLog("2 12 SCSI outcomes are lost: a trace buffer overran (12 since the start)");
    EXPECT_EQ(mRecorder.count(), 1u);
}

TEST_F(LinuxEngine, WhereTheCountOfATraceCannotBeReadItsMarkIsALoss) {
    mKernel.addHost(0);
    start();
    writeFile(mKernel.instance() + "/per_cpu/cpu0/stats", "overrun: 18446744073709551615\n");
    mKernel.sendPage(ZTCPageBuilder().addShort(ZTSDoneRecord{.mResult = 8}.make()).make(gcMissedEvents));
    waitForLog("2 1 SCSI outcomes are lost: a trace buffer overran (1 since the start)");
}

TEST_F(LinuxEngine, WhereBuffersDoNotWakeForARecordTheyAreReadWithEveryLook) {
    mKernel.mHasBufferPercent = false;
    mKernel.addHost(0);
    start();
    mKernel.sendDone({.mResult = 0x28});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 queue-full 0 0"});
}

TEST_F(LinuxEngine, AStormOfOutcomesIsDeliveredToTheLast) {
    mKernel.addHost(0);
    start();
    constexpr std::uint32_t lPages = 300;
    constexpr std::uint32_t lRecords = 40;
    for (std::uint32_t lPage = 0; lPage < lPages; ++lPage) {
        ZTCPageBuilder lBuilder;
        for (std::uint32_t lRecord = 0; lRecord < lRecords; ++lRecord) {
            lBuilder.addShort(ZTSDoneRecord{.mLun = lPage * lRecords + lRecord, .mResult = 0x28}.make());
        }
        mKernel.sendPage(lBuilder.make());
    }
    const ZTCTexts lEvents = mRecorder.waitFor(lPages * lRecords);
    EXPECT_EQ(lEvents.size(), std::size_t{lPages} * lRecords);
    EXPECT_EQ(lEvents.back(), "0 queue-full 0 2edf");
}

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
                         "bus-reset, queue-depth, port-interrupt, temperature"),
              1u)
        << mLog.all();
    EXPECT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_NO_SOURCE);
    EXPECT_NE(mHandle, 0u);
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
                         "fcp-read-check, lun-reset, target-reset, bus-reset, queue-depth, port-interrupt, "
                         "temperature"),
              1u)
        << mLog.all();
    EXPECT_EQ(mLog.count("2 "), 0u) << mLog.all();
}

TEST_F(LinuxEngine, AFilterThatTheKernelRefusesSwitchesTheOutcomesOff) {
    mKernel.mHasFilter = false;
    mKernel.addHost(0);
    start();
    EXPECT_EQ(mLog.count("2 no SCSI outcomes: the trace event scsi_dispatch_cmd_done cannot be switched on"), 1u);
    EXPECT_EQ(registerPort(0, portName(1), 4, 4), KPM_STATUS_NO_SOURCE);
    EXPECT_TRUE(mKernel.instances().empty());
}

// ---- Registrations ----

TEST_F(LinuxEngine, KindsWithoutASourceAreAcceptedAndSaidSo) {
    mKernel.addHost(0);
    start();
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        if (lrKind.mRegisteredCategory == 0) {
            continue;
        }
        const bool lHasSource =
            lrKind.mRegisteredCategory == 16 || (lrKind.mRegisteredCategory == 4 && lrKind.mRegisteredSubcategory <= 4);
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

// ---- Threads ----

TEST_F(LinuxEngine, StoppingWaitsForTheCallbackAndRemovesTheInstance) {
    mKernel.addHost(0);
    std::atomic<bool> lIsIn{false};
    std::atomic<bool> lMayReturn{false};
    mRecorder.setHook([&] {
        lIsIn = true;
        while (!lMayReturn) {
            std::this_thread::yield();
        }
    });
    start();
    mKernel.sendDone({.mResult = 0x28});
    mKernel.sendDone({.mResult = 0x28});
    waitUntil([&] { return lIsIn.load(); }, "the callback");
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 1u) << "answered while a callback is held up";
    EXPECT_EQ(registerPort(0, portName(1), 4, 0x40), KPM_STATUS_NO_SOURCE);
    std::atomic<bool> lHasStopped{false};
    std::thread lStopper([&] {
        mpEngine->stop();
        lHasStopped = true;
    });
    EXPECT_FALSE(lHasStopped.load());
    lMayReturn = true;
    lStopper.join();
    const std::size_t lCount = mRecorder.count();
    EXPECT_TRUE(mKernel.instances().empty());
    mpEngine->stop();
    EXPECT_EQ(mRecorder.count(), lCount);
}

TEST_F(LinuxEngine, CallbacksRunWithAllSignalsBlocked) {
    mKernel.addHost(0);
    std::atomic<bool> lIsBlocked{false};
    mRecorder.setHook([&] {
        sigset_t lSignals;
        pthread_sigmask(SIG_BLOCK, nullptr, &lSignals);
        lIsBlocked = sigismember(&lSignals, SIGTERM) == 1 && sigismember(&lSignals, SIGHUP) == 1 &&
                     sigismember(&lSignals, SIGINT) == 1;
    });
    start();
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    mpEngine->stop();
    EXPECT_TRUE(lIsBlocked.load());
    sigset_t lSignals;
    pthread_sigmask(SIG_BLOCK, nullptr, &lSignals);
    EXPECT_EQ(sigismember(&lSignals, SIGTERM), 0) << "the caller's own mask is as it was";
}

TEST_F(LinuxEngine, WhatIsLostAtTheEndIsStillTold) {
    mKernel.addHost(0);
    start();
    for (int lTimes = 0; lTimes < 10; ++lTimes) {
        mKernel.sendFc(ZTLR_Foreign);
    }
    waitUntil([&] { return mKernel.isFcDrained(); }, "all messages to be read");
    mpEngine->stop();
    EXPECT_EQ(mLog.count("the kernel did not send them (10 since the start)"), 1u) << mLog.all();
}

TEST_F(LinuxEngine, AnOverrunThatNoLookHasFoundIsToldAtTheEnd) {
    mKernel.addHost(0);
    ZTSLinuxOptions lOptions = mKernel.options();
    lOptions.mPollInterval = std::chrono::hours(1);
    mpEngine = std::make_unique<ZTCLinuxEngine>(lOptions, mKernel);
    mpEngine->start();
    mRecorder.registerAll(*mpEngine, 0);
    writeFile(mKernel.instance() + "/per_cpu/cpu0/stats", "overrun: 7\n");
    mKernel.sendDone({.mResult = 0x28});
    mRecorder.waitFor(1);
    EXPECT_EQ(mLog.count("a trace buffer overran"), 0u);
    mpEngine->stop();
    EXPECT_EQ(mLog.count("2 7 SCSI outcomes are lost: a trace buffer overran (7 since the start)"), 1u) << mLog.all();
}
