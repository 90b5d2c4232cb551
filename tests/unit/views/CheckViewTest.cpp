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

TEST_F(CheckView, AdaptersWhoseDriverReportsNoEventsAreCritical) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["keeper"]["state"] = "waiting-for-adapters";
    lLive["agent"]["running"] = false;
    lLive["agent"]["endReason"] = "no-event-support";
    EXPECT_EQ(resultOf(lLive), ZTCR_Critical);
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

TEST_F(CheckView, ReducedRedundancyIsAWarningAndALunWithoutAPathIsCritical) {
    ZTSTopology lSan = makeSan({});
    losePort(lSan, "rport-8:0-1");
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mNames.addName(wwnOf("50:06:01:60:00:00:01:01"), "array7 | ctrl-B");
    setSan(lFacts, lSan);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Warning);
    EXPECT_THAT(formatCheck(makeCheck(lFacts, 0)),
                HasSubstr("nothing lost; PATH LOST array7 / ctrl-B  50:06:01:60:00:00:01:01  from host8 |"));
    lSan.mPaths.erase(lSan.mPaths.begin() + 1, lSan.mPaths.end());
    lSan.mPaths.at(0).mState = "offline";
    setSan(lFacts, lSan);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Critical);
    EXPECT_THAT(makeCheck(lFacts, 0).mText, HasSubstr("; NO PATH mpath0"));
}

TEST_F(CheckView, ASingleInitiatorByDesignIsOk) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, makeSan({.mHosts = 1, .mPortsOfAHost = 1}));
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
    EXPECT_EQ(makeCheck(lFacts, 0).mText, "COLLECTING; nothing lost");
}

TEST_F(CheckView, APortThatContributesNoPathIsOnlyNamed) {
    ZTSTopology lSan = makeSan({});
    lSan.mRemotePorts.push_back(lSan.mRemotePorts[0]);
    lSan.mRemotePorts.back().mName = "rport-7:0-9";
    lSan.mRemotePorts.back().mWwpn = wwnOf("50:06:01:60:00:00:00:99");
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, lSan);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
    EXPECT_EQ(makeCheck(lFacts, 0).mText, "COLLECTING; nothing lost; 1 notice: tavik paths");
}

TEST_F(CheckView, APortThatFlapsIsAWarningAlsoWhileItIsThere) {
    ZTSSanPast lPast;
    lPast.mStates["rport-7:0-0"].mChanges = gcFlappingChanges;
    ZTSStatusFacts lFacts = makeHealthyFacts();
    setSan(lFacts, makeSan({}), lPast);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Warning);
    lPast.mStates["rport-7:0-0"].mChanges = gcFlappingChanges - 1;
    setSan(lFacts, makeSan({}), lPast);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
}

TEST_F(CheckView, AQuietHostAndOneWithoutATopologyAreOk) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["collector"]["lastEvent"] = nullptr;
    ZTSStatusFacts lFacts = makeFacts(lLive);
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
    lFacts.mHistory->mSan.reset();
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
    setSan(lFacts, {});
    EXPECT_EQ(makeCheck(lFacts, 0).mResult, ZTCR_Ok);
}

TEST_F(CheckView, AnOpenWarningOfARuleIsAWarning) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["warnings"] = nlohmann::json::array();
    EXPECT_EQ(resultOf(lLive), ZTCR_Ok);
    lLive["warnings"].push_back({{"kind", "queue-full"}, {"text", "queue-full of array7: 120 within 300.0 s"}});
    lLive["warnings"].push_back({{"kind", "rscn"}, {"text", "rscn: 10 within 60.0 s"}});
    const ZTSCheck lCheck = makeCheck(makeFacts(lLive), 0);
    EXPECT_EQ(lCheck.mResult, ZTCR_Warning);
    EXPECT_EQ(lCheck.mText,
              "COLLECTING; nothing lost; open warning: queue-full of array7: 120 within 300.0 s and 1 more");
    lLive["agent"]["running"] = false;
    EXPECT_EQ(resultOf(lLive), ZTCR_Critical);
}
