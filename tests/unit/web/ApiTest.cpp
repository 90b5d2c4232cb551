#include "sensor/web/include/Api.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>

#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <regex>
#include <set>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/metrics/include/Metrics.h"
#include "tests/unit/store/Damage.h"
#include "tests/unit/store/StoreFixture.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

/// Answers over a history that a test fills.
class Api : public ZTCStoreTest {
protected:
    ZTSWebResponse ask(const std::string& acrPath,
                       const std::vector<std::pair<std::string, std::string>>& acrParameters = {}) {
        if (mpApi == nullptr) {
            ZTSApiSources lSources;
            lSources.mStateDirectory = mDirectory.path();
            lSources.mHost = "db07";
            lSources.mVersion = "9.8.7";
            lSources.mMayRead = [] { return true; };
            lSources.mReadLive = [this] { return mLive; };
            lSources.mGiveSeries = [this](ZTSMetricFacts& arFacts) {
                mSeriesPorts.extend(arFacts.mTotals, mMostSeries);
                arFacts.mSeriesPorts = mSeriesPorts;
            };
            lSources.mAddNames = [](ZTCNameBook& arNames) { arNames.addName(makeName(gcPortA), "array7 ctrl-A"); };
            mpApi = std::make_unique<ZTCApi>(lSources);
        }
        return mpApi->answer({.mPath = acrPath, .mParameters = acrParameters});
    }
    nlohmann::json askJson(const std::string& acrPath,
                           const std::vector<std::pair<std::string, std::string>>& acrParameters = {}) {
        const ZTSWebResponse lResponse = ask(acrPath, acrParameters);
        EXPECT_EQ(lResponse.mStatus, 200U) << lResponse.mBody;
        EXPECT_EQ(lResponse.mType, "application/json");
        return nlohmann::json::parse(lResponse.mBody);
    }
    /// Two ports with trouble, one of them in two minutes.
    void fill() {
        take({{.mKind = gcQueueFull, .mData = makeBusyData(gcPortA, {1, 4}), .mOccurrences = 30, .mPortName = {}},
              {.mKind = gcPlogi, .mData = makeTwoNamesData(gcPortB, gcNode), .mOccurrences = 2, .mPortName = {}},
              {.mKind = gcQueueFull,
               .mData = makeBusyData(gcPortA, {4}),
               .mBegin = gcBase + 5 * gcMinute,
               .mEnd = gcBase + 5 * gcMinute + gcSecond,
               .mOccurrences = 12,
               .mPortName = {}}});
    }

    nlohmann::json mLive = {{"schema", "tavik.live/1"}, {"agent", {{"running", true}}}};
    std::size_t mMostSeries = 1;
    ZTCSeriesPorts mSeriesPorts;
    std::unique_ptr<ZTCApi> mpApi;
};

TEST_F(Api, EventsAreTheEpisodesOfTheFilter) {
    fill();
    const nlohmann::json lAll = askJson("/api/v1/events");
    EXPECT_EQ(lAll["schema"], "tavik.events/1");
    EXPECT_EQ(lAll["host"], "db07");
    EXPECT_EQ(lAll["storeId"], store().getStoreId());
    EXPECT_EQ(lAll["episodes"].size(), 3U);
    const nlohmann::json lSome = askJson("/api/v1/events", {{"port", "array7 ctrl-A"}, {"lun", "1"}});
    ASSERT_EQ(lSome["episodes"].size(), 1U);
    EXPECT_EQ(lSome["episodes"][0]["count"], 30);
    EXPECT_EQ(lSome["episodes"][0]["remotePort"]["name"], "array7 ctrl-A");
    EXPECT_EQ(askJson("/api/v1/events", {{"kind", "plogi"}, {"kind", "link"}})["episodes"].size(), 1U);
    EXPECT_EQ(askJson("/api/v1/events", {{"limit", "2"}})["episodes"].size(), 2U);
    EXPECT_EQ(askJson("/api/v1/events", {{"limit", "0"}})["episodes"].size(), 3U);
}

