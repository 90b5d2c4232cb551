#include "sensor/client/include/CommandEncoder.h"

#include <gtest/gtest.h>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/Bytes.h"

TEST(CommandEncoder, StartIsItsCodeAndTheRecordLimit) {
    EXPECT_EQ(hexOf(encodeStartScope(900)), "0000000384");
    EXPECT_EQ(hexOf(encodeStartScope(0xFFFFFFFF)), "00ffffffff");
}

TEST(CommandEncoder, GetStopAndShutDownAreTheirCodesAlone) {
    EXPECT_EQ(hexOf(encodeGetScopeData()), "01");
    EXPECT_EQ(hexOf(encodeStop()), "02");
    EXPECT_EQ(hexOf(encodeShutDown()), "04");
}

TEST(CommandEncoder, CollectionPeriodIsItsCodeAndTheSeconds) {
    EXPECT_EQ(hexOf(encodeCollectionPeriod(0)), "0500000000");
    EXPECT_EQ(hexOf(encodeCollectionPeriod(3600)), "0500000e10");
}

TEST(CommandEncoder, TargetsAreCountedAndWrittenNodeNameFirst) {
    const std::vector<ZTSTargetPort> lTargets{
        {ZTSFcName::fromText("50:06:01:60:bb:a0:12:34"), ZTSFcName::fromText("50:06:01:60:3b:a0:12:34"), 0x010203},
        {ZTSFcName::fromText("0000000000000001"), ZTSFcName::fromText("0x0000000000000002"), 3}};
    EXPECT_EQ(hexOf(encodeRegisterTargets(lTargets)),
              "0300000002"
              "50060160bba01234500601603ba0123400010203"
              "0000000000000001000000000000000200000003");
    EXPECT_EQ(hexOf(encodeRegisterTargets({})), "0300000000");
}

TEST(CommandEncoder, AsManyTargetsAsARequestHoldsAreEncodedAndOneMoreIsRefused) {
    const std::vector<ZTSTargetPort> lMost(gcMaxTargetsPerRequest);
    const ZTCWireBytes lBody = encodeRegisterTargets(lMost);
    EXPECT_EQ(lBody.size(), 5 + 20 * gcMaxTargetsPerRequest);
    EXPECT_NO_THROW(makeRequestFrame(lBody));
    EXPECT_GT(5 + 20 * (gcMaxTargetsPerRequest + 1), gcMaxRequestSize);
    const std::vector<ZTSTargetPort> lTooMany(gcMaxTargetsPerRequest + 1);
    EXPECT_THROW(encodeRegisterTargets(lTooMany), ZTCBadInputEx);
}

TEST(CommandEncoder, AFrameIsTheBodyWithItsLengthInFront) {
    EXPECT_EQ(hexOf(makeRequestFrame(encodeGetScopeData())), "0000000101");
    EXPECT_EQ(hexOf(makeRequestFrame(encodeStartScope(900))), "000000050000000384");
}

TEST(CommandEncoder, AFrameHolds1To1048576Bytes) {
    EXPECT_THROW(makeRequestFrame({}), ZTCBadInputEx);
    EXPECT_EQ(makeRequestFrame(ZTCWireBytes(1048576)).size(), 1048580U);
    EXPECT_THROW(makeRequestFrame(ZTCWireBytes(1048577)), ZTCBadInputEx);
}
