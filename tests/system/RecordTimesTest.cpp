#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <ctime>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"
#include "tests/system/RecordTexts.h"

static std::uint64_t sNowInMicroseconds() {
    return static_cast<std::uint64_t>(
        std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::system_clock::now().time_since_epoch())
            .count());
}

TEST(RecordTimes, ANewRecordBeginsAndEndsWhenItsEventCame) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    const std::uint64_t lBefore = sNowInMicroseconds();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 0x01));
    const std::uint64_t lAfter = sNowInMicroseconds();
    const ZTSScopeDataResponse lResponse = lAgent.retrieve();
    ASSERT_EQ(lResponse.texts().size(), 1u);
    const ZTSEncodedRecord& lcrRecord = lResponse.mLists[0].mRecords[0];
    EXPECT_LE(lBefore, lcrRecord.mBegin.total());
    EXPECT_LE(lcrRecord.mBegin.total(), lcrRecord.mEnd.total());
    EXPECT_LE(lcrRecord.mEnd.total(), lAfter);

    const auto lSeconds = static_cast<std::time_t>(lcrRecord.mBegin.mEpochSeconds);
    std::tm lLocal{};
    ASSERT_NE(localtime_r(&lSeconds, &lLocal), nullptr);
    EXPECT_EQ(lcrRecord.mBegin.mYear, lLocal.tm_year + 1900);
    EXPECT_EQ(lcrRecord.mBegin.mMonth, lLocal.tm_mon + 1);
    EXPECT_EQ(lcrRecord.mBegin.mDay, lLocal.tm_mday);
    EXPECT_EQ(lcrRecord.mBegin.mHour, lLocal.tm_hour);
    EXPECT_EQ(lcrRecord.mBegin.mMinute, lLocal.tm_min);
    EXPECT_EQ(lcrRecord.mBegin.mSecond, lLocal.tm_sec);
}

TEST(RecordTimes, TimesStandInTheAgentsTimeZone) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("TZ", "XYZ-5:30");
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().deliver(ZTSLibraryEvent::bare(0, 2, 0x01));
    const ZTSEncodedDateTime lTime = lAgent.retrieve().mLists.at(0).mRecords.at(0).mBegin;
    const auto lShifted = static_cast<std::time_t>(lTime.mEpochSeconds + (5 * 60 + 30) * 60);
    std::tm lLocal{};
    ASSERT_NE(gmtime_r(&lShifted, &lLocal), nullptr);
    EXPECT_EQ(lTime.mDay, lLocal.tm_mday);
    EXPECT_EQ(lTime.mHour, lLocal.tm_hour);
    EXPECT_EQ(lTime.mMinute, lLocal.tm_min);
    EXPECT_EQ(lTime.mSecond, lLocal.tm_sec);
}

TEST(RecordTimes, FurtherOccurrencesMoveTheEndTimeAlone) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        SCOPED_TRACE(lcrKind.mpName);
        lAgent.library().deliver(eventOf(lcrKind, lcrKind.mData));
        const std::uint64_t lBetween = sNowInMicroseconds();
        lAgent.library().deliver(eventOf(lcrKind, lcrKind.mSameIdentity));
        const ZTSEncodedRecord lRecord = lAgent.retrieve().mLists.at(0).mRecords.at(0);
        EXPECT_EQ(lRecord.mOccurrences, 2u);
        EXPECT_LE(lRecord.mBegin.total(), lBetween);
        EXPECT_GE(lRecord.mEnd.total(), lBetween);
    }
}
