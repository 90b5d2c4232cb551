#include <gmock/gmock.h>

#include "sensor/views/include/StatusView.h"
#include "tests/unit/views/ViewSamples.h"

using testing::ElementsAre;
using ZTCJson = nlohmann::ordered_json;

static std::vector<std::string> sKeys(const ZTCJson& acrDocument) {
    std::vector<std::string> lKeys;
    for (const auto& lrItem : acrDocument.items()) {
        lKeys.push_back(lrItem.key());
    }
    return lKeys;
}

class StatusJson : public LocalTime {};

TEST_F(StatusJson, DocumentsBeginWithSchemaHostAndStoreId) {
    const std::vector<std::string> lKeys = sKeys(makeStatusDocument(makeHealthyFacts()));
    ASSERT_GE(lKeys.size(), 3U);
    EXPECT_THAT(std::vector<std::string>(lKeys.begin(), lKeys.begin() + 3), ElementsAre("schema", "host", "storeId"));
    EXPECT_EQ(beginDocument("ports", "db07", "").dump(), R"({"schema":"tavik.ports/1","host":"db07","storeId":null})");
}

TEST_F(StatusJson, AHealthyHostHasEveryMember) {
    const ZTCJson lDocument = makeStatusDocument(makeHealthyFacts());
    EXPECT_EQ(lDocument["schema"], "tavik.status/1");
    EXPECT_EQ(lDocument["storeId"], "00112233445566778899aabbccddeeff");
    EXPECT_EQ(lDocument["time"], "2026-11-21T10:04:12.000000+01:00");
    EXPECT_EQ(lDocument["state"], "collecting");
    EXPECT_EQ(lDocument["exit"], 0);
    EXPECT_EQ(lDocument["agent"]["heldBytes"], 0);
    EXPECT_EQ(lDocument["collector"]["lastAsked"], "2026-11-21T10:04:10.000000+01:00");
    EXPECT_EQ(lDocument["collector"]["lastRetrieval"], nullptr);
    EXPECT_EQ(lDocument["adapters"][1]["wwpn"], "10:00:00:00:c9:00:00:02");
    EXPECT_EQ(lDocument["kinds"][0]["initiator"]["host"], "host7");
    EXPECT_EQ(lDocument["kinds"][0]["kinds"]["temperature"], "no_source");
    EXPECT_EQ(lDocument["kinds"][0]["kinds"].size(), 20U);
    EXPECT_EQ(lDocument["losses"]["dropped"], 0);
    EXPECT_EQ(lDocument["gaps"], ZTCJson::array());
    EXPECT_EQ(lDocument["troubles"], ZTCJson::array());
    EXPECT_EQ(lDocument["san"], ZTCJson::array());
}

TEST_F(StatusJson, WhatIsNotKnownIsNull) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mAnswer = ZTAN_Silent;
    lFacts.mAnswerProblem = "nothing came";
    lFacts.mLive.reset();
    lFacts.mHistory.reset();
    lFacts.mHistoryProblem = "no history";
    const ZTCJson lDocument = makeStatusDocument(lFacts);
    for (const char* lpKey :
         {"storeId", "keeper", "agent", "collector", "adapters", "kinds", "ledger", "gaps", "paths", "san"}) {
        EXPECT_TRUE(lDocument.contains(lpKey)) << lpKey;
        EXPECT_TRUE(lDocument[lpKey].is_null()) << lpKey;
    }
    EXPECT_EQ(lDocument["losses"]["refused"], nullptr);
    EXPECT_EQ(lDocument["losses"]["inGaps"], nullptr);
    EXPECT_EQ(lDocument["state"], "collector-silent");
    EXPECT_EQ(lDocument["troubles"][0]["status"], ZTCJson({"nothing came"}));
    EXPECT_EQ(lDocument["unknown"], ZTCJson({"no history"}));
}

TEST_F(StatusJson, DamagedHistoriesAreTheirPaths) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    EXPECT_EQ(makeStatusDocument(lFacts)["damagedHistories"], nullptr);
    lFacts.mDamagedHistories.emplace();
    EXPECT_EQ(makeStatusDocument(lFacts)["damagedHistories"], ZTCJson::array());
    lFacts.mDamagedHistories->push_back("/var/lib/tavik/history.damaged-20261120-070000.db");
    const ZTCJson lDocument = makeStatusDocument(lFacts);
    EXPECT_EQ(lDocument["damagedHistories"], ZTCJson({"/var/lib/tavik/history.damaged-20261120-070000.db"}));
    EXPECT_EQ(lDocument["unknown"], ZTCJson({describeDamagedHistories(lFacts)}));
    EXPECT_EQ(lDocument["exit"], 0);
}

