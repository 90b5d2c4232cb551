#include <gmock/gmock.h>

#include "sensor/views/include/SanFacts.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::IsEmpty;
using testing::SizeIs;

static constexpr unsigned scLuns = 40;

TEST(SanTree, OnALargeHostALostPortReducesExactlyTheLunsBehindIt) {
    constexpr unsigned lcPorts = ZTCFakeSysfs::gcLargePortsOfAHost;
    ZTCFakeSysfs lTree;
    lTree.addLargeHost(scLuns);
    ZTCPatientReader lReader;
    ZTSTopology lNow = scanTopology(lTree.roots(), lReader);
    const ZTSSanFacts lWhole = findSanFacts(lNow);
    EXPECT_THAT(lWhole.mTroubles, IsEmpty());
    ASSERT_THAT(lWhole.mLuns, SizeIs(scLuns));
    for (const ZTSSanLun& lrLun : lWhole.mLuns) {
        EXPECT_EQ(lrLun.mRunning, ZTCFakeSysfs::gcLargeHosts);
        EXPECT_TRUE(lrLun.mMultipath.has_value());
    }

    const std::string lPort = "devices/pci0/host3/rport-3:0-5/fc_remote_ports/rport-3:0-5/port_state";
    lTree.write(lPort, "Blocked");
    lNow = scanTopology(lTree.roots(), lReader);
    const ZTSSanFacts lLess = findSanFacts(lNow);
    ASSERT_THAT(lLess.mTroubles, SizeIs(1));
    EXPECT_EQ(lLess.mTroubles[0].mKind, ZTST_PathLost);
    EXPECT_THAT(lLess.mTroubles[0].mLuns, SizeIs(scLuns / lcPorts));
    EXPECT_EQ(lLess.countLuns(ZTRD_Reduced), scLuns / lcPorts);
    EXPECT_EQ(lLess.mTroubles[0].mOtherPorts, lcPorts - 1);
}
