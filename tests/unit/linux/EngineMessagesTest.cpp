#include "tests/unit/linux/EngineFixture.h"

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
    startWithoutLooks();
    mKernel.setState(0, "Linkdown");
    mKernel.sendFc(ZTLR_Overrun);
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    waitForLog("2 1 times the FC event socket overran");
}

TEST_F(LinuxEngine, AGapInTheNumbersIsCountedAndTheStateIsReadAgain) {
    mKernel.addHost(0);
    mKernel.addHost(1);
    startWithoutLooks();
    mKernel.setState(0, "Linkdown");
    mKernel.sendFc({.mHost = 1, .mNumber = 10, .mCode = 0x500});
    mKernel.sendFc({.mHost = 1, .mNumber = 15, .mCode = 0x500});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 1 1"});
    waitForLog("2 4 FC events are lost: their numbers were passed over");
}

TEST_F(LinuxEngine, ASocketThatFailsIsOpenedAnewAndWhatWasMissedIsCounted) {
    mKernel.addHost(0);
    start();
    mKernel.sendFc({.mNumber = 1, .mCode = 0x500});
    mKernel.sendFc(ZTLR_Failed);
    waitForLog("2 no RSCNs, and link states only every 20 ms: the socket for FC events has failed");
    waitForLog("3 RSCNs are received again");
    mKernel.setState(0, "Linkdown");
    mRecorder.waitFor(1);
    mKernel.sendFc({.mNumber = 4, .mCode = ZTLFC_Rscn, .mData = rscnData(3)});
    EXPECT_EQ(mRecorder.waitFor(2).back(), "0 rscn 6104000800000003");
    waitForLog("2 2 FC events are lost: their numbers were passed over");
    waitForLog("2 1 events are lost: they could not be read or handled");
    EXPECT_EQ(mLog.loss("fc-events-missing"), 2u);
}
