#include "sensor/views/include/StateTable.h"

#include <gmock/gmock.h>

#include <functional>
#include <set>

#include "sensor/views/include/Judgement.h"
#include "tests/unit/views/ViewSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;

static std::vector<std::string> sIds(const ZTSStatusFacts& acrFacts) {
    std::vector<std::string> lIds;
    for (const ZTSStateRow* lpRow : judge(acrFacts).mStates) {
        lIds.emplace_back(lpRow->mpId);
    }
    return lIds;
}

static ZTSStatusFacts sFactsOf(const std::function<void(nlohmann::json&)>& acrChange) {
    nlohmann::json lLive = makeHealthyJson();
    acrChange(lLive);
    return makeFacts(lLive);
}

static ZTSStatusFacts sUnanswered(ZTEAnswer aAnswer) {
    ZTSStatusFacts lFacts = makeHealthyFacts();
    lFacts.mLive.reset();
    lFacts.mAnswer = aAnswer;
    lFacts.mAnswerProblem = "why";
    lFacts.mHistory->mLastRun->mIsOpen = false;
    return lFacts;
}

static ZTSGap sGap(std::uint64_t aHeld, bool aIsKnown) {
    ZTSGap lGap;
    lGap.mFrom = timeOf("2026-11-21T09:00:00+01:00");
    lGap.mTo = timeOf("2026-11-21T09:00:03+01:00");
    lGap.mReason = "the agent was killed";
    lGap.mIsCountKnown = aIsKnown;
    lGap.mCounts = {{.mInitiator = {}, .mKind = *findKind("rscn"), .mHeld = aHeld, .mHandedOver = 0}};
    return lGap;
}

/// For each row facts that make it the worst state.
static std::vector<std::pair<std::string, ZTSStatusFacts>> sFactsOfEachState() {
    using ZTCJson = nlohmann::json;
    std::vector<std::pair<std::string, ZTSStatusFacts>> lCases;
    ZTSStatusFacts lNewer = sUnanswered(ZTAN_NoSensor);
    lNewer.mHistory.reset();
    lNewer.mHistoryProblem = "its schema has version 99";
    lNewer.mIsHistoryNewer = true;
    lNewer.mLeftPage = ZTSLeftPage();
    lCases.emplace_back("newer-history", lNewer);
    ZTSStatusFacts lVanished = sUnanswered(ZTAN_NoSensor);
    lVanished.mHistory->mLastRun->mIsOpen = true;
    lCases.emplace_back("sensor-vanished", lVanished);
    lCases.emplace_back("no-sensor", sUnanswered(ZTAN_NoSensor));
    lCases.emplace_back("not-permitted", sUnanswered(ZTAN_NotPermitted));
    lCases.emplace_back("collector-silent", sUnanswered(ZTAN_Silent));
    lCases.emplace_back("collector-refuses", sUnanswered(ZTAN_Refused));
    lCases.emplace_back("stopping", sFactsOf([](ZTCJson& arLive) { arLive["keeper"]["state"] = "stopping"; }));
    lCases.emplace_back("no-library", sFactsOf([](ZTCJson& arLive) {
                            arLive["keeper"]["state"] = "waiting-for-adapters";
                            arLive["agent"]["running"] = false;
                            arLive["agent"]["endReason"] = "no-library";
                        }));
    lCases.emplace_back("no-event-support", sFactsOf([](ZTCJson& arLive) {
                            arLive["keeper"]["state"] = "waiting-for-adapters";
                            arLive["agent"]["running"] = false;
                            arLive["agent"]["endReason"] = "no-event-support";
                        }));
    lCases.emplace_back("no-adapters",
                        sFactsOf([](ZTCJson& arLive) { arLive["keeper"]["state"] = "waiting-for-adapters"; }));
    lCases.emplace_back("agent-down", sFactsOf([](ZTCJson& arLive) { arLive["agent"]["running"] = false; }));
    lCases.emplace_back("starting", sFactsOf([](ZTCJson& arLive) { arLive["keeper"]["state"] = "starting"; }));
    lCases.emplace_back("disk-full", sFactsOf([](ZTCJson& arLive) { arLive["collector"]["disk"] = "full"; }));
    lCases.emplace_back("deaf", sFactsOf([](ZTCJson& arLive) { arLive["kinds"][1]["kinds"]["link"] = "no_rights"; }));
    ZTSStatusFacts lGap = makeHealthyFacts();
    lGap.mHistory->mGaps = {sGap(7, true)};
    lCases.emplace_back("gap", lGap);
    lCases.emplace_back("refused", sFactsOf([](ZTCJson& arLive) { arLive["losses"]["dropped"] = 2; }));
    lCases.emplace_back("collecting", makeHealthyFacts());
    return lCases;
}

