/// A watch over a host with one remote port, in which nothing happens by itself in the time of a test.
#ifndef TESTS_UNIT_COLLECTOR_TOPOLOGYWATCHFIXTURE_H
#define TESTS_UNIT_COLLECTOR_TOPOLOGYWATCHFIXTURE_H

#include <gtest/gtest.h>

#include <chrono>

#include "sensor/collector/include/TopologyWatch.h"
#include "tests/unit/topology/FakeSysfs.h"

class ZTCTopologyWatchFixture : public testing::Test {
protected:
    ZTCTopologyWatchFixture() {
        mTree.addHost(7);
        mTree.addRemotePort(7, 3, 9);
        mSetup.mRoots = mTree.roots();
        mSetup.mPortsPeriod = mSetup.mWholePeriod = mSetup.mStaleAfter = std::chrono::hours(1);
        mSetup.mHurryPause = std::chrono::milliseconds(1);
        mSetup.mPatience = std::chrono::milliseconds(50);
    }

    ZTCFakeSysfs mTree;
    ZTSTopologyWatchSetup mSetup;
};

#endif
