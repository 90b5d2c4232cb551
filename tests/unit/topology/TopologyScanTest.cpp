#include "sensor/topology/include/TopologyScan.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tests/support/Waiting.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::ElementsAre;
using testing::IsEmpty;

static ZTSTopology sScan(const ZTCFakeSysfs& acrTree) {
    ZTCPatientReader lReader;
    return scanTopology(acrTree.roots(), lReader);
}

TEST(TopologyScan, AHostWithoutFibreChannelIsAnEmptyTopology) {
    const ZTCFakeSysfs lTree;
    EXPECT_EQ(sScan(lTree), ZTSTopology());
}

TEST(TopologyScan, LeadsFromAnInitiatorToTheMountOfItsDisk) {
    ZTCFakeSysfs lTree;
    lTree.addHost(7);
    lTree.addRemotePort(7, 3, 9);
    lTree.addPath(7, 3, 12, "naa.60060160", "sdc");
    lTree.addMapping(0, "mpatha", "mpath-360060160", {"sdc"});
    lTree.addMapping(1, "vg-data", "LVM-xyz", {"dm-0"});
    lTree.mount("dm-1", "/srv/my\\040data");
    const ZTSTopology lTopology = sScan(lTree);

    ASSERT_EQ(lTopology.mInitiators.size(), 1U);
    const ZTSTopologyInitiator& lrInitiator = lTopology.mInitiators[0];
    EXPECT_EQ(lrInitiator.mHost, "host7");
    EXPECT_EQ(lrInitiator.mWwpn.value().toText(), "10:00:00:00:00:00:00:07");
    EXPECT_EQ(lrInitiator.mWwnn.value().toText(), "20:00:00:00:00:00:00:07");
    EXPECT_EQ(lrInitiator.mState, "Online");
    EXPECT_EQ(lrInitiator.mSpeed, "16 Gbit");
    ASSERT_TRUE(lrInitiator.mFabric);
    EXPECT_EQ(lrInitiator.mFabric->toText(), "10:00:00:05:1e:00:00:01");
    EXPECT_EQ(lrInitiator.mFcId, 0x010000U);
    EXPECT_EQ(lrInitiator.mModel, std::nullopt);

    ASSERT_EQ(lTopology.mRemotePorts.size(), 1U);
    const ZTSTopologyRemotePort& lrPort = lTopology.mRemotePorts[0];
    EXPECT_EQ(lrPort.mHost, "host7");
    EXPECT_EQ(lrPort.mWwpn.value().toText(), "50:06:01:60:00:00:00:09");
    EXPECT_EQ(lrPort.mState, "Online");
    EXPECT_EQ(lrPort.mRoles, "FCP Target");
    EXPECT_EQ(lrPort.mFcId, 0x020009U);
    EXPECT_EQ(lrPort.mDevLossSeconds, 60U);

    ASSERT_EQ(lTopology.mPaths.size(), 1U);
    const ZTSTopologyPath& lrPath = lTopology.mPaths[0];
    EXPECT_EQ(lrPath.mAddress, "7:0:3:12");
    EXPECT_EQ(lTopology.findInitiator(lrPath.mHost), &lrInitiator);
    EXPECT_EQ(lTopology.findRemotePort(lrPath.mRemotePort), &lrPort);
    EXPECT_EQ(lrPath.mLun, 12U);
    EXPECT_EQ(lrPath.mVendor, "ACME");
    EXPECT_EQ(lrPath.mWwid, "naa.60060160");
    EXPECT_EQ(lrPath.mQueueDepth, 32U);
    EXPECT_EQ(lrPath.mDisk, "sdc");
    EXPECT_THAT(lrPath.mHolders, ElementsAre("dm-0", "dm-1"));
    ASSERT_NE(lTopology.findMultipath(lrPath), nullptr);
    EXPECT_EQ(lTopology.findMultipath(lrPath)->mName, "mpatha");
    EXPECT_THAT(lTopology.findMultipath(lrPath)->mSlaves, ElementsAre("sdc"));
    EXPECT_THAT(lTopology.findMounts(lrPath), ElementsAre("/srv/my data"));
}

TEST(TopologyScan, AMountOfThePartitionAndSwapBelongToTheDisk) {
    ZTCFakeSysfs lTree;
    lTree.addHost(0);
    lTree.addRemotePort(0, 0, 1);
    lTree.addPath(0, 0, 0, "naa.1", "sda");
    lTree.addMapping(4, "swapvol", "LVM-s", {"sda"});
    lTree.makeFolder("class/block/sda/sda1");
    lTree.write("class/block/sda1/dev", "8:99");
    lTree.swapOn("dm-4");
    ZTSTopologyRoots lRoots = lTree.roots();
    writeFile(lRoots.mProcfs + "/mountinfo", "1 1 8:99 / /boot rw - ext4 /dev/sda1 rw\n");
    ZTCPatientReader lReader;
    const ZTSTopology lTopology = scanTopology(lRoots, lReader);
    EXPECT_THAT(lTopology.findMounts(lTopology.mPaths.at(0)), ElementsAre("/boot", "[swap]"));
}

