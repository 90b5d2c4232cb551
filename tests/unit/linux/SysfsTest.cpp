#include "libkpm/linux/src/Sysfs.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "tests/unit/linux/FakeKernel.h"

class Sysfs : public testing::Test {
protected:
    std::vector<std::uint32_t> numbers() const {
        std::vector<std::uint32_t> lNumbers;
        const std::vector<ZTSLinuxHost> lHosts = mSysfs.readHosts().value();
        for (const ZTSLinuxHost& lrHost : lHosts) {
            lNumbers.push_back(lrHost.mNumber);
        }
        return lNumbers;
    }

    ZTCFakeKernel mKernel;
    ZTCSysfs mSysfs{mKernel.sysfs()};
};

TEST_F(Sysfs, HostsAreFoundInOrderOfTheirNumbersWithTheirNames) {
    for (const std::uint32_t lHost : {10u, 2u, 1u, 21u}) {
        mKernel.addHost(lHost);
    }
    EXPECT_EQ(numbers(), (std::vector<std::uint32_t>{1, 2, 10, 21}));
    EXPECT_TRUE(isSameName(mSysfs.readHosts().value()[2].mPortName, portName(11)));
    EXPECT_TRUE(isSameName(mSysfs.readHosts().value()[2].mNodeName, nodeName(11)));
}

TEST_F(Sysfs, WithoutTheClassThereAreNoHosts) {
    EXPECT_TRUE(ZTCSysfs("/nowhere").readHosts().value().empty());
    mKernel.removeClass("fc_host");
    EXPECT_TRUE(numbers().empty());
}

TEST_F(Sysfs, WhereTheClassCannotBeReadItIsNotTakenForEmpty) {
    mKernel.removeClass("fc_host");
    mKernel.setAttribute("fc_host", "a file in place of the directory");
    EXPECT_FALSE(mSysfs.readHosts().has_value());
}

TEST_F(Sysfs, WhatIsNoHostIsPassedOver) {
    mKernel.addHost(3);
    for (const char* lpName : {"host", "hostx", "host-1", "host99999999999", "power", "host3x", "host03"}) {
        mKernel.setAttribute(std::string("fc_host/") + lpName + "/port_name", "0x1\n");
    }
    EXPECT_EQ(numbers(), std::vector<std::uint32_t>{3});
}

TEST_F(Sysfs, MissingOrGarbledNamesAreZeroAndTheHostIsThere) {
    mKernel.addHost(0);
    mKernel.setHost(0, "port_name", "garbage\n");
    mKernel.addHost(1);
    std::filesystem::remove(mKernel.sysfs() + "/class/fc_host/host1/node_name");
    mKernel.addHost(2);
    mKernel.setHost(2, "node_name", std::string(5000, '0'));
    mKernel.addHost(3);
    mKernel.setHost(3, "port_name", "");
    std::filesystem::create_directory(mKernel.sysfs() + "/class/fc_host/host4");
    const auto lHosts = mSysfs.readHosts().value();
    ASSERT_EQ(lHosts.size(), 5u);
    EXPECT_TRUE(isZeroName(lHosts[0].mPortName));
    EXPECT_TRUE(isSameName(lHosts[0].mNodeName, nodeName(1)));
    EXPECT_TRUE(isZeroName(lHosts[1].mNodeName));
    EXPECT_TRUE(isZeroName(lHosts[2].mNodeName));
    EXPECT_TRUE(isZeroName(lHosts[3].mPortName));
    EXPECT_TRUE(isZeroName(lHosts[4].mPortName));
}

TEST_F(Sysfs, AHostThatVanishesWhileItIsLookedAtIsNotThere) {
    // Its entry is still listed, and leads nowhere.
    std::filesystem::create_symlink("/nowhere", mKernel.sysfs() + "/class/fc_host/host7");
    mKernel.addHost(1);
    EXPECT_EQ(numbers(), std::vector<std::uint32_t>{1});
    EXPECT_EQ(mSysfs.readPortState(7), ZTLK_Unknown);
    EXPECT_EQ(mSysfs.readPortId(7), 0u);
}

TEST_F(Sysfs, StatesAndIdsAreReadAndWhatIsGarbledIsNotKnown) {
    mKernel.addHost(0);
    EXPECT_EQ(mSysfs.readPortState(0), ZTLK_Up);
    EXPECT_EQ(mSysfs.readPortId(0), 0x010001u);
    mKernel.setState(0, "Linkdown");
    mKernel.setHost(0, "port_id", "0xffffffff\n");
    EXPECT_EQ(mSysfs.readPortState(0), ZTLK_Down);
    EXPECT_EQ(mSysfs.readPortId(0), 0u);
    mKernel.setState(0, "\x01\x02");
    EXPECT_EQ(mSysfs.readPortState(0), ZTLK_Unknown);
}

