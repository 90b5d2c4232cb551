#include "tavik/include/TavikRecord.h"

#include <gtest/gtest.h>

#include "tests/support/ScopeDataResponse.h"
#include "tests/support/Waiting.h"
#include "tests/unit/agentcommon/support/BufferBytes.h"

/// Opens the record's counter to this file, for its end lies 2^32 events away.
template <auto tMember>
struct ZTSCounterAccess {
    friend std::uint32_t& counterOf(ZTCTavikRecord& arRecord) { return arRecord.*tMember; }
};
std::uint32_t& counterOf(ZTCTavikRecord& arRecord);
template struct ZTSCounterAccess<&ZTCTavikRecord::mOccurences>;

static ZTCPointer<ZTCScopeData> sMakeData() {
    const ZTCBytes lBytes = bytesOf("01000000 aabbccdd");
    return ZTCPointer<ZTCScopeData>::make(ZTCPointer<ZTCScopeEvent>(new ZTCScopeEvent(1, 0x20)), lBytes.data(), 8u,
                                          900u);
}

/// The record's encoding inside of the smallest response, taken apart.
static ZTSEncodedRecord sDecode(const ZTCTavikRecord& acrRecord) {
    const ZTCBytes lBody = ZTCByteWriter().u8(2).u32(1).u32(0).u32(1).raw(encodingOf(acrRecord)).bytes();
    return ZTSScopeDataResponse::decode(lBody).mLists.at(0).mRecords.at(0);
}

TEST(TavikRecord, ANewOneHasOneOccurrenceAndEqualTimes) {
    const std::uint64_t lBefore = static_cast<std::uint64_t>(time(nullptr));
    const ZTCTavikRecord lRecord(sMakeData());
    const ZTSEncodedRecord lEncoded = sDecode(lRecord);
    EXPECT_EQ(1u, lEncoded.mOccurrences);
    // Two readings of the clock, one after the other.
    EXPECT_LE(lEncoded.mBegin.total(), lEncoded.mEnd.total());
    EXPECT_LE(lBefore, lEncoded.mBegin.mEpochSeconds + 1);
    // time() lags behind the clock of the records by up to a tick.
    EXPECT_GE(static_cast<std::uint64_t>(time(nullptr)) + 1, lEncoded.mEnd.mEpochSeconds);
}

TEST(TavikRecord, EncodesOccurrencesThenBothTimesThenItsData) {
    const ZTCTavikRecord lRecord(sMakeData());
    const std::string lHex = hexOf(encodingOf(lRecord));
    ASSERT_EQ(2u * (4 + 20 + 20 + 3 + 4 + 8), lHex.size());
    EXPECT_EQ("00000001", lHex.substr(0, 8));
    const ZTSEncodedRecord lEncoded = sDecode(lRecord);
    const std::time_t lSeconds = static_cast<std::time_t>(lEncoded.mBegin.mEpochSeconds);
    std::tm lLocal{};
    localtime_r(&lSeconds, &lLocal);
    const std::string lTime = ZTCByteWriter()
                                  .u16(static_cast<unsigned>(lLocal.tm_year + 1900))
                                  .u8(static_cast<unsigned>(lLocal.tm_mon + 1))
                                  .u8(static_cast<unsigned>(lLocal.tm_mday))
                                  .u8(static_cast<unsigned>(lLocal.tm_hour))
                                  .u8(static_cast<unsigned>(lLocal.tm_min))
                                  .u8(static_cast<unsigned>(lLocal.tm_sec))
                                  .u8(0x2E)
                                  .u16(lEncoded.mBegin.mMilliseconds)
                                  .u16(lEncoded.mBegin.mMicroseconds)
                                  .u32(static_cast<std::uint64_t>(lSeconds) >> 32)
                                  .u32(static_cast<std::uint64_t>(lSeconds))
                                  .hex();
    EXPECT_EQ(lTime, lHex.substr(8, 40));
    EXPECT_EQ(
        "01"
        "20"
        "00"
        "00000008"
        "01000000aabbccdd",
        lHex.substr(88));
}

TEST(TavikRecord, FurtherOccurrencesCountAndMoveTheEndAlone) {
    ZTCTavikRecord lRecord(sMakeData());
    const ZTSEncodedDateTime lBegin = sDecode(lRecord).mBegin;
    std::uint32_t lOccurrences = 1;
    waitUntil(
        [&] {
            lRecord.incrementOccurrences();
            ++lOccurrences;
            return sDecode(lRecord).mEnd.total() > lBegin.total();
        },
        "the clock to go on");
    EXPECT_EQ(lOccurrences, sDecode(lRecord).mOccurrences);
    EXPECT_EQ(lBegin.total(), sDecode(lRecord).mBegin.total());
}

TEST(TavikRecord, TheCountWrapsAt32Bits) {
    ZTCTavikRecord lRecord(sMakeData());
    counterOf(lRecord) = 0xFFFFFFFE;
    lRecord.incrementOccurrences();
    EXPECT_EQ(0xFFFFFFFFu, sDecode(lRecord).mOccurrences);
    lRecord.incrementOccurrences();
    EXPECT_EQ(0u, sDecode(lRecord).mOccurrences);
    lRecord.incrementOccurrences();
    EXPECT_EQ(1u, sDecode(lRecord).mOccurrences);
}

TEST(TavikRecord, SharesItsData) {
    const ZTCPointer<ZTCScopeData> lData = sMakeData();
    ZTCTavikRecord lRecord(lData);
    const ZTCTavikRecord& lcrRecord = lRecord;
    EXPECT_EQ(lData.get(), lRecord.getScopeData().get());
    EXPECT_EQ(lData.get(), lcrRecord.getScopeData().get());
    const unsigned char lMore = 0x77;
    lData->appendEventData(&lMore, 1);
    EXPECT_EQ("01000000aabbccdd77", sDecode(lRecord).dataHex());
}
