#include "sensor/agentcommon/include/SensorAgentProtocol.h"

#include <gtest/gtest.h>

TEST(SensorAgentProtocol, CommandCodesAreFixed) {
    EXPECT_EQ(0, ZTSTVKC_StartScope);
    EXPECT_EQ(1, ZTSTVKC_GetScopeData);
    EXPECT_EQ(2, ZTSTVKC_Stop);
    EXPECT_EQ(3, ZTSTVKC_RegisterTargets);
    EXPECT_EQ(4, ZTSTVKC_ShutDown);
    EXPECT_EQ(5, ZTSTVKC_CollectionPeriod);
}

TEST(SensorAgentProtocol, StatusesAreFixed) {
    EXPECT_EQ(0u, ZTSAPS_Success);
    EXPECT_EQ(4u, ZTSAPS_VarCreate);
    EXPECT_EQ(6u, ZTSAPS_Invalid);
    EXPECT_EQ(8u, ZTSAPS_NotFound);
    EXPECT_EQ(9u, ZTSAPS_NotAllowed);
    EXPECT_EQ(10u, ZTSAPS_Exists);
    EXPECT_EQ(11u, ZTSAPS_Repeat);
    EXPECT_EQ(12u, ZTSAPS_NotSupported);
    EXPECT_EQ(325u, ZTSAPS_ConnectFailed);
    EXPECT_EQ(326u, ZTSAPS_OpenFailed);
    EXPECT_EQ(335u, ZTSAPS_LockFailed);
    EXPECT_EQ(336u, ZTSAPS_UnlockFailed);
    EXPECT_EQ(490u, ZTSAPS_RefreshFailed);
    EXPECT_EQ(491u, ZTSAPS_Max);
}

TEST(SensorAgentProtocol, FileNamesAndLimitsAreFixed) {
    EXPECT_STREQ("ZT_QRV_SENSOR_DIR", gcSensorDirVariable);
    EXPECT_STREQ("/qrvtvkcmd.fifo", gcCommandFifoName);
    EXPECT_STREQ("/qrvtvkout.fifo", gcResponseFifoName);
    EXPECT_STREQ("/qrv-tvk.pid", gcAgentPidFileName);
    EXPECT_STREQ("/qrv-sn.pid", gcSensorPidFileName);
    EXPECT_STREQ("/qrv-sn.lock", gcSensorLockFileName);
    EXPECT_EQ(1048576u, gcMaxRequestSize);
    EXPECT_EQ(4u, gcFrameHeaderSize);
}