TEST_F(Sysfs, AFileThatIsTooLongOrWouldWaitIsNotRead) {
    mKernel.setAttribute("fc_host/long", std::string(4096, 'x'));
    EXPECT_EQ(mSysfs.readAttribute("fc_host/long").value().size(), 4096u);
    mKernel.setAttribute("fc_host/long", std::string(4097, 'x'));
    EXPECT_FALSE(mSysfs.readAttribute("fc_host/long").has_value());
    EXPECT_FALSE(mSysfs.readAttribute("fc_host").has_value()) << "a directory";
    const std::string lFifo = mKernel.sysfs() + "/class/fc_host/fifo";
    ASSERT_EQ(::mkfifo(lFifo.c_str(), 0600), 0);
    EXPECT_EQ(mSysfs.readAttribute("fc_host/fifo"), "") << "nothing is there, and nobody waits for it";
}

class RemotePorts : public Sysfs {
protected:
    std::uint8_t find(std::uint32_t aHost, std::uint32_t aChannel, std::uint32_t aTarget) {
        return mPorts.find(aHost, aChannel, aTarget).wwn[7];
    }

    ZTCLinuxRemotePorts mPorts{mSysfs};
};

TEST_F(RemotePorts, TheTargetNamesItsPort) {
    mKernel.addTarget(1, 2, 3, portNameText(0x42));
    EXPECT_EQ(find(1, 2, 3), 0x42);
    EXPECT_EQ(find(1, 2, 4), 0);
    EXPECT_EQ(find(2, 2, 3), 0);
}

TEST_F(RemotePorts, WithoutTheTargetItsRemotePortNamesIt) {
    mKernel.addRport(1, 7, 3, portNameText(0x42));
    mKernel.addRport(1, 8, -1, portNameText(0x43));
    mKernel.addRport(2, 7, 3, portNameText(0x44));
    EXPECT_EQ(find(1, 0, 3), 0x42);
    EXPECT_EQ(find(2, 0, 3), 0x44);
    EXPECT_EQ(find(1, 1, 3), 0) << "another channel";
}

TEST_F(RemotePorts, ANameIsKeptUntilItIsToBeForgotten) {
    EXPECT_EQ(find(0, 0, 0), 0);
    mKernel.addTarget(0, 0, 0, portNameText(0x42));
    EXPECT_EQ(find(0, 0, 0), 0) << "what cannot be found is kept too";
    mPorts.forget();
    EXPECT_EQ(find(0, 0, 0), 0x42);
    mKernel.removeClass("fc_transport/target0:0:0");
    EXPECT_EQ(find(0, 0, 0), 0x42);
    mPorts.forget();
    EXPECT_EQ(find(0, 0, 0), 0);
}

TEST_F(RemotePorts, OnceTheyAreForgottenTheRemotePortsOfNowNameTheirTargets) {
    mKernel.addRport(1, 7, 3, portNameText(0x42));
    EXPECT_EQ(find(1, 0, 3), 0x42);
    EXPECT_EQ(find(1, 0, 4), 0);
    mKernel.addRport(1, 8, 4, portNameText(0x43));
    mPorts.forget();
    EXPECT_EQ(find(1, 0, 3), 0x42);
    EXPECT_EQ(find(1, 0, 4), 0x43);
}

TEST_F(RemotePorts, GarbledOnesAreZero) {
    mKernel.addTarget(0, 0, 1, "garbage");
    mKernel.addRport(0, 2, 2, "garbage");
    mKernel.setAttribute("fc_remote_ports/rport-0:0-3/scsi_target_id", "many\n");
    mKernel.setAttribute("fc_remote_ports/rport-0:0-4/scsi_target_id", "99999999999\n");
    mKernel.setAttribute("fc_remote_ports/rport-x:0-5/scsi_target_id", "5\n");
    for (std::uint32_t lTarget = 0; lTarget < 6; ++lTarget) {
        EXPECT_EQ(find(0, 0, lTarget), 0) << lTarget;
    }
}

TEST_F(RemotePorts, ThousandsOfThemAreFound) {
    for (std::uint32_t lPort = 0; lPort < 1000; ++lPort) {
        mKernel.addRport(0, lPort, lPort, portNameText(lPort % 255 + 1));
    }
    for (std::uint32_t lPort = 0; lPort < 1000; ++lPort) {
        EXPECT_EQ(find(0, 0, lPort), lPort % 255 + 1);
    }
}

TEST_F(RemotePorts, ATargetWhoseNameIsAllOnesIsNamedByItsRemotePort) {
    mKernel.addTarget(0, 0, 4, "0xffffffffffffffff");
    mKernel.addRport(0, 1, 4, portNameText(0x44));
    EXPECT_EQ(find(0, 0, 4), 0x44);
}