TEST(TopologyScan, NamesOfAllOnesAndAddressesOfZeroAreAbsent) {
    ZTCFakeSysfs lTree;
    lTree.addHost(1);
    lTree.write("devices/pci0/host1/fc_host/host1/port_name", "0xffffffffffffffff");
    lTree.write("devices/pci0/host1/fc_host/host1/node_name", "0x0");
    lTree.write("devices/pci0/host1/fc_host/host1/fabric_name", "0xffffffffffffffff");
    lTree.write("devices/pci0/host1/fc_host/host1/port_id", "0x000000");
    lTree.write("devices/pci0/host1/fc_host/host1/symbolic_name", "");
    const ZTSTopologyInitiator lPort = sScan(lTree).mInitiators.at(0);
    EXPECT_EQ(lPort.mWwpn, std::nullopt);
    EXPECT_EQ(lPort.mWwnn, std::nullopt);
    EXPECT_EQ(lPort.mFabric, std::nullopt);
    EXPECT_EQ(lPort.mFcId, std::nullopt);
    EXPECT_EQ(lPort.mSymbolicName, std::nullopt);
}

TEST(TopologyScan, MissingAndMalformedAttributesAreAbsentAndTheRestIsThere) {
    ZTCFakeSysfs lTree;
    lTree.addHost(1);
    lTree.addRemotePort(1, 0, 1);
    lTree.addPath(1, 0, 5, "naa.1", "sda");
    std::filesystem::remove(lTree.path("devices/pci0/host1/fc_host/host1/speed"));
    lTree.write("devices/pci0/host1/rport-1:0-0/fc_remote_ports/rport-1:0-0/dev_loss_tmo", "soon");
    lTree.write("devices/pci0/host1/rport-1:0-0/fc_remote_ports/rport-1:0-0/port_name", "0x50060160zz");
    const ZTSTopology lTopology = sScan(lTree);
    EXPECT_EQ(lTopology.mInitiators.at(0).mSpeed, std::nullopt);
    EXPECT_EQ(lTopology.mInitiators.at(0).mState, "Online");
    EXPECT_EQ(lTopology.mRemotePorts.at(0).mDevLossSeconds, std::nullopt);
    EXPECT_EQ(lTopology.mRemotePorts.at(0).mWwpn, std::nullopt);
    EXPECT_EQ(lTopology.mPaths.at(0).mDisk, "sda");
}

TEST(TopologyScan, DisksThatAreNotBehindARemotePortAreNoPaths) {
    ZTCFakeSysfs lTree;
    lTree.makeFolder("devices/pci0/ata1/host9/target9:0:0/9:0:0:0/scsi_device/9:0:0:0");
    lTree.link("class/scsi_device/9:0:0:0", "../../devices/pci0/ata1/host9/target9:0:0/9:0:0:0/scsi_device/9:0:0:0");
    EXPECT_THAT(sScan(lTree).mPaths, IsEmpty());
}

TEST(TopologyScan, HoldersThatLeadInACircleEnd) {
    ZTCFakeSysfs lTree;
    lTree.addHost(0);
    lTree.addRemotePort(0, 0, 1);
    lTree.addPath(0, 0, 0, "naa.1", "sda");
    lTree.addMapping(0, "a", "a", {"sda"});
    lTree.addMapping(1, "b", "b", {"dm-0"});
    lTree.makeFolder("class/block/dm-1/holders/dm-0");
    lTree.makeFolder("class/block/dm-1/holders/sda");
    EXPECT_THAT(sScan(lTree).mPaths.at(0).mHolders, ElementsAre("dm-0", "dm-1"));
}

