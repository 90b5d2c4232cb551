#include <fcntl.h>
#include <stdio.h>

#include <filesystem>

#include "libkpm/linux/src/ScsiOutcome.h"
#include "tests/support/ResourceLimit.h"
#include "tests/unit/linux/EngineFixture.h"

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
    waitUntil(
        [&] {
            return mKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/filter") == makeScsiFilter({1, 4, 5});
        },
        "the filter to name it");
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

TEST_F(LinuxEngine, AHostWithoutANameIsHeldBackAndGetsItsBoardWhenItHasOne) {
    mKernel.addHost(0);
    mKernel.setHost(0, "port_name", "0xffffffffffffffff\n");
    mKernel.setHost(0, "node_name", "0xffffffffffffffff\n");
    mKernel.addHost(1);
    mKernel.setHost(1, "port_name", "garbage\n");
    mKernel.addHost(2);
    start();
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 1u);
    EXPECT_EQ(mLog.count("3 host0 has no port name yet: it becomes a board when sysfs shows its name"), 1u);
    EXPECT_EQ(mLog.count("3 host1 has no port name yet"), 1u);
    EXPECT_EQ(mKernel.instanceFile("events/scsi/scsi_dispatch_cmd_done/filter"), makeScsiFilter({2}));
    mKernel.setHost(0, "node_name", "0x2000000000000001\n");
    mKernel.setHost(0, "port_name", portNameText(1) + "\n");
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 arrival"});
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
    waitForLog("3 board 1 is host0, node 20:00:00:00:00:00:00:01, port 10:00:00:00:00:00:00:01");
    mRecorder.registerAll(*mpEngine, 1);
    mKernel.setState(0, "Linkdown");
    EXPECT_EQ(mRecorder.waitFor(2).back(), "1 link down tag=1 up=0 down=1 id=0 1 1");
    EXPECT_EQ(mLog.count("has no port name yet"), 2u) << "said once for each";
}

TEST_F(LinuxEngine, ANameThatChangesKeepsTheBoardAndTheOldNameIsStillTaken) {
    mKernel.addHost(0);
    start();
    mKernel.setHost(0, "port_name", portNameText(9) + "\n");
    waitForLog("3 board 0 has other names: node 20:00:00:00:00:00:00:01, port 10:00:00:00:00:00:00:09");
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 1u);
    EXPECT_EQ(registerPort(0, portName(1), 4, 1), KPM_STATUS_SUCCESS);
    EXPECT_EQ(registerPort(0, portName(9), 4, 1), KPM_STATUS_SUCCESS);
    EXPECT_EQ(registerPort(0, portName(8), 4, 1), ZTLST_NotItsPort);
    mKernel.setState(0, "Linkdown");
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 link down tag=1 up=0 down=1 id=0 9 1"});
    EXPECT_EQ(mLog.count("its host is gone"), 0u);
}

TEST_F(LinuxEngine, TwoNewHostsAtOnceAreBothFoundByTheFirstMessageOfOne) {
    mKernel.addHost(0);
    startWithoutLooks();
    mKernel.holdFc();
    mKernel.addHost(1);
    mKernel.addHost(2);
    mKernel.sendFc({.mHost = 2, .mNumber = 1, .mCode = ZTLFC_LinkUp});
    mKernel.sendFc({.mHost = 1, .mNumber = 2, .mCode = ZTLFC_LinkUp});
    mKernel.releaseFc();
    EXPECT_EQ(mRecorder.waitFor(2), (ZTCTexts{"0 arrival", "0 arrival"}));
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 3u);
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
    startWithoutLooks();
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
    startWithoutLooks();
    mKernel.addHost(1);
    mKernel.sendFc({.mHost = 1, .mNumber = 1, .mCode = ZTLFC_LinkUp});
    EXPECT_EQ(mRecorder.waitFor(1), ZTCTexts{"0 arrival"});
    EXPECT_EQ(mpEngine->getNumberOfAdapters(), 2u);
}