TEST_F(LocalTime, EveryStateIsReachedInTheTablesOrderAndHasItsWords) {
    const auto lCases = sFactsOfEachState();
    ASSERT_EQ(lCases.size(), getStateTable().size());
    for (std::size_t i = 0; i < lCases.size(); ++i) {
        const ZTSStateRow& lrRow = getStateTable()[i];
        SCOPED_TRACE(lrRow.mpId);
        EXPECT_EQ(lCases[i].first, lrRow.mpId);
        const ZTSJudgement lJudgement = judge(lCases[i].second);
        EXPECT_STREQ(lJudgement.getWorst().mpId, lrRow.mpId);
        EXPECT_EQ(lJudgement.getExit(), getVerdictExit(lrRow.mVerdict));
        const std::string lHeadline = formatHeadline(lCases[i].second, lJudgement, true);
        EXPECT_TRUE(lHeadline.starts_with(getVerdictWord(lrRow.mVerdict))) << lHeadline;
        for (const ZTSTroubleText& lrTrouble : describeTroubles(lCases[i].second, lJudgement)) {
            EXPECT_FALSE(lrTrouble.mStatus.empty() || lrTrouble.mStatus.front().empty());
            EXPECT_FALSE(lrTrouble.mAction.empty());
            EXPECT_TRUE(lrTrouble.mSee.starts_with("tavik explain "));
            EXPECT_NE(findState(lrTrouble.mSee.substr(std::string("tavik explain ").size())), nullptr);
        }
    }
}

TEST_F(LocalTime, IdsAndNumbersOfStatesAreUniqueAndCollectingIsZero) {
    std::set<std::string> lIds;
    std::set<std::size_t> lNumbers;
    for (const ZTSStateRow& lrRow : getStateTable()) {
        lIds.insert(lrRow.mpId);
        lNumbers.insert(getStateNumber(lrRow));
        EXPECT_EQ(findState(lrRow.mpId), &lrRow);
        EXPECT_GT(std::string(lrRow.mpMeans).size(), 20U);
    }
    EXPECT_EQ(lIds.size(), getStateTable().size());
    EXPECT_EQ(lNumbers.size(), getStateTable().size());
    EXPECT_EQ(getStateNumber(*findState("collecting")), 0U);
    EXPECT_EQ(findState("no-such-state"), nullptr);
}

TEST_F(LocalTime, ExitStatusesAreThoseOfTheContract) {
    const std::pair<const char*, int> lExits[] = {
        {"newer-history", 3}, {"no-sensor", 3}, {"not-permitted", 3}, {"collector-silent", 3}, {"no-adapters", 3},
        {"disk-full", 3},     {"deaf", 1},      {"gap", 1},           {"refused", 1},          {"collecting", 0}};
    for (const auto& [lpId, lExit] : lExits) {
        EXPECT_EQ(getVerdictExit(findState(lpId)->mVerdict), lExit) << lpId;
    }
}

TEST_F(LocalTime, AllStatesThatHoldAreReportedButOnlyOneReasonForNotCollecting) {
    ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) {
        arLive["kinds"][0]["kinds"]["rscn"] = "failed";
        arLive["losses"]["refused"]["total-limit"] = 9;
    });
    lFacts.mHistory->mGaps = {sGap(7, true)};
    EXPECT_THAT(sIds(lFacts), ElementsAre("deaf", "gap", "refused"));
    lFacts.mLive->mKeeper.mState = ZTKP_Stopping;
    lFacts.mLive->mCollector.mDisk = ZTDK_ReadOnly;
    EXPECT_THAT(sIds(lFacts), ElementsAre("stopping", "deaf", "gap", "refused"));
}

TEST_F(LocalTime, KindsWithoutASourceAreNotDeafness) {
    const ZTSStatusFacts lFacts = makeHealthyFacts();
    EXPECT_TRUE(judge(lFacts).isCollecting());
    EXPECT_THAT(sIds(lFacts), ElementsAre("collecting"));
}

TEST_F(LocalTime, EventsBeforeTheStartOfCollectionAreNoLoss) {
    const ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) {
        arLive["losses"]["refused"] = {{"collection-off", 40}};
    });
    EXPECT_THAT(sIds(lFacts), ElementsAre("collecting"));
}

TEST_F(LocalTime, AnAgentWhoseKindsAreAllOffIsStarting) {
    const ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) {
        for (nlohmann::json& lrKinds : arLive["kinds"]) {
            for (auto& lrState : lrKinds["kinds"]) {
                lrState = "off";
            }
        }
    });
    EXPECT_THAT(sIds(lFacts), ElementsAre("starting"));
}

