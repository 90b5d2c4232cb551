#include "sensor/settings/include/Quantities.h"

#include <gtest/gtest.h>

#include "sensor/client/include/ClientErrors.h"

using std::chrono::milliseconds;

TEST(Durations, AreReadInEachUnitAndWithFractions) {
    struct {
        const char* mpText;
        long long mMilliseconds;
    } constexpr lCases[] = {{"0", 0},        {"5", 5000},       {"0.1", 100},      {"90s", 90000},
                            {"10m", 600000}, {"24h", 86400000}, {"1.5h", 5400000}, {"30d", 2592000000},
                            {"0.001s", 1},   {".5s", 500},      {"007s", 7000},    {"36500d", 3153600000000}};
    for (const auto& lcrCase : lCases) {
        EXPECT_EQ(durationFromText(lcrCase.mpText), milliseconds(lcrCase.mMilliseconds)) << lcrCase.mpText;
    }
}

TEST(Durations, OtherTextsAreRefusedByName) {
    for (const char* lpText :
         {"", "s", "-1s", "1 s", "1S", "1w", "1ms", "1e3", "nan", "inf", "infd", "-1d", "0x10", "5s "}) {
        try {
            durationFromText(lpText);
            ADD_FAILURE() << lpText;
        } catch (const ZTCBadInputEx& lcrEx) {
            EXPECT_EQ(std::string(lcrEx.what()).rfind("\"" + std::string(lpText) + "\" is not a duration", 0), 0U);
        }
    }
}

TEST(Durations, ATooLongOneIsSaidToBeTooLongWithTheLimit) {
    for (const std::string& lrText :
         {std::string("36501d"), std::string("36500.01d"), std::string("3153600001"), std::string("0876001h"),
          std::string("99999999999999999999m"), std::string(400, '9') + "s", "0" + std::string(400, '9')}) {
        try {
            durationFromText(lrText);
            ADD_FAILURE() << lrText;
        } catch (const ZTCTooLargeEx& lcrEx) {
            EXPECT_EQ(lcrEx.what(), "\"" + lrText + "\" is too long: a duration is at most 36500d");
        }
    }
    EXPECT_EQ(durationFromText("0." + std::string(400, '0') + "1s"), milliseconds(0));
    EXPECT_THROW(durationFromText("-" + std::string(400, '9')), ZTCBadInputEx);
}

TEST(Durations, AreWrittenSoThatTheyCanBeReadAgain) {
    EXPECT_EQ(durationText(milliseconds(0)), "0s");
    EXPECT_EQ(durationText(milliseconds(250)), "0.25s");
    EXPECT_EQ(durationText(milliseconds(90000)), "90s");
    EXPECT_EQ(durationText(milliseconds(7200000)), "2h");
    EXPECT_EQ(durationText(milliseconds(2592000000)), "30d");
    for (const long long lMilliseconds : {1LL, 99LL, 1001LL, 61000LL, 86400001LL}) {
        EXPECT_EQ(durationFromText(durationText(milliseconds(lMilliseconds))), milliseconds(lMilliseconds));
    }
}

TEST(Sizes, AreReadInEachUnit) {
    EXPECT_EQ(sizeFromText("0"), 0U);
    EXPECT_EQ(sizeFromText("4096"), 4096U);
    EXPECT_EQ(sizeFromText("12B"), 12U);
    EXPECT_EQ(sizeFromText("3KiB"), 3072U);
    EXPECT_EQ(sizeFromText("64MiB"), 67108864U);
    EXPECT_EQ(sizeFromText("2GiB"), 2147483648U);
    EXPECT_EQ(sizeFromText("1024TiB"), 1ULL << 50);
}

TEST(Sizes, OtherTextsAreRefusedByName) {
    for (const char* lpText : {"", "MiB", "-1", "1.5MiB", "64MB", "64 MiB", "64mib", "99999999999999999999XiB"}) {
        try {
            sizeFromText(lpText);
            ADD_FAILURE() << lpText;
        } catch (const ZTCBadInputEx& lcrEx) {
            EXPECT_EQ(std::string(lcrEx.what()).rfind("\"" + std::string(lpText) + "\" is not a size", 0), 0U);
        }
    }
}

TEST(Sizes, ATooLargeOneIsSaidToBeTooLargeWithTheLimit) {
    for (const char* lpText :
         {"1025TiB", "1125899906842625", "18446744073709551615KiB", "99999999999999999999", "99999999999999999999B"}) {
        try {
            sizeFromText(lpText);
            ADD_FAILURE() << lpText;
        } catch (const ZTCTooLargeEx& lcrEx) {
            EXPECT_EQ(lcrEx.what(), "\"" + std::string(lpText) + "\" is too large: a size is at most 1024TiB");
        }
    }
}

TEST(Sizes, AreWrittenSoThatTheyCanBeReadAgain) {
    EXPECT_EQ(sizeText(0), "0B");
    EXPECT_EQ(sizeText(1000), "1000B");
    EXPECT_EQ(sizeText(67108864), "64MiB");
    for (const std::uint64_t lSize : {1ULL, 1023ULL, 1024ULL, 1ULL << 40, (1ULL << 40) + 1}) {
        EXPECT_EQ(sizeFromText(sizeText(lSize)), lSize);
    }
}