TEST_F(Api, PortsAreSummedUpMostEventsFirst) {
    fill();
    const nlohmann::json lPorts = askJson("/api/v1/ports")["ports"];
    ASSERT_EQ(lPorts.size(), 2U);
    EXPECT_EQ(lPorts[0]["remotePort"]["name"], "array7 ctrl-A");
    EXPECT_EQ(lPorts[0]["count"], 42);
}

TEST_F(Api, AWrongParameterGets400AndSaysWhyByItsOwnName) {
    fill();
    const struct {
        const char* mpPath;
        std::pair<std::string, std::string> mParameter;
        const char* mpSaid;
    } lWrong[] = {
        {"/api/v1/events", {"kind", "nonsense"}, "kind \"nonsense\" is not"},
        {"/api/v1/events", {"sinse", "10m"}, "sinse"},
        {"/api/v1/events", {"open", "perhaps"}, "perhaps"},
        {"/api/v1/events", {"lun", "-1"}, "lun \"-1\" is not"},
        {"/api/v1/events", {"limit", "few"}, "limit \"few\" is not"},
        {"/api/v1/events", {"port", "nowhere"}, "port \"nowhere\" is not"},
        {"/api/v1/events", {"initiator", "host99"}, "initiator \"host99\" is not"},
        {"/api/v1/events", {"until", "40000d"}, "until \"40000d\" is too long"},
        {"/api/v1/ports", {"since", "when?"}, "since \"when?\" is not"},
        {"/api/v1/status", {"since", "1h"}, "since"},
        {"/api/v1/stream", {"kind", "rscn"}, "kind"},
        {"/api/v1/explain", {"subject", "nonsense"}, "nonsense"},
        {"/api/v1/explain", {"subject", "999"}, "999"},
        {"/api/v1/diff", {"from", "nonsense"}, "nonsense"},
        {"/api/v1/diff", {"to", "2000-01-01"}, "has to be earlier than to"},
        {"/api/v1/diff", {"since", "1h"}, "since"},
        {"/api/v1/timeline", {"columns", "0"}, "columns"},
        {"/api/v1/timeline", {"columns", "4001"}, "4001"},
        {"/api/v1/timeline", {"to", "2000-01-01"}, "from has to be earlier than to"},
        {"/api/v1/explain", {"since", "2100-01-01"}, "since has to be earlier than until"},
    };
    for (const auto& lrWrong : lWrong) {
        const ZTSWebResponse lResponse = ask(lrWrong.mpPath, {lrWrong.mParameter});
        EXPECT_EQ(lResponse.mStatus, 400U) << lrWrong.mParameter.second;
        EXPECT_THAT(nlohmann::json::parse(lResponse.mBody)["error"].get<std::string>(),
                    AllOf(HasSubstr(lrWrong.mpSaid), Not(HasSubstr("--"))));
    }
}

TEST_F(Api, ASinceBehindItsUntilGets400WithBothTimes) {
    fill();
    for (const char* lpPath : {"/api/v1/events", "/api/v1/ports"}) {
        const ZTSWebResponse lResponse = ask(lpPath, {{"since", "2026-03-06"}, {"until", "2026-03-05 10:04"}});
        EXPECT_EQ(lResponse.mStatus, 400U) << lpPath;
        EXPECT_EQ(nlohmann::json::parse(lResponse.mBody)["error"],
                  "since \"2026-03-06\" (2026-03-06 00:00:00) is later than until \"2026-03-05 10:04\" "
                  "(2026-03-05 10:04:00)");
    }
}

TEST_F(Api, DiffIsTheCommandsDocument) {
    fill();
    const nlohmann::json lDiff =
        askJson("/api/v1/diff", {{"from", "2026-03-06"}, {"to", "2026-03-07"}, {"before-since", "2026-03-01"}});
    EXPECT_EQ(lDiff["schema"], "tavik.diff/1");
    EXPECT_EQ(lDiff["storeId"], store().getStoreId());
    ASSERT_EQ(lDiff["rates"].size(), 2U);  // all that happened, before
    const nlohmann::json& lrRate = lDiff["rates"][0]["kind"] == "queue-full" ? lDiff["rates"][0] : lDiff["rates"][1];
    EXPECT_EQ(lrRate["remotePort"]["name"], "array7 ctrl-A");
    EXPECT_EQ(lrRate["before"], 42);
    EXPECT_EQ(lrRate["after"], 0);
}

