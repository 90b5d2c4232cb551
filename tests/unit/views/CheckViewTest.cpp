#include "sensor/views/include/CheckView.h"

#include <gmock/gmock.h>

#include "tests/unit/views/ViewSamples.h"

using testing::HasSubstr;

class CheckView : public LocalTime {
protected:
    static ZTECheckResult resultOf(const nlohmann::json& acrLive) { return makeCheck(makeFacts(acrLive), 0).mResult; }
};

TEST_F(CheckView, AHealthyHostIsOkWithItsFigures) {
    EXPECT_EQ(formatCheck(makeCheck(makeHealthyFacts(), 12)),
              "TAVIK OK - COLLECTING; nothing lost | events=12 open=0 lost=0 held=0B;;;0;262144\n");
}

TEST_F(CheckView, NotCollectingIsCriticalButAHostWithoutAdaptersIsFine) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["agent"]["running"] = false;
    EXPECT_EQ(resultOf(lLive), ZTCR_Critical);
    lLive["keeper"]["state"] = "waiting-for-adapters";
    const ZTSCheck lCheck = makeCheck(makeFacts(lLive), 0);
    EXPECT_EQ(lCheck.mResult, ZTCR_Ok);
    EXPECT_THAT(lCheck.mText, HasSubstr("no Fibre Channel adapter was found"));
}

TEST_F(CheckView, DeafnessAndLossesAreWarnings) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["losses"]["refused"]["total-limit"] = 3;
    EXPECT_EQ(resultOf(lLive), ZTCR_Warning);
    EXPECT_EQ(makeCheck(makeFacts(lLive), 0).mLost, 3U);
    lLive["kinds"][0]["kinds"]["rscn"] = "no_rights";
    EXPECT_EQ(resultOf(lLive), ZTCR_Warning);
}

TEST_F(CheckView, WhatCannotBeDeterminedIsUnknownAndHasNoFigures) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mLive.reset();
    lFacts.mHistory.reset();
    lFacts.mAnswer = ZTAN_Silent;
    const ZTSCheck lCheck = makeCheck(lFacts, std::nullopt);
    EXPECT_EQ(formatCheck(lCheck), "TAVIK UNKNOWN - NOT KNOWN; the collector does not answer\n");
    EXPECT_EQ(makeCheckDocument(lCheck, lFacts)["lost"], nullptr);
}

TEST_F(CheckView, TheSansTroublesCountWhereTheSensorJudgesThem) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["troubles"] = {{{"id", "path-lost"}, {"title", "PATH LOST"}, {"subject", "a|b"}}};
    EXPECT_EQ(resultOf(lLive), ZTCR_Warning);
    EXPECT_THAT(formatCheck(makeCheck(makeFacts(lLive), 0)), HasSubstr("nothing lost; PATH LOST a/b |"));
    lLive["troubles"].push_back({{"id", "lun-without-path"}, {"title", "NO PATH"}});
    EXPECT_EQ(resultOf(lLive), ZTCR_Critical);
}
