#include "libkpm/linux/src/HostWatcher.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "tests/unit/linux/WatcherFixture.h"

using HostWatcher = ZTCWatcherFixture;

TEST_F(HostWatcher, AnUnknownHostIsLookedForOnceBetweenTwoRegularLooks) {
    mKernel.addHost(0);
    mWatcher.look();
    EXPECT_EQ(mWatcher.findBoard(0), 0u);
    mKernel.addHost(1);
    EXPECT_EQ(mWatcher.findBoard(1), 1u) << "looked for";
    mKernel.addHost(2);
    EXPECT_FALSE(mWatcher.findBoard(2).has_value()) << "one look is enough for any number of messages";
    EXPECT_EQ(mWatcher.findBoard(1), 1u);
    mWatcher.allowSearch();
    EXPECT_EQ(mWatcher.findBoard(2), 2u);
}

TEST_F(HostWatcher, ItsVersionChangesWithTheBoardsAndOnlyThen) {
    mWatcher.look();
    const std::uint64_t lNone = mWatcher.getVersion();
    mKernel.addHost(0);
    mWatcher.look();
    const std::uint64_t lOne = mWatcher.getVersion();
    EXPECT_NE(lOne, lNone);
    mKernel.setState(0, "Linkdown");
    mWatcher.look();
    EXPECT_EQ(mWatcher.getVersion(), lOne);
    mKernel.removeHost(0);
    mWatcher.look();
    EXPECT_NE(mWatcher.getVersion(), lOne);
}

TEST_F(HostWatcher, AfterAMessageOfALinkTheNamesOfItsRemotePortsAreReadAnew) {
    mKernel.addHost(0);
    mWatcher.look();
    mKernel.addTarget(0, 0, 5, portNameText(0x55));
    const HBA_wwn lFormer = mWatcher.findRemotePort(0, 0, 5);
    mKernel.addTarget(0, 0, 5, portNameText(0x66));
    EXPECT_TRUE(isSameName(mWatcher.findRemotePort(0, 0, 5), lFormer)) << "it is kept";
    mWatcher.noteLinkMessage(0, false);
    EXPECT_FALSE(isSameName(mWatcher.findRemotePort(0, 0, 5), lFormer));
}

TEST_F(HostWatcher, HostsThatCannotBeReadAreAFailureThatEndsWithTheNextGoodLook) {
    mKernel.addHost(0);
    mWatcher.look();
    EXPECT_EQ(mWatcher.getState().get(), ZTFS_Working);
    mKernel.removeClass("fc_host");
    mKernel.setAttribute("fc_host", "a file in place of the directory");
    mWatcher.look();
    EXPECT_EQ(mWatcher.getState().get(), ZTFS_Failed);
    EXPECT_EQ(mWatcher.countBoards(), 1u);
    EXPECT_TRUE(mWatcher.getBoard(0).mHost.has_value());
    EXPECT_EQ(mLosses.getTotal(ZTLO_Failure), 1u);
    std::filesystem::remove(mKernel.sysfs() + "/class/fc_host");
    std::filesystem::create_directory(mKernel.sysfs() + "/class/fc_host");
    mKernel.addHost(0);
    mWatcher.look();
    EXPECT_EQ(mWatcher.getState().get(), ZTFS_Working);
}
