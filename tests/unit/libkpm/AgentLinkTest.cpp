#include "libkpm/common/include/AgentLink.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

static std::vector<std::string> sTold;

static void sLog(std::uint32_t aLevel, const char* apText) {
    sTold.push_back(std::to_string(aLevel) + " " + apText);
}

static int sContext = 0;

static void sState(void* apContext, std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory,
                   std::uint32_t aState, const char* apReason) {
    EXPECT_EQ(apContext, &sContext);
    sTold.push_back("board=" + std::to_string(aBoard) + " kind=" + std::to_string(aCategory) + "/" +
                    std::to_string(aSubcategory) + " state=" + std::to_string(aState) + " " + apReason);
}

static void sLoss(void* apContext, const char* apName, std::uint64_t aTotal) {
    EXPECT_EQ(apContext, &sContext);
    sTold.push_back(apName + ("=" + std::to_string(aTotal)));
}

class AgentLink : public testing::Test {
protected:
    AgentLink() { sTold.clear(); }
    ~AgentLink() override {
        setLibraryLog(nullptr);
        setLibraryReport(nullptr, nullptr, nullptr);
    }
};

TEST_F(AgentLink, LinesGoToTheAgentsLogWithTheirLevel) {
    setLibraryLog(&sLog);
    logLibraryLine(KPM_LOG_NOTICE, "a line");
    EXPECT_EQ(sTold, std::vector<std::string>{"3 a line"});
}

TEST_F(AgentLink, AStateIsReportedWithItsBoardKindAndReason) {
    setLibraryReport(&sContext, &sState, &sLoss);
    reportLibraryState(3, 4, 0x40, KPM_STATE_NO_RIGHTS, "no right");
    EXPECT_EQ(sTold, std::vector<std::string>{"board=3 kind=4/64 state=3 no right"});
}

TEST_F(AgentLink, ALossIsReportedWithItsNameAndTotal) {
    setLibraryReport(&sContext, &sState, &sLoss);
    reportLibraryLoss("overruns", std::uint64_t{1} << 40);
    EXPECT_EQ(sTold, std::vector<std::string>{"overruns=1099511627776"});
}

TEST_F(AgentLink, WithoutTheAgentsFunctionsNothingIsTold) {
    setLibraryLog(&sLog);
    setLibraryReport(&sContext, &sState, &sLoss);
    setLibraryLog(nullptr);
    setLibraryReport(nullptr, nullptr, nullptr);
    logLibraryLine(KPM_LOG_ERROR, "a line");
    reportLibraryState(0, 4, 1, KPM_STATE_WORKING, "");
    reportLibraryLoss("overruns", 1);
    EXPECT_TRUE(sTold.empty());
}