TEST_F(Api, ExplainKnowsKindsStatesAndEpisodes) {
    fill();
    EXPECT_EQ(askJson("/api/v1/explain", {{"subject", "queue-full"}})["schema"], "tavik.explain/1");
    EXPECT_EQ(ask("/api/v1/explain", {{"subject", "deaf"}}).mStatus, 200U);
    EXPECT_EQ(ask("/api/v1/explain", {{"subject", std::to_string(episodes().front().mEpisode)}}).mStatus, 200U);
    EXPECT_EQ(ask("/api/v1/explain").mStatus, 200U);
}

TEST_F(Api, APathThatIsNotThereGets404) {
    EXPECT_EQ(ask("/api/v1/nonsense").mStatus, 404U);
    EXPECT_EQ(ask("/api/v1/events/").mStatus, 404U);
}

TEST_F(Api, WithoutAHistoryStatusAndMetricsStillAnswerAndTheRestGets503) {
    EXPECT_EQ(ask("/api/v1/events").mStatus, 503U);
    EXPECT_EQ(askJson("/api/v1/status")["schema"], "tavik.status/1");
    EXPECT_EQ(askJson("/api/v1/status")["damagedHistories"], nlohmann::json::array());
    EXPECT_THAT(ask("/metrics").mBody, HasSubstr("tavik_build_info{version=\"9.8.7\"} 1\n"));
    fill();  // it is there now: no restart is needed
    EXPECT_EQ(askJson("/api/v1/events")["episodes"].size(), 3U);
}

TEST_F(Api, HealthzIs200WhileTavikCollectsAnd503WithTheStateOtherwise) {
    fill();
    const ZTSWebResponse lWell = ask("/healthz");
    EXPECT_EQ(lWell.mStatus, 200U) << lWell.mBody;
    EXPECT_EQ(lWell.mBody, "collecting\n");
    mLive["agent"]["running"] = false;
    const ZTSWebResponse lUnwell = ask("/healthz");
    EXPECT_EQ(lUnwell.mStatus, 503U);
    EXPECT_EQ(lUnwell.mBody, "agent-down\n");
}

TEST_F(Api, NoAnswerWritesToTheHistoryOrLeavesATransactionBehind) {
    fill();
    sqlite3* lpHandle = nullptr;
    ASSERT_EQ(sqlite3_open(path().c_str(), &lpHandle), SQLITE_OK);
    const std::unique_ptr<sqlite3, int (*)(sqlite3*)> lpDatabase(lpHandle, &sqlite3_close);
    // A first look: before it, the library does not know that there is a write-ahead log.
    ASSERT_EQ(sqlite3_exec(lpHandle, "SELECT count(*) FROM sqlite_master", nullptr, nullptr, nullptr), SQLITE_OK);
    for (const char* const lpPath : {"/healthz", "/metrics", "/api/v1/status", "/api/v1/events", "/api/v1/ports",
                                     "/api/v1/paths", "/api/v1/diff", "/api/v1/explain", "/api/v1/timeline"}) {
        EXPECT_NE(ask(lpPath).mStatus, 400U) << lpPath;
        // Empties the write-ahead log; that fails while somebody still reads there.
        EXPECT_EQ(sqlite3_wal_checkpoint_v2(lpHandle, nullptr, SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr), SQLITE_OK)
            << lpPath;
        ask(lpPath);
        EXPECT_EQ(std::filesystem::file_size(path() + "-wal"), 0U) << lpPath << " writes";
    }
}

TEST_F(Api, MetricsCountWhatTheHistoryHolds) {
    fill();
    const ZTSWebResponse lResponse = ask("/metrics");
    EXPECT_EQ(lResponse.mType, "text/plain; version=0.0.4; charset=utf-8");
    EXPECT_THAT(lResponse.mBody,
                AllOf(HasSubstr("kind=\"queue-full\",remote_port=\"" + makeName(gcPortA).toText() + "\"} 42\n"),
                      HasSubstr("kind=\"plogi\",remote_port=\"other\"} 2\n"), HasSubstr("tavik_retrievals_total 1\n"),
                      HasSubstr("tavik_agent_up 1\n")));
}

