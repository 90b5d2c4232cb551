#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "common/include/DateTime.h"
#include "common/include/Log.h"
#include "tests/support/AgentLog.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/interposed/support/Replaced.h"

namespace {

/// A clock that somebody sets forth and back, in a zone without changes.
class Clock : public testing::Test {
protected:
    Clock() {
        setenv("TZ", "UTC", 1);
        tzset();
    }
    ~Clock() override {
        unsetenv("TZ");
        tzset();
    }

    const std::vector<std::timespec> mTimes = {
        {1234567890, 500000000}, {1234567890, 600000000}, {1234567891, 0}, {1234567889, 0}, {1234564290, 7000},
    };
};

}  // namespace

TEST_F(Clock, TheStampsOfTheLogFollowItForthAndBack) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("log");
    setLogFilePath(lPath.c_str());
    for (const std::timespec& lcrTime : mTimes) {
        const ZTCReplacement lClock(gReplaced.mRealTime, [&] { return lcrTime; });
        ZT_LOG_NOTICE("%s", "a line");
    }
    setLogFilePath("/dev/null");
    std::vector<std::string> lStamps;
    for (const ZTSLogLine& lcrLine : ZTCAgentLog(lPath).lines()) {
        lStamps.push_back(lcrLine.mTimeStamp);
    }
    EXPECT_EQ((std::vector<std::string>{"2009-02-13 23:31:30.500000", "2009-02-13 23:31:30.600000",
                                        "2009-02-13 23:31:31.000000", "2009-02-13 23:31:29.000000",
                                        "2009-02-13 22:31:30.000007"}),
              lStamps);
}

TEST_F(Clock, TheTimesOfRecordsFollowItForthAndBack) {
    for (const std::timespec& lcrTime : mTimes) {
        const ZTCReplacement lClock(gReplaced.mRealTime, [&] { return lcrTime; });
        const ZTCDateTime lTime(".");
        std::tm lExpected{};
        gmtime_r(&lcrTime.tv_sec, &lExpected);
        EXPECT_EQ(static_cast<std::uint64_t>(lcrTime.tv_sec), lTime.getSecondsSinceEpoch());
        EXPECT_EQ(lExpected.tm_hour, lTime.getHour());
        EXPECT_EQ(lExpected.tm_sec, lTime.getSecond());
        EXPECT_EQ(lcrTime.tv_nsec / 1000, lTime.getMilliSeconds() * 1000 + lTime.getMicroSeconds());
    }
}