TEST_F(LocalTime, AnEndedAgentsReasonChoosesItsState) {
    const auto lStateFor = [](const char* apReason) {
        return sIds(sFactsOf([apReason](nlohmann::json& arLive) {
            arLive["agent"]["running"] = false;
            arLive["agent"]["endReason"] = apReason;
        }));
    };
    EXPECT_THAT(lStateFor("no-adapters"), ElementsAre("no-adapters"));
    EXPECT_THAT(lStateFor("no-event-support"), ElementsAre("no-event-support"));
    EXPECT_THAT(lStateFor("no-library"), ElementsAre("no-library"));
    EXPECT_THAT(lStateFor("signal"), ElementsAre("agent-down"));
}

TEST_F(LocalTime, AnAgentThatIsDownIsDescribedInSentences) {
    const auto lStatusFor = [](const char* apProblem) {
        ZTSStatusFacts lFacts = sFactsOf([apProblem](nlohmann::json& arLive) {
            arLive["keeper"]["nextStart"] = "2026-11-21T10:04:20+01:00";
            arLive["keeper"]["since"] = "2026-11-21T10:04:10+01:00";
            arLive["agent"]["running"] = false;
            arLive["agent"]["problem"] = apProblem;
        });
        return describeTroubles(lFacts, judge(lFacts)).at(0).mStatus.at(0);
    };
    const std::string lSince = "No agent runs since 10:04:10. ";
    const std::string lNext = " The next start is at 10:04:20.";
    EXPECT_EQ(lStatusFor("ended: killed by signal 9 (Killed)"),
              lSince + "The last one ended: killed by signal 9 (Killed)." + lNext);
    EXPECT_EQ(lStatusFor("ended: other"), lSince + "The last one failed; its log has the reason." + lNext);
    EXPECT_EQ(lStatusFor("cannot be started"), lSince + "It cannot be started." + lNext);
    EXPECT_EQ(lStatusFor("an agent runs that this sensor has not started"),
              lSince + "An agent runs that this sensor has not started." + lNext);
}

TEST_F(LocalTime, ActionsNameTheFilesAndFoldersOfTheConfiguration) {
    ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) { arLive["collector"]["disk"] = "full"; });
    const auto lAction = [&] { return describeTroubles(lFacts, judge(lFacts)).at(0).mAction.at(0); };
    EXPECT_THAT(lAction(), testing::StartsWith("df -h /var/lib/tavik;"));
    lFacts.mPlaces = {.mSettingsFile = "/etc/t.toml",
                      .mStateDirectory = "/data/tavik",
                      .mAgentLog = "/data/agent.log",
                      .mLibrary = "/opt/libkpm.so"};
    EXPECT_THAT(lAction(), testing::StartsWith("df -h /data/tavik;"));
    lFacts.mLive->mAgent.mIsRunning = false;
    lFacts.mLive->mAgent.mEndReason = "no-library";
    EXPECT_EQ(lAction(), "sudo tail -n 5 /data/agent.log;  sudo grep -n library /etc/t.toml");
    EXPECT_THAT(describeTroubles(lFacts, judge(lFacts)).at(0).mStatus.at(0),
                testing::StartsWith("The agent could not load /opt/libkpm.so. Its log has the reason."));
}

TEST_F(LocalTime, LossesAreToldForTheSpanThatWasAskedFor) {
    ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) { arLive["losses"]["dropped"] = 2; });
    lFacts.mLossSpan = std::chrono::minutes(10);
    EXPECT_EQ(formatHeadline(lFacts, judge(lFacts), true), "COLLECTING; 2 events lost in the last 10 min");
    // What was refused longer than a day ago is not known any more.
    lFacts.mLossSpan = std::chrono::hours(24 * 30);
    EXPECT_EQ(formatHeadline(lFacts, judge(lFacts), true), "COLLECTING; at least 2 events lost in the last 30 days");
}

TEST_F(LocalTime, TheLossesAreSummedAndUnknownOnesAreALowerBound) {
    ZTSStatusFacts lFacts = sFactsOf([](nlohmann::json& arLive) {
        arLive["losses"]["library"] = {{{"name", "ring"}, {"count", 4}}};
    });
    lFacts.mHistory->mGaps = {sGap(1200, false), sGap(30, true)};
    EXPECT_EQ(formatHeadline(lFacts, judge(lFacts), true), "COLLECTING; at least 1,234 events lost in the last 24 h");
    const auto lTroubles = describeTroubles(lFacts, judge(lFacts));
    ASSERT_EQ(lTroubles.size(), 2U);
    EXPECT_EQ(lTroubles[0].mStatus[0], "09:00:00 to 09:00:03: 30 events lost; the agent was killed");
    EXPECT_EQ(lTroubles[0].mStatus[1], "09:00:00 to 09:00:03: at least 1,200 events lost; the agent was killed");
    EXPECT_THAT(lTroubles[1].mStatus[0], HasSubstr("4 lost by the adapters' library (ring)"));
}
