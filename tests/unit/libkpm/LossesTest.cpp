#include "libkpm/common/include/Losses.h"

#include <gtest/gtest.h>

#include <array>
#include <new>
#include <string>
#include <vector>

#include "libkpm/common/include/AgentLink.h"
#include "tests/support/FailingAllocation.h"

static std::vector<std::string> sLines;
static std::vector<std::string> sReports;

static void sLog(std::uint32_t aLevel, const char* apText) {
    EXPECT_EQ(aLevel, KPM_LOG_WARNING);
    sLines.emplace_back(apText);
}

static void sLoss(void*, const char* apName, std::uint64_t aTotal) {
    sReports.push_back(apName + ("=" + std::to_string(aTotal)));
}

enum { LOSS_Overrun, LOSS_Foreign };
static constexpr std::array<ZTSLossKind, 2> scKinds{
    {{"overruns", "events are lost: a buffer overran"}, {"foreign", "messages are dropped: another sender"}}};

class Losses : public testing::Test {
protected:
    Losses() {
        sLines.clear();
        sReports.clear();
        setLibraryLog(&sLog);
        setLibraryReport(nullptr, nullptr, &sLoss);
    }
    ~Losses() override {
        setLibraryLog(nullptr);
        setLibraryReport(nullptr, nullptr, nullptr);
    }

    ZTCLosses mLosses{scKinds};
    ZTCLosses::Clock::time_point mNow{};
};

TEST_F(Losses, NothingLostIsNothingSaid) {
    mLosses.count(LOSS_Overrun, 0);
    mLosses.tell(mNow);
    mLosses.tellAll();
    EXPECT_TRUE(sLines.empty());
    EXPECT_TRUE(sReports.empty());
}

TEST_F(Losses, EachKindIsSaidAtMostOnceASecondWithItsTotal) {
    mLosses.count(LOSS_Overrun, 5);
    mLosses.tell(mNow);
    mLosses.count(LOSS_Overrun, 2);
    mLosses.tell(mNow + std::chrono::milliseconds(999));
    EXPECT_EQ(sLines, std::vector<std::string>{"5 events are lost: a buffer overran (5 since the start)"});
    mLosses.tell(mNow + std::chrono::milliseconds(1000));
    EXPECT_EQ(sLines.back(), "2 events are lost: a buffer overran (7 since the start)");
    mLosses.tell(mNow + std::chrono::milliseconds(5000));
    EXPECT_EQ(sLines.size(), 2u);
    EXPECT_EQ(sReports, (std::vector<std::string>{"overruns=5", "overruns=7"}));
    EXPECT_EQ(mLosses.getTotal(LOSS_Overrun), 7u);
}

TEST_F(Losses, AKindThatLacksTheMemoryToBeReportedIsReportedLater) {
    mLosses.count(LOSS_Overrun, 5);
    bool lHasThrown = false;
    EXPECT_TRUE(failAllocation(1, [&] {
        try {
            mLosses.tell(mNow);
        } catch (const std::bad_alloc&) {
            lHasThrown = true;
        }
    }));
    EXPECT_TRUE(lHasThrown);
    mLosses.tell(mNow);
    EXPECT_EQ(sLines, std::vector<std::string>{"5 events are lost: a buffer overran (5 since the start)"});
    EXPECT_EQ(sReports, std::vector<std::string>{"overruns=5"});
}

TEST_F(Losses, OneKindDoesNotSilenceAnother) {
    mLosses.count(LOSS_Overrun);
    mLosses.tell(mNow);
    mLosses.count(LOSS_Foreign);
    mLosses.tell(mNow);
    EXPECT_EQ(sLines.size(), 2u);
    EXPECT_EQ(sReports, (std::vector<std::string>{"overruns=1", "foreign=1"}));
}

TEST_F(Losses, WhatIsLeftIsSaidAtTheEnd) {
    mLosses.count(LOSS_Foreign);
    mLosses.tell(mNow);
    mLosses.count(LOSS_Foreign, 41);
    mLosses.tell(mNow);
    mLosses.tellAll();
    ASSERT_EQ(sLines.size(), 2u);
    EXPECT_EQ(sLines[1], "41 messages are dropped: another sender (42 since the start)");
    mLosses.tellAll();
    EXPECT_EQ(sLines.size(), 2u);
}
