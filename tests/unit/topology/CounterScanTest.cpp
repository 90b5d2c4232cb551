#include "sensor/topology/include/CounterScan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "sensor/topology/include/CounterDifferences.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::ElementsAre;
using testing::IsEmpty;

namespace {

const std::string scHostFolder = "devices/pci0/host7/fc_host/host7/statistics/";
const std::string scPortFolder = "devices/pci0/host7/rport-7:0-3/fc_remote_ports/rport-7:0-3/statistics/";

class CounterScanTest : public testing::Test {
protected:
    CounterScanTest() {
        mTree.addHost(7);
        mTree.addRemotePort(7, 3, 9);
    }
    std::vector<ZTSCounterReading> scan() {
        const std::string lSysfs = mTree.roots().mSysfs;
        return scanCounters(lSysfs, scanPorts(lSysfs, mReader), mReader);
    }

    const ZTSFcName mInitiator = ZTSFcName::fromText(ZTCFakeSysfs::initiatorName(7));
    const ZTSFcName mPort = ZTSFcName::fromText(ZTCFakeSysfs::remotePortName(9));
    ZTCFakeSysfs mTree;
    ZTCPatientReader mReader;
};

}  // namespace

TEST_F(CounterScanTest, ReadsTheErrorCountersOfLocalAndRemotePortsInHexadecimal) {
    mTree.write(scHostFolder + "invalid_crc_count", "0x1f");
    mTree.write(scHostFolder + "link_failure_count", "0x0");
    mTree.write(scPortFolder + "fpin_cn", "0xa");
    EXPECT_THAT(scan(), ElementsAre(ZTSCounterReading{mInitiator, std::nullopt, "invalid_crc_count", 31},
                                    ZTSCounterReading{mInitiator, std::nullopt, "link_failure_count", 0},
                                    ZTSCounterReading{mInitiator, mPort, "fpin_cn", 10}));
}

TEST_F(CounterScanTest, WhatTheDriverDoesNotCountIsNoNumber) {
    mTree.write(scHostFolder + "invalid_crc_count", "0xffffffffffffffff");
    mTree.write(scHostFolder + "lip_count", "");
    mTree.write(scHostFolder + "nos_count", "many");
    EXPECT_THAT(scan(), IsEmpty());
}

TEST_F(CounterScanTest, TrafficAndTimeAreLeftOut) {
    for (const char* const lpName : {"tx_frames", "rx_words", "seconds_since_last_reset", "fcp_input_megabytes",
                                     "fcp_output_requests", "fcp_control_requests", "reset_statistics"}) {
        mTree.write(scHostFolder + lpName, "0x1");
    }
    mTree.write(scHostFolder + "fcp_frame_alloc_failures", "0x1");
    ASSERT_EQ(scan().size(), 1U);
    EXPECT_EQ(scan()[0].mName, "fcp_frame_alloc_failures");
}

TEST_F(CounterScanTest, APortWithoutANameHasNoCounters) {
    mTree.write(scHostFolder + "lip_count", "0x1");
    mTree.write("devices/pci0/host7/fc_host/host7/port_name", "0xffffffffffffffff");
    EXPECT_THAT(scan(), IsEmpty());
}

TEST(CounterDifferences, OnlyWhatRoseBetweenTwoScansIsADifference) {
    const ZTSFcName lPort = ZTSFcName::fromText("10:00:00:00:00:00:00:01");
    const auto lReading = [&](const char* apName, std::uint64_t aValue) {
        return ZTSCounterReading{.mInitiator = lPort, .mName = apName, .mValue = aValue};
    };
    ZTCCounterDifferences lDifferences;
    EXPECT_THAT(lDifferences.take({lReading("a", 5), lReading("b", 7)}), IsEmpty()) << "the first scan is the base";
    EXPECT_THAT(lDifferences.take({lReading("a", 9), lReading("b", 7)}), ElementsAre(lReading("a", 4)));
    EXPECT_THAT(lDifferences.take({lReading("a", 3), lReading("b", 7)}), IsEmpty()) << "it was reset";
    EXPECT_THAT(lDifferences.take({lReading("a", 4)}), ElementsAre(lReading("a", 1)));
    EXPECT_THAT(lDifferences.take({lReading("a", 4), lReading("b", 9)}), IsEmpty()) << "b was not there the last time";
    EXPECT_THAT(lDifferences.take({lReading("a", 4), lReading("b", 10)}), ElementsAre(lReading("b", 1)));
}

TEST(CounterDifferences, LocalAndRemotePortsAreToldApart) {
    const ZTSFcName lPort = ZTSFcName::fromText("10:00:00:00:00:00:00:01");
    const ZTSFcName lRemote = ZTSFcName::fromText("50:00:00:00:00:00:00:01");
    ZTCCounterDifferences lDifferences;
    const auto lReadings = [&](std::uint64_t aOwn, std::uint64_t aRemote) {
        return std::vector<ZTSCounterReading>{{lPort, std::nullopt, "fpin_cn", aOwn},
                                              {lPort, lRemote, "fpin_cn", aRemote}};
    };
    lDifferences.take(lReadings(1, 100));
    EXPECT_EQ(lDifferences.take(lReadings(2, 103)), lReadings(1, 3));
}
