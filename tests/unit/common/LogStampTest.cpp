#include "common/include/LogStamp.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>

#include "common/include/LogLine.h"

namespace {

std::string sStampOf(std::time_t aSecond, long aNanoSeconds) {
    std::string lText(ZTCLogLine::gcStampLength + 1, '#');
    storeLogStamp(lText.data(), ZTCDateTime(std::timespec{aSecond, aNanoSeconds}, "."));
    return lText;
}

class LogStamp : public testing::Test {
protected:
    LogStamp() {
        setenv("TZ", "UTC-2", 1);
        tzset();
    }
    ~LogStamp() override {
        unsetenv("TZ");
        tzset();
    }
};

}  // namespace

TEST_F(LogStamp, IsLocalTimeToTheMicrosecondAndNoByteMore) {
    EXPECT_EQ("2009-02-14 01:31:30.999999#", sStampOf(1234567890, 999999999));
    EXPECT_EQ("1970-01-01 02:00:00.000000#", sStampOf(0, 999));
    EXPECT_EQ("1970-01-01 02:00:00.000001#", sStampOf(0, 1000));
    EXPECT_EQ("9999-12-31 23:59:59.012345#", sStampOf(253402293599, 12345678));
}

TEST_F(LogStamp, FollowsATimeThatGoesBack) {
    EXPECT_EQ("2009-02-14 01:31:30.000000#", sStampOf(1234567890, 0));
    EXPECT_EQ("2009-02-14 01:31:29.000000#", sStampOf(1234567889, 0));
}