TEST_F(Api, MetricsCountOpenEpisodesAndNoClosedOnes) {
    take({makeQueueFull(gcPortA, gcBase, gcBase), makeQueueFull(gcPortB, gcBase, gcBase)});
    ASSERT_EQ(closeAt(gcBase + 60 * gcMinute), 2U);
    EXPECT_THAT(ask("/metrics").mBody, Not(HasSubstr("tavik_open_episodes{")));
    take({makeQueueFull(gcPortA, gcBase + 60 * gcMinute, gcBase + 60 * gcMinute)});
    EXPECT_THAT(ask("/metrics").mBody, HasSubstr("\ntavik_open_episodes{kind=\"queue-full\"} 1\n"));
}

TEST_F(Api, MetricsHaveWhatTheProgramsKeepInTheHistory) {
    fill();
    ZTSGap lGap;
    lGap.mReason = "the agent was killed";
    lGap.mCounts = {{.mInitiator = {}, .mKind = gcQueueFull, .mHeld = 3, .mHandedOver = 4}};
    inTransaction([&] {
        store().setValue(gcAgentRestartsValue, "5");
        store().setValue(gcHookFailuresValue, "6");
        store().setValue(gcLibraryLossesValue, R"({"total": {"messages": 8}})");
        store().setValue("outlet.ndjson.seq", "1");
        store().setValue("outlet.ndjson.missed", "9");
        store().setValue("outlet.journal.missed", "10");
        ASSERT_TRUE(store().noteGap(lGap));
    });
    const std::string lText = ask("/metrics").mBody;
    for (const char* const lpSample :
         {"tavik_agent_restarts_total 5", "tavik_hook_failures_total 6", "tavik_gaps_total 1",
          "tavik_lost_events_total{source=\"gap\"} 7", "tavik_lost_events_total{source=\"messages\"} 8",
          "tavik_output_missed_total{output=\"ndjson\"} 9"}) {
        EXPECT_THAT(lText, HasSubstr("\n" + std::string(lpSample) + "\n"));
    }
    EXPECT_THAT(lText, Not(HasSubstr("output=\"journal\""))) << "it has never written anything";
}

TEST_F(Api, ThePageHasARowForEachKindOfTheTableAndForNoOther) {
    const std::string lText = ask("/kinds.js").mBody;
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_THAT(lText, HasSubstr("\n  row(\"" + std::string(lcrKind.mpName) + "\", "));
    }
    std::size_t lRows = 0;
    for (std::size_t lPlace = 0; (lPlace = lText.find("\n  row(\"", lPlace)) != std::string::npos; ++lPlace) {
        ++lRows;
    }
    EXPECT_EQ(lRows, gcScopeEventKindCount);
}

TEST_F(Api, ThePageAndAllThatItLoadsComeFromThisServer) {
    // Every file that the page names, and every module that these import.
    static const std::regex scNamed("(?:src|href)=\"(/[^\"]+)\"|from \"\\./([^\"]+)\"");
    std::set<std::string> lSeen;
    std::vector<std::string> lToSee{"/"};
    while (!lToSee.empty()) {
        const std::string lPath = lToSee.back();
        lToSee.pop_back();
        if (!lSeen.insert(lPath).second) {
            continue;
        }
        const ZTSWebResponse lFile = ask(lPath);
        EXPECT_EQ(lFile.mStatus, 200U) << lPath;
        EXPECT_EQ(lFile.mBody.find("eval("), std::string::npos) << lPath;
        if (!lPath.starts_with("/vendor/")) {
            // The one name of a vocabulary, which nobody asks for.
            static const std::regex scSvg("http://www\\.w3\\.org/2000/svg");
            const std::string lText = std::regex_replace(lFile.mBody, scSvg, "");
            EXPECT_EQ(lText.find("http:"), std::string::npos) << lPath;
            EXPECT_EQ(lText.find("https:"), std::string::npos) << lPath;
        }
        for (std::sregex_iterator lNamed(lFile.mBody.begin(), lFile.mBody.end(), scNamed);
             lNamed != std::sregex_iterator(); ++lNamed) {
            lToSee.push_back((*lNamed)[1].matched ? (*lNamed)[1].str() : "/" + (*lNamed)[2].str());
        }
    }
    EXPECT_TRUE(lSeen.contains("/timeline.js"));
    EXPECT_TRUE(lSeen.contains("/vendor/uPlot.js"));
    EXPECT_EQ(ask("/").mType, "text/html; charset=utf-8");
    EXPECT_EQ(ask("/style.css").mType, "text/css; charset=utf-8");
    EXPECT_EQ(ask("/app.js").mType, "text/javascript; charset=utf-8");
}

