#include "sensor/client/include/SensorClient.h"

#include <gtest/gtest.h>

#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/client/WireSamples.h"

static const ZTCWireBytes scSuccess{0, 0, 0, 0, 0};
static const ZTCWireBytes scInvalid{1, 0, 6};

TEST(SensorClient, AsksEachCommandAndDecodesItsAnswer) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {[](ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                                  arAgent.sendFrame(acrRequest[0] == 1 ? makeFullSampleResponse() : scSuccess);
                              }});
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    const std::vector<ZTSTargetPort> lTargets(1);
    EXPECT_EQ(lClient.startScope(900).getResponse().mOutcome, ZTRO_Success);
    EXPECT_EQ(lClient.registerTargets(lTargets).getResponse().mOutcome, ZTRO_Success);
    EXPECT_EQ(lClient.setCollectionPeriod(60).getResponse().mOutcome, ZTRO_Success);
    EXPECT_EQ(lClient.stop().getResponse().mOutcome, ZTRO_Success);
    const ZTSAnswer lData = lClient.getScopeData();
    EXPECT_EQ(lData.mBody, makeFullSampleResponse());
    EXPECT_EQ(lData.getResponse().countRecords(), 20U);
    EXPECT_EQ(lClient.shutDown().getResponse().mOutcome, ZTRO_Success);
    EXPECT_EQ(lAgent.getRequests(), (std::vector<ZTCWireBytes>{encodeStartScope(900), encodeRegisterTargets(lTargets),
                                                               encodeCollectionPeriod(60), encodeStop(),
                                                               encodeGetScopeData(), encodeShutDown()}));
}

TEST(SensorClient, ARefusalIsAnAnswer) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering(scInvalid)});
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    const ZTSAnswer lAnswer = lClient.setCollectionPeriod(0);
    EXPECT_EQ(lAnswer.getResponse().mOutcome, ZTRO_Failed);
    EXPECT_EQ(lAnswer.getResponse().mStatus, ZTSAPS_Invalid);
}

TEST(SensorClient, BytesThatAreNoAnswerComeBackWithTheProblem) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering({77})});
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    const ZTSAnswer lAnswer = lClient.getScopeData();
    EXPECT_EQ(lAnswer.mBody, (ZTCWireBytes{77}));
    EXPECT_TRUE(lAnswer.mDecoded.mProblem);
}

TEST(SensorClient, ALateAnswerIsSetAsideAndTheOwnOneAwaited) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
                                  arAgent.sendFrame(makeFullSampleResponse());
                                  arAgent.sendFrame(scSuccess);
                              }});
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    EXPECT_EQ(lClient.stop().mBody, scSuccess);
    const std::vector<ZTSAnswer> lLate = lClient.takeLateAnswers();
    ASSERT_EQ(lLate.size(), 1U);
    EXPECT_EQ(lLate[0].getResponse().countRecords(), 20U);
    EXPECT_TRUE(lClient.takeLateAnswers().empty());
}

TEST(SensorClient, WhatWasSetAsideOutlivesAFailure) {
    const ZTCTemporaryDirectory lDirectory;
    const ZTCFakeAgent lAgent(lDirectory.path(), {[](ZTCFakeAgent& arAgent, const ZTCWireBytes&) {
                                  arAgent.sendFrame(scSuccess);
                                  arAgent.die();
                              }});
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    EXPECT_THROW(lClient.getScopeData(), ZTCNoAnswerEx);
    ASSERT_EQ(lClient.takeLateAnswers().size(), 1U);
}

TEST(SensorClient, TalksAgainAfterAnAgentsRestart) {
    const ZTCTemporaryDirectory lDirectory;
    ZTCSensorClient lClient(lDirectory.path(), gcTestPatience);
    {
        const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::dying({})});
        EXPECT_THROW(lClient.stop(), ZTCNoAnswerEx);
    }
    const ZTCFakeAgent lAgent(lDirectory.path(), {ZTCFakeAgent::answering(scSuccess)});
    EXPECT_EQ(lClient.stop().mBody, scSuccess);
}