TEST(TopologyScan, AnAttributeThatBlocksCostsOnlyItsOwnValue) {
    ZTCFakeSysfs lTree;
    lTree.addHost(1);
    lTree.addHost(2);
    const std::string lBlocking = lTree.path("devices/pci0/host1/fc_host/host1/port_state");
    ASSERT_EQ(unlink(lBlocking.c_str()), 0);
    ASSERT_EQ(mkfifo(lBlocking.c_str(), 0600), 0);  // opening it for reading waits for a writer
    ZTCPatientReader lReader(std::chrono::milliseconds(50));
    for (int i = 0; i < 2; ++i) {
        const ZTSTopology lTopology = scanTopology(lTree.roots(), lReader);
        EXPECT_EQ(lTopology.mInitiators.at(0).mState, std::nullopt);
        EXPECT_EQ(lTopology.mInitiators.at(0).mSpeed, "16 Gbit");
        EXPECT_EQ(lTopology.mInitiators.at(1).mState, "Online");
        EXPECT_THAT(lTopology.mBlocked, ElementsAre(lTree.roots().mSysfs + "/class/fc_host/host1/port_state"));
    }
    // It answers at last: the next scan has its value.
    const int lWriter = open(lBlocking.c_str(), O_WRONLY);
    ASSERT_GE(lWriter, 0);
    ASSERT_EQ(write(lWriter, "Online\n", 7), 7);
    close(lWriter);
    waitUntil([&] { return lReader.getBlockedPaths().empty(); }, "the reading that was left behind");
    ASSERT_EQ(unlink(lBlocking.c_str()), 0);
    lTree.write("devices/pci0/host1/fc_host/host1/port_state", "Linkdown");
    EXPECT_EQ(scanTopology(lTree.roots(), lReader).mInitiators.at(0).mState, "Linkdown");
}

TEST(TopologyScan, EveryLunOfALargeHostLeadsToItsDiskItsMultipathDeviceAndItsMount) {
    constexpr unsigned scHosts = ZTCFakeSysfs::gcLargeHosts;
    constexpr unsigned scPortsOfAHost = ZTCFakeSysfs::gcLargePortsOfAHost;
    constexpr unsigned scLuns = 200;
    ZTCFakeSysfs lTree;
    lTree.addLargeHost(scLuns);
    ZTCPatientReader lReader;
    const ZTSTopology lTopology = scanTopology(lTree.roots(), lReader);
    // A few files for each thing, each once, however many lead to it.
    constexpr unsigned scPorts = scHosts * scPortsOfAHost;
    constexpr unsigned scPaths = scHosts * scLuns;
    EXPECT_LE(lReader.countFiles(), 8 * scHosts + 6 * scPorts + (5 + 1) * scPaths + (2 + 1) * scLuns);
    EXPECT_EQ(lTopology.mInitiators.size(), scHosts);
    EXPECT_EQ(lTopology.mRemotePorts.size(), scHosts * scPortsOfAHost);
    ASSERT_EQ(lTopology.mPaths.size(), scLuns * scHosts);
    for (const ZTSTopologyPath& lrPath : lTopology.mPaths) {
        const std::string lNumber = std::to_string(lrPath.mLun);
        EXPECT_EQ(lrPath.mWwid, "naa." + lNumber);
        EXPECT_EQ(lrPath.mDisk, "sd" + lNumber + "x" + lrPath.mHost.substr(4));
        const ZTSTopologyMapping* lpMultipath = lTopology.findMultipath(lrPath);
        ASSERT_NE(lpMultipath, nullptr);
        EXPECT_EQ(lpMultipath->mName, "mpath" + lNumber);
        EXPECT_EQ(lpMultipath->mSlaves.size(), scHosts);
        EXPECT_THAT(lTopology.findMounts(lrPath), ElementsAre("/data/" + lNumber));
        EXPECT_NE(lTopology.findRemotePort(lrPath.mRemotePort), nullptr);
    }
}

/// A tree as a kernel showed it.
class TopologyOfAKernel : public testing::TestWithParam<const char*> {};

TEST_P(TopologyOfAKernel, HasThePortsAndLunsOfTheVirtualMachine) {
    ZTCPatientReader lReader;
    const ZTSTopologyRoots lRoots{.mSysfs = std::string(TAVIK_CAPTURES) + "/" + GetParam() + "/sysfs-online",
                                  .mProcfs = "/nonexistent",
                                  .mSwaps = "/nonexistent"};
    const ZTSTopology lTopology = scanTopology(lRoots, lReader);
    ASSERT_EQ(lTopology.mInitiators.size(), 2U);
    EXPECT_EQ(lTopology.mInitiators[0].mHost, "host0");
    EXPECT_TRUE(lTopology.mInitiators[0].mWwpn.has_value());
    EXPECT_EQ(lTopology.mRemotePorts.size(), 2U);
    ASSERT_EQ(lTopology.mPaths.size(), 4U);
    for (const ZTSTopologyPath& lrPath : lTopology.mPaths) {
        ASSERT_NE(lTopology.findRemotePort(lrPath.mRemotePort), nullptr);
        EXPECT_EQ(lTopology.findRemotePort(lrPath.mRemotePort)->mWwpn, lTopology.mInitiators[1].mWwpn);
        EXPECT_EQ(lrPath.mHost, "host0");
    }
    EXPECT_EQ(lTopology.mPaths[3].mLun, 300U);
}

INSTANTIATE_TEST_SUITE_P(Captures, TopologyOfAKernel, testing::Values("6.1", "6.12"));