// ---- the timeline ----

TEST_F(Api, TheTimelineCountsEachMinuteInItsColumnExactly) {
    fill();
    // Ten columns of one minute each.
    const nlohmann::json lTimeline = askJson(
        "/api/v1/timeline", {{"from", "2026-03-04T05:06:00Z"}, {"to", "2026-03-04T05:16:00Z"}, {"columns", "10"}});
    EXPECT_EQ(lTimeline["schema"], "tavik.timeline/1");
    EXPECT_EQ(lTimeline["columnSeconds"], 60.0);
    ASSERT_EQ(lTimeline["rows"].size(), 2U);
    std::uint64_t lTotal = 0;
    for (const nlohmann::json& lrRow : lTimeline["rows"]) {
        for (const nlohmann::json& lrCell : lrRow["cells"]) {
            lTotal += lrCell[1].get<std::uint64_t>();
        }
        if (lrRow["kind"] == "queue-full") {
            EXPECT_EQ(lrRow["cells"], (nlohmann::json{{0, 30, 0}, {5, 12, 0}}));
            EXPECT_EQ(lrRow["remotePort"]["name"], "array7 ctrl-A");
        }
    }
    EXPECT_EQ(lTotal, 44U);
}

TEST_F(Api, TheTimelineOfMonthsHasTheSameTotalAsThatOfMinutes) {
    fill();
    for (const char* lpColumns : {"1", "30", "1000"}) {
        const nlohmann::json lTimeline =
            askJson("/api/v1/timeline",
                    {{"from", "2026-02-20T00:00:00Z"}, {"to", "2026-03-22T00:00:00Z"}, {"columns", lpColumns}});
        std::uint64_t lTotal = 0;
        for (const nlohmann::json& lrRow : lTimeline["rows"]) {
            for (const nlohmann::json& lrCell : lrRow["cells"]) {
                lTotal += lrCell[1].get<std::uint64_t>();
            }
        }
        EXPECT_EQ(lTotal, 44U) << lpColumns;
    }
}

TEST_F(Api, TheTimelineShowsWhatWasNotListenedToAndMarks) {
    inTransaction([this] {
        store().setMark("before update", fromMicroseconds(gcBase + gcMinute));
        store().beginRun(fromMicroseconds(gcBase));
    });
    const nlohmann::json lTimeline =
        askJson("/api/v1/timeline", {{"from", "2026-03-04T05:00:00Z"}, {"to", "2026-03-04T06:00:00Z"}});
    ASSERT_EQ(lTimeline["marks"].size(), 1U);
    EXPECT_EQ(lTimeline["marks"][0]["name"], "before update");
    EXPECT_EQ(lTimeline["runs"].size(), 1U);
    EXPECT_TRUE(lTimeline["gaps"].is_array());
}

TEST_F(Api, AHistoryThatWasDamagedAndSetAsideIsReplacedByTheNewOne) {
    for (std::uint64_t i = 0; i < 200; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    EXPECT_EQ(ask("/api/v1/ports").mStatus, 200U);
    closeStore();
    damageHistory(path());
    EXPECT_EQ(ask("/api/v1/ports").mStatus, 503U);
    fill();  // its writer sets the damaged one aside
    ASSERT_EQ(mReports.size(), 1U);
    EXPECT_EQ(askJson("/api/v1/ports")["ports"].size(), 2U);
}
