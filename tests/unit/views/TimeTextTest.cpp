#include "sensor/views/include/TimeText.h"

#include <cstdlib>
#include <ctime>

#include "tests/unit/views/ViewSamples.h"

class TimeText : public LocalTime {
protected:
    static std::string parsed(const std::string& acrText) {
        const auto lTime = parseLocalTime(acrText, timeOf("2026-11-21T10:04:12+01:00"));
        return lTime ? toRfc3339(*lTime) : "nothing";
    }
};

TEST_F(TimeText, Rfc3339HasMicrosecondsAndTheLocalOffset) {
    EXPECT_EQ(toRfc3339(fromMicroseconds(1795251852000007)), "2026-11-21T10:04:12.000007+01:00");
    EXPECT_EQ(toRfc3339(fromMicroseconds(-1)), "1970-01-01T00:59:59.999999+01:00");
    EXPECT_EQ(toRfc3339(timeOf("2026-07-01T12:00:00Z")), "2026-07-01T14:00:00.000000+02:00");
}

TEST_F(TimeText, WestOfGreenwichTheOffsetIsNegative) {
    setenv("TZ", "NST3:30", 1);
    tzset();
    EXPECT_EQ(toRfc3339(timeOf("2026-11-21T10:04:12Z")), "2026-11-21T06:34:12.000000-03:30");
}

TEST_F(TimeText, Rfc3339IsReadBackWhateverItsOffset) {
    EXPECT_EQ(fromRfc3339("2026-11-21T09:04:12Z"), fromRfc3339("2026-11-21t10:04:12+01:00"));
    EXPECT_EQ(fromRfc3339("2026-11-20 20:34:12.5-12:30"), fromRfc3339("2026-11-21T09:04:12.500000Z"));
    EXPECT_EQ(fromRfc3339("2026-11-21T09:04:12.1234567Z"), fromRfc3339("2026-11-21T09:04:12.123456Z"));
    for (const char* lpText : {"", "2026-11-21", "2026-11-21T10:04:12", "2026-02-29T10:04:12Z", "2026-13-01T10:04:12Z",
                               "2026-11-21T24:00:00Z", "2026-11-21T10:04:12.Z", "2026-11-21T10:04:12+1:00",
                               "2026-11-21T10:04:12Z ", "26-11-21T10:04:12Z"}) {
        EXPECT_FALSE(fromRfc3339(lpText)) << lpText;
    }
}

TEST_F(TimeText, PeopleLeaveOutWhatGoesWithoutSaying) {
    EXPECT_EQ(parsed("2026-11-20"), "2026-11-20T00:00:00.000000+01:00");
    EXPECT_EQ(parsed("2026-11-20 08:15"), "2026-11-20T08:15:00.000000+01:00");
    EXPECT_EQ(parsed("2026-11-20T08:15:30"), "2026-11-20T08:15:30.000000+01:00");
    EXPECT_EQ(parsed("2026-07-01 12:00"), "2026-07-01T12:00:00.000000+02:00");
    EXPECT_EQ(parsed("2026-11-20T08:15:30Z"), "2026-11-20T09:15:30.000000+01:00");
    for (const char* lpText :
         {"", "yesterday", "10", "10:4", "25:00", "2026-11-31", "2026-11-20 08", "2026-11-20 08:15x"}) {
        EXPECT_EQ(parsed(lpText), "nothing") << lpText;
    }
}

TEST_F(TimeText, ATimeOfDayIsTheLatestThatHasBeen) {
    EXPECT_EQ(parsed("10:04"), "2026-11-21T10:04:00.000000+01:00");
    EXPECT_EQ(parsed("10:04:13"), "2026-11-20T10:04:13.000000+01:00");
    EXPECT_EQ(parsed("23:59"), "2026-11-20T23:59:00.000000+01:00");
}

TEST_F(TimeText, ShortTimesSayWhatTheDayLeavesOpen) {
    const ZTCHistoryTime lNow = timeOf("2026-11-21T10:04:12+01:00");
    EXPECT_EQ(formatShortTime(timeOf("2026-11-21T00:00:01+01:00"), lNow), "00:00:01");
    EXPECT_EQ(formatShortTime(timeOf("2026-11-20T23:59:59+01:00"), lNow), "20 Nov 23:59");
    EXPECT_EQ(formatShortTime(timeOf("2025-11-20T08:12:00+01:00"), lNow), "2025-11-20 08:12");
    EXPECT_EQ(formatShortTime(timeOf("2026-11-22T08:12:00+01:00"), lNow), "22 Nov 08:12");
}

TEST_F(TimeText, SpansHaveOneUnitAndAreNeverNegative) {
    using namespace std::chrono_literals;
    EXPECT_EQ(formatSpan(-5s), "0 s");
    EXPECT_EQ(formatSpan(59999ms), "59 s");
    EXPECT_EQ(formatSpan(60s), "1 min");
    EXPECT_EQ(formatSpan(3h + 59min), "3 h");
    EXPECT_EQ(formatSpan(24h), "1 day");
    EXPECT_EQ(formatSpan(100h), "4 days");
}
