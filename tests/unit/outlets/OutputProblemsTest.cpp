#include "sensor/outlets/include/OutputProblems.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

class OutputProblems : public testing::Test {
protected:
    nlohmann::json described() const { return nlohmann::json::parse(mProblems.describe()); }

    std::vector<std::string> mLines;
    ZTCOutputProblems mProblems{[this](const std::string& acrLine) { mLines.push_back(acrLine); }};
};

TEST_F(OutputProblems, EachIsReportedOnceWhenItIsNewAndOnceWhenItIsOver) {
    mProblems.note("the web server", "");
    EXPECT_EQ(mLines, std::vector<std::string>{}) << "it has always worked";
    mProblems.note("the web server", "the port is taken");
    mProblems.note("the web server", "the port is taken");
    mProblems.note("the web server", "no such address");
    mProblems.note("the web server", "");
    mProblems.note("the web server", "");
    EXPECT_EQ(mLines, (std::vector<std::string>{"the port is taken; trying on", "no such address; trying on",
                                                "the web server works again"}));
}

TEST_F(OutputProblems, AreOpenWarningsWithTheTimeOfTheFirstAndTheTextOfTheLast) {
    EXPECT_EQ(described(), nlohmann::json::array());
    mProblems.note("the web server", "the port is taken");
    const nlohmann::json lSince = described()[0]["since"];
    mProblems.note("the web server", "no such address");
    mProblems.note("the journal", "it is full");
    const nlohmann::json lDescribed = described();
    ASSERT_EQ(lDescribed.size(), 2u);
    EXPECT_EQ(lDescribed[0]["text"], "the journal does not work: it is full");
    EXPECT_EQ(lDescribed[1]["text"], "the web server does not work: no such address");
    EXPECT_EQ(lDescribed[1]["since"], lSince);
    for (const nlohmann::json& lrWarning : lDescribed) {
        EXPECT_EQ(lrWarning["kind"], "output");
        EXPECT_TRUE(lrWarning["given"].is_null());
        EXPECT_TRUE(lrWarning["next"].is_null());
    }
    EXPECT_TRUE(mProblems.has("the journal"));
    mProblems.note("the journal", "");
    EXPECT_FALSE(mProblems.has("the journal"));
    EXPECT_EQ(described().size(), 1u);
}

TEST_F(OutputProblems, OneOfAnOutputThatIsSwitchedOffIsForgottenWithoutAWord) {
    mProblems.note("the web server", "the port is taken");
    mProblems.forget("the web server");
    mProblems.forget("the journal");
    EXPECT_FALSE(mProblems.has("the web server"));
    EXPECT_EQ(described(), nlohmann::json::array());
    EXPECT_EQ(mLines.size(), 1u);
    mProblems.note("the web server", "the port is taken");
    EXPECT_EQ(mLines.size(), 2u) << "it is new again";
}
