#include "common/include/DateTime.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "common/include/EncodableStream.h"
#include "tests/support/FailingAllocation.h"

namespace {

/// Local time is that of a zone of the test's choice.
class DateTime : public testing::Test {
protected:
    DateTime() {
        const char* const lpFormer = std::getenv("TZ");
        mHadZone = lpFormer != nullptr;
        mFormerZone = mHadZone ? lpFormer : "";
    }
    ~DateTime() override {
        if (mHadZone) {
            setenv("TZ", mFormerZone.c_str(), 1);
        } else {
            unsetenv("TZ");
        }
        tzset();
    }
    static void setZone(const char* apZone) {
        setenv("TZ", apZone, 1);
        tzset();
    }

private:
    bool mHadZone = false;
    std::string mFormerZone;
};

}  // namespace

TEST_F(DateTime, SplitsATimeIntoItsLocalFields) {
    setZone("XYZ-2");  // two hours east
    const ZTCDateTime lTime(std::timespec{.tv_sec = 1234567890, .tv_nsec = 123456789}, ".");
    EXPECT_EQ(2009, lTime.getYear());
    EXPECT_EQ(2, lTime.getMonth());
    EXPECT_EQ(14, lTime.getDay());
    EXPECT_EQ(1, lTime.getHour());
    EXPECT_EQ(31, lTime.getMinute());
    EXPECT_EQ(30, lTime.getSecond());
    EXPECT_EQ('.', lTime.getSeparator());
    EXPECT_EQ(123, lTime.getMilliSeconds());
    EXPECT_EQ(456, lTime.getMicroSeconds());
    EXPECT_EQ(1234567890u, lTime.getSecondsSinceEpoch());
}

TEST_F(DateTime, EncodesTwentyBytesFieldByField) {
    setZone("UTC0");
    const ZTCDateTime lTime(std::timespec{.tv_sec = 1234567890, .tv_nsec = 999999999}, ".");
    ZTCEncodableOutStream lStream;
    lTime.encode(lStream);
    const ZTCPointer<ZTCBuffer> lBuffer = lStream.getBuffer();
    const std::vector<unsigned> lBytes(lBuffer->getData(), lBuffer->getData() + lBuffer->getSize());
    EXPECT_EQ((std::vector<unsigned>{0x07, 0xd9, 2, 13, 23,   31,   30,   0x2e, 0x03, 0xe7, 0x03, 0xe7,  //
                                     0,    0,    0, 0,  0x49, 0x96, 0x02, 0xd2}),
              lBytes);
    EXPECT_EQ(ZTCDateTime::gcEncodedSize, lBuffer->getSize());
}

TEST_F(DateTime, IsTheCurrentTimeWhereNoneIsGiven) {
    const std::time_t lBefore = std::time(nullptr);
    const ZTCDateTime lTime(".");
    std::timespec lAfter{};
    clock_gettime(CLOCK_REALTIME, &lAfter);
    EXPECT_GE(lTime.getSecondsSinceEpoch(), static_cast<std::uint64_t>(lBefore));
    EXPECT_LE(lTime.getSecondsSinceEpoch(), static_cast<std::uint64_t>(lAfter.tv_sec));
    EXPECT_LE(lTime.getMilliSeconds(), 999);
    EXPECT_LE(lTime.getMicroSeconds(), 999);

    const std::time_t lSeconds = static_cast<std::time_t>(lTime.getSecondsSinceEpoch());
    std::tm lLocal{};
    localtime_r(&lSeconds, &lLocal);
    EXPECT_EQ(lLocal.tm_year + 1900, lTime.getYear());
    EXPECT_EQ(lLocal.tm_hour, lTime.getHour());
    EXPECT_EQ(lLocal.tm_sec, lTime.getSecond());
}

TEST_F(DateTime, TheSeparatorIsTheFirstCharacterOrADot) {
    EXPECT_EQ(':', ZTCDateTime(":;").getSeparator());
    EXPECT_EQ('.', ZTCDateTime("").getSeparator());
    EXPECT_EQ('.', ZTCDateTime(nullptr).getSeparator());
}

TEST_F(DateTime, CopyingAndEncodingIntoRoomDoNotAllocate) {
    const ZTCDateTime lTime(".");
    ZTCEncodableOutStream lStream(ZTCDateTime::gcEncodedSize);
    ZTCFailingAllocation lFailure(1);
    const ZTCDateTime lCopy(lTime);
    lCopy.encode(lStream);
    EXPECT_FALSE(lFailure.hasFailed());
}
