#include "sensor/agentcommon/include/EventDataRecords.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <type_traits>
#include <vector>

#include "tests/support/Bytes.h"

/// Bytes 1, 2, 3 ... at an odd address, read as one record.
template <typename TRecord>
static const TRecord& sReadFromAStreamOfBytes(std::vector<unsigned char>& arBytes) {
    static_assert(alignof(TRecord) == 1 && std::is_trivially_copyable_v<TRecord>);
    arBytes.resize(1 + sizeof(TRecord));
    for (std::size_t lByte = 0; lByte < sizeof(TRecord); ++lByte) {
        arBytes[1 + lByte] = static_cast<unsigned char>(lByte + 1);
    }
    return reinterpret_cast<const TRecord&>(arBytes[1]);
}

static std::string sHex(const ZTSWwnBytes& acrName) {
    return hexOf(ZTCBytes(acrName, acrName + sizeof acrName));
}

TEST(EventDataRecords, IntegersAreLittleEndianOnEveryHost) {
    EXPECT_EQ(0x04030201u, (ZTSLittleEndian32{{1, 2, 3, 4}}.get()));
    EXPECT_EQ(0xFFFFFFFFu, (ZTSLittleEndian32{{0xFF, 0xFF, 0xFF, 0xFF}}.get()));
    EXPECT_EQ(0x80000000u, (ZTSLittleEndian32{{0, 0, 0, 0x80}}.get()));
}

TEST(EventDataRecords, CountOnlyRecordsStandByteForByte) {
    std::vector<unsigned char> lBytes;
    EXPECT_EQ(0x04030201u, sReadFromAStreamOfBytes<TavikGeneric>(lBytes).Version.get());
    const auto& lrPlogi = sReadFromAStreamOfBytes<TavikPlogi>(lBytes);
    EXPECT_EQ("05060708090a0b0c", sHex(lrPlogi.Wwpn));
    EXPECT_EQ("0d0e0f1011121314", sHex(lrPlogi.PayloadWwpn));
    EXPECT_EQ("05060708090a0b0c", sHex(sReadFromAStreamOfBytes<TavikPrlo>(lBytes).Wwpn));
    const auto& lrAdisc = sReadFromAStreamOfBytes<TavikAdisc>(lBytes);
    EXPECT_EQ("05060708090a0b0c", sHex(lrAdisc.Wwpn));
    EXPECT_EQ("0d0e0f1011121314", sHex(lrAdisc.Wwnn));
    const auto& lrLogo = sReadFromAStreamOfBytes<TavikLogo>(lBytes);
    EXPECT_EQ("05060708090a0b0c", sHex(lrLogo.Wwpn));
    EXPECT_EQ("0d0e0f1011121314", sHex(lrLogo.PayloadWwpn));
    EXPECT_EQ("05060708090a0b0c", sHex(sReadFromAStreamOfBytes<TavikPortBusy>(lBytes).Wwpn));
    const auto& lrRscn = sReadFromAStreamOfBytes<TavikRscn>(lBytes);
    EXPECT_EQ(0x04030201u, lrRscn.Version.get());
    EXPECT_EQ(0x08070605u, lrRscn.FcId.get());
}

TEST(EventDataRecords, AppendingRecordsStandByteForByte) {
    std::vector<unsigned char> lBytes;
    const auto& lrLsRjt = sReadFromAStreamOfBytes<TavikLsRjt>(lBytes);
    EXPECT_EQ("05060708090a0b0c", sHex(lrLsRjt.Wwpn));
    EXPECT_EQ(0x100f0e0du, lrLsRjt.OrgCmd.get());
    EXPECT_EQ(0x14131211u, lrLsRjt.ReasonCode.get());
    EXPECT_EQ(0x18171615u, lrLsRjt.ReasonCodeExpl.get());
    const auto& lrMoreLsRjt = sReadFromAStreamOfBytes<TavikConsLsRjt>(lBytes);
    EXPECT_EQ(0x04030201u, lrMoreLsRjt.ReasonCode.get());
    EXPECT_EQ(0x08070605u, lrMoreLsRjt.ReasonCodeExpl.get());

    const auto& lrReadCheck = sReadFromAStreamOfBytes<TavikFcprdChkErr>(lBytes);
    EXPECT_EQ("05060708090a0b0c", sHex(lrReadCheck.Wwpn));
    EXPECT_EQ(0x100f0e0du, lrReadCheck.OpCode.get());
    EXPECT_EQ(0x14131211u, lrReadCheck.OsLun.get());
    EXPECT_EQ(0x18171615u, lrReadCheck.FcpiParam.get());
    EXPECT_EQ(0x04030201u, sReadFromAStreamOfBytes<TavikConsFcprdChkErr>(lBytes).FcpiParam.get());

    EXPECT_EQ(0x100f0e0du, sReadFromAStreamOfBytes<TavikLunReset>(lBytes).OsLun.get());
    EXPECT_EQ(0x04030201u, sReadFromAStreamOfBytes<TavikConsLunReset>(lBytes).OsLun.get());
    EXPECT_EQ(0x100f0e0du, sReadFromAStreamOfBytes<TavikTargetReset>(lBytes).OsLun.get());
    EXPECT_EQ(0x04030201u, sReadFromAStreamOfBytes<TavikConsTargetReset>(lBytes).OsLun.get());

    const auto& lrDepth = sReadFromAStreamOfBytes<TavikQChange>(lBytes);
    EXPECT_EQ(0x100f0e0du, lrDepth.OsLun.get());
    EXPECT_EQ(0x14131211u, lrDepth.NewVal.get());
    const auto& lrMoreDepth = sReadFromAStreamOfBytes<TavikConsQChange>(lBytes);
    EXPECT_EQ(0x04030201u, lrMoreDepth.OsLun.get());
    EXPECT_EQ(0x08070605u, lrMoreDepth.NewVal.get());
}

TEST(EventDataRecords, BitFieldRecordsStandByteForByte) {
    std::vector<unsigned char> lBytes;
    const auto& lrQFull = sReadFromAStreamOfBytes<TavikQFull>(lBytes);
    EXPECT_EQ(0x100f0e0du, lrQFull.LenOsLun.get());
    EXPECT_EQ(17, lrQFull.OsLun[0]);
    EXPECT_EQ(48, lrQFull.OsLun[31]);
    const auto& lrDevBsy = sReadFromAStreamOfBytes<TavikDevBsy>(lBytes);
    EXPECT_EQ(0x100f0e0du, lrDevBsy.LenOsLun.get());
    EXPECT_EQ(48, lrDevBsy.OsLun[31]);
    const auto& lrCheckCond = sReadFromAStreamOfBytes<TavikCheckCond>(lBytes);
    EXPECT_EQ(0x100f0e0du, lrCheckCond.SensKey.get());
    EXPECT_EQ(0x14131211u, lrCheckCond.Asc.get());
    EXPECT_EQ(0x18171615u, lrCheckCond.OsLunLen.get());
    EXPECT_EQ(25, lrCheckCond.OsLun[0]);
    EXPECT_EQ(0x3c3b3a39u, lrCheckCond.CmdCodeLen.get());
    EXPECT_EQ(61, lrCheckCond.CmdCode[0]);
    EXPECT_EQ(0x605f5e5du, lrCheckCond.AscqLen.get());
    EXPECT_EQ(97, lrCheckCond.Ascq[0]);
    EXPECT_EQ(128, lrCheckCond.Ascq[31]);
}
