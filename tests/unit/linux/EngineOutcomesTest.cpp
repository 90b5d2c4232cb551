#include <atomic>

#include "tests/support/TestThreads.h"
#include "tests/unit/linux/EngineFixture.h"

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
    startWithoutLooks();
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
    EXPECT_EQ(mLog.loss("scsi-outcomes-lost"), 12u);
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

TEST_F(LinuxEngine, WhatIsInTheBuffersWhenTheLibraryClosesIsDelivered) {
    mKernel.mStoredPercent = "1";  // no descriptor is readable for a few records
    mKernel.addHost(0);
    startWithoutLooks();
    std::atomic<bool> lMayReturn{false};
    mRecorder.setHook([&] { waitUntil([&] { return lMayReturn.load(); }, "the test to go on"); });
    mKernel.sendDone({.mLun = 1, .mResult = 0x28});
    waitUntil([&] { return mRecorder.count() == 1; }, "the first");
    // As many as a pipe of the double takes at once.
    for (std::uint32_t lLun = 2; lLun <= 20; ++lLun) {
        mKernel.sendDone({.mLun = lLun, .mResult = 0x28}, lLun % 2);
    }
    ZTCTestThread lStopper([&] { mpEngine->stop(); });
    lMayReturn = true;
    lStopper.join();
    EXPECT_EQ(mRecorder.count(), 20u);
    EXPECT_TRUE(mKernel.instances().empty());
}
