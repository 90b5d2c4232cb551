#include <gmock/gmock.h>

#include "sensor/views/include/SanFacts.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::IsEmpty;
using testing::SizeIs;

static constexpr unsigned scHosts = 8;
static constexpr unsigned scPortsOfAHost = 8;
static constexpr unsigned scLuns = 40;

/// Sysfs of a large host with 8 initiators, 64 remote ports and units with 8 paths each.
static void sWriteHost(ZTCFakeSysfs& arTree) {
    for (unsigned lHost = 0; lHost < scHosts; ++lHost) {
        arTree.addHost(lHost);
        for (unsigned lTarget = 0; lTarget < scPortsOfAHost; ++lTarget) {
            arTree.addRemotePort(lHost, lTarget, lHost * scPortsOfAHost + lTarget);
        }
    }
    for (unsigned lLun = 0; lLun < scLuns; ++lLun) {
        std::vector<std::string> lDisks;
        for (unsigned lHost = 0; lHost < scHosts; ++lHost) {
            lDisks.push_back("sd" + std::to_string(lLun) + "x" + std::to_string(lHost));
            arTree.addPath(lHost, lLun % scPortsOfAHost, lLun, "naa." + std::to_string(lLun), lDisks.back());
        }
        const std::string lNumber = std::to_string(lLun);
        arTree.addMapping(lLun, "mpath" + lNumber, "mpath-" + lNumber, lDisks);
    }
}

TEST(SanTree, OnALargeHostALostPortReducesExactlyTheLunsBehindIt) {
    ZTCFakeSysfs lTree;
    sWriteHost(lTree);
    ZTCPatientReader lReader;
    ZTSTopology lNow = scanTopology(lTree.roots(), lReader);
    const ZTSSanFacts lWhole = findSanFacts(lNow);
    EXPECT_THAT(lWhole.mTroubles, IsEmpty());
    ASSERT_THAT(lWhole.mLuns, SizeIs(scLuns));
    for (const ZTSSanLun& lrLun : lWhole.mLuns) {
        EXPECT_EQ(lrLun.mRunning, scHosts);
        EXPECT_TRUE(lrLun.mMultipath.has_value());
    }

    const std::string lPort = "devices/pci0/host3/rport-3:0-5/fc_remote_ports/rport-3:0-5/port_state";
    lTree.write(lPort, "Blocked");
    lNow = scanTopology(lTree.roots(), lReader);
    const ZTSSanFacts lLess = findSanFacts(lNow);
    ASSERT_THAT(lLess.mTroubles, SizeIs(1));
    EXPECT_EQ(lLess.mTroubles[0].mKind, ZTST_PathLost);
    EXPECT_THAT(lLess.mTroubles[0].mLuns, SizeIs(scLuns / scPortsOfAHost));
    EXPECT_EQ(lLess.countLuns(ZTRD_Reduced), scLuns / scPortsOfAHost);
    EXPECT_EQ(lLess.mTroubles[0].mOtherPorts, scPortsOfAHost - 1);
}