TEST_F(StatusJson, TheLedgerJoinsWhatIsStoredWithTheRunningAgentsCounts) {
    nlohmann::json lLive = makeHealthyJson();
    lLive["ledger"] = {{{"initiator", {{"wwpn", "10:00:00:00:c9:00:00:01"}}},
                        {"kind", "rscn"},
                        {"received", 12},
                        {"refused", {{"total-limit", 2}}},
                        {"consolidated", 10},
                        {"handedOver", 9},
                        {"held", 1},
                        {"dropped", 0}}};
    ZTSStatusFacts lFacts = makeFacts(lLive);
    ZTSLedgerRow lRow;
    lRow.mInitiator = {wwnOf("10:00:00:00:c9:00:00:01"), std::nullopt, "host7"};
    lRow.mKind = *findKind("rscn");
    lRow.mReceived = 8;
    lRow.mHandedOver = 8;
    lRow.mStored = 7;
    lRow.mRetired = 2;
    lFacts.mHistory->mLedger = {lRow};
    lRow.mKind = *findKind("link");
    lFacts.mHistory->mLedger.push_back(lRow);
    const ZTCJson lLedger = makeStatusDocument(lFacts)["ledger"];
    ASSERT_EQ(lLedger.size(), 2U);
    EXPECT_THAT(sKeys(lLedger[0]), ElementsAre("initiator", "kind", "received", "refused", "consolidated", "handedOver",
                                               "stored", "retired", "lost", "held", "dropped"));
    EXPECT_EQ(lLedger[0]["received"], 12);
    EXPECT_EQ(lLedger[0]["refused"]["total-limit"], 2);
    EXPECT_EQ(lLedger[0]["refused"]["failed"], 0);
    EXPECT_EQ(lLedger[0]["stored"], 7);
    EXPECT_EQ(lLedger[0]["retired"], 2);
    EXPECT_EQ(lLedger[0]["held"], 1);
    EXPECT_EQ(lLedger[1]["kind"], "link");
    EXPECT_EQ(lLedger[1]["received"], 8);
}

TEST_F(StatusJson, TheLedgerHasARowForAKindThatTheHistoryHasNotSeenYet) {
    nlohmann::json lLive = makeHealthyJson();
    const auto lRow = [](const char* apKind, unsigned aReceived) {
        return nlohmann::json{{"initiator", {{"wwpn", "10:00:00:00:c9:00:00:01"}}},
                              {"kind", apKind},
                              {"received", aReceived},
                              {"refused", {{"total-limit", 2}}},
                              {"consolidated", 10},
                              {"handedOver", 9},
                              {"held", 1},
                              {"dropped", 0}};
    };
    lLive["ledger"] = {lRow("rscn", 12), lRow("other", 5)};
    const ZTCJson lLedger = makeStatusDocument(makeFacts(lLive))["ledger"];
    ASSERT_EQ(lLedger.size(), 2U);
    EXPECT_EQ(lLedger[0]["kind"], "rscn");
    EXPECT_EQ(lLedger[0]["initiator"]["wwpn"], "10:00:00:00:c9:00:00:01");
    EXPECT_EQ(lLedger[0]["received"], 12);
    EXPECT_EQ(lLedger[0]["refused"]["total-limit"], 2);
    EXPECT_EQ(lLedger[0]["held"], 1);
    EXPECT_EQ(lLedger[0]["stored"], 0);
    EXPECT_EQ(lLedger[1]["kind"], "other");
}

TEST_F(StatusJson, AGapOfUnknownSizeHasNoCount) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    ZTSGap lGap;
    lGap.mSeq = 9;
    lGap.mFrom = timeOf("2026-11-21T09:00:00+01:00");
    lGap.mTo = timeOf("2026-11-21T09:00:03+01:00");
    lGap.mReason = "the agent was killed";
    lFacts.mHistory->mGaps = {lGap};
    const ZTCJson lDocument = makeStatusDocument(lFacts);
    EXPECT_EQ(lDocument["state"], "gap");
    EXPECT_EQ(lDocument["exit"], 1);
    EXPECT_EQ(lDocument["gaps"][0]["from"], "2026-11-21T09:00:00.000000+01:00");
    EXPECT_EQ(lDocument["gaps"][0]["count"], nullptr);
    EXPECT_EQ(lDocument["gaps"][0]["countKnown"], false);
    EXPECT_EQ(lDocument["losses"]["inGapsIsKnown"], false);
}
