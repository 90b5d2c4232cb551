#include <gmock/gmock.h>

#include "tests/unit/commands/TavikProgram.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

class EventsCommand : public TavikProgram {
protected:
    /// The counts of the episodes that these filters leave.
    std::vector<int> counts(std::vector<std::string> aFilter) {
        aFilter.insert(aFilter.begin(), "events");
        std::vector<int> lCounts;
        const nlohmann::json lDocument = runJson(aFilter);
        for (const nlohmann::json& lrEpisode : lDocument["episodes"]) {
            lCounts.push_back(lrEpisode["count"]);
        }
        return lCounts;
    }
};

TEST_F(EventsCommand, EpisodesComeNewestLastWithNamesAndCounts) {
    fill();
    const ZTSFinishedRun lRun = run({"events"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mOutput, StartsWith("EPISODE  LAST"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("5  queue-full  host7      ctrl-A                   LUNs 3,4\n"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("7  queue-full  host8      50:06:01:68:3b:a0:12:34  LUN 9\n"));
    EXPECT_LT(lRun.mOutput.find("host7"), lRun.mOutput.find("host8"));
}

TEST_F(EventsCommand, TheDocumentHasSchemaHostStoreIdAndEpisodes) {
    fill();
    const nlohmann::json lDocument = runJson({"events"});
    EXPECT_EQ(lDocument["schema"], "tavik.events/1");
    EXPECT_TRUE(lDocument["host"].is_string());
    EXPECT_EQ(lDocument["storeId"], store().getStoreId());
    ASSERT_EQ(lDocument["episodes"].size(), 3U);
    const nlohmann::json& lrFirst = lDocument["episodes"][0];
    EXPECT_EQ(lrFirst["kind"], "queue-full");
    EXPECT_EQ(lrFirst["remotePort"]["wwpn"], "50:06:01:60:3b:a0:12:34");
    EXPECT_EQ(lrFirst["remotePort"]["name"], "ctrl-A");
    EXPECT_EQ(lrFirst["initiator"]["host"], "host7");
    EXPECT_EQ(lrFirst["luns"], (nlohmann::json{{"all", false}, {"numbers", {3, 4}}}));
    EXPECT_EQ(lrFirst["first"], "2026-03-04T05:06:00.000000+00:00");
}

TEST_F(EventsCommand, FiltersNarrowAndRepeatedOptionsMeanOr) {
    fill();
    EXPECT_THAT(counts({}), ElementsAre(5, 1, 7));
    EXPECT_THAT(counts({"--kind", "logo"}), ElementsAre(1));
    EXPECT_THAT(counts({"--kind", "logo", "--kind", "queue-full"}), ElementsAre(5, 1, 7));
    EXPECT_THAT(counts({"--port", "ctrl-A"}), ElementsAre(5, 1));
    EXPECT_THAT(counts({"--port", "50:06:01:68:3b:a0:12:34"}), ElementsAre(7));
    EXPECT_THAT(counts({"--port", "ctrl-A", "--port", "500601683ba01234"}), ElementsAre(5, 1, 7));
    EXPECT_THAT(counts({"--initiator", "host8"}), ElementsAre(7));
    EXPECT_THAT(counts({"--initiator", "host7", "--kind", "queue-full"}), ElementsAre(5));
    EXPECT_THAT(counts({"--lun", "4"}), ElementsAre(5));
    EXPECT_THAT(counts({"--lun", "9", "--lun", "3"}), ElementsAre(5, 7));
    EXPECT_THAT(counts({"--lun", "5"}), ElementsAre());
    EXPECT_THAT(counts({"--limit", "1"}), ElementsAre(7));
    EXPECT_THAT(counts({"--limit", "0"}), ElementsAre(5, 1, 7));
    EXPECT_THAT(counts({"--since", "2026-03-04 05:07:30"}), ElementsAre(7));
    EXPECT_THAT(counts({"--until", "2026-03-04T05:06:30Z"}), ElementsAre(5));
    EXPECT_THAT(counts({"--since", "10m"}), ElementsAre());
    EXPECT_THAT(counts({"--open"}), ElementsAre(5, 1, 7));
}

TEST_F(EventsCommand, AMarksNameIsATime) {
    fill();
    ZTCStoreTransaction lTransaction = store().begin();
    store().setMark("before update", fromMicroseconds(gcBase + 90 * gcSecond));
    lTransaction.commit();
    EXPECT_THAT(counts({"--since", "before update"}), ElementsAre(7));
    EXPECT_THAT(counts({"--until", "before update"}), ElementsAre(5, 1));
}

TEST_F(EventsCommand, ClosedEpisodesAreNotOpen) {
    fill();
    ZTCStoreTransaction lTransaction = store().begin();
    EXPECT_EQ(store().closeEpisodes(fromMicroseconds(gcBase + gcDay), [](const auto&, ZTCKindKey) { return true; }),
              3U);
    lTransaction.commit();
    EXPECT_THAT(counts({"--open"}), ElementsAre());
    const ZTSFinishedRun lRun = run({"events", "--open"});
    EXPECT_EQ(lRun.mStatus, 0);
    EXPECT_THAT(lRun.mOutput, StartsWith("No episode matches.\nNOT COLLECTING; no sensor is running: tavik status\n"));
}

TEST_F(EventsCommand, RecordsAreThoseThatTheAgentHandedOver) {
    fill();
    const nlohmann::json lDocument = runJson({"events", "--records", "--kind", "queue-full", "--port", "ctrl-A"});
    ASSERT_EQ(lDocument["records"].size(), 2U);
    EXPECT_EQ(lDocument["records"][0]["count"], 3);
    EXPECT_EQ(lDocument["records"][1]["count"], 2);
    EXPECT_EQ(lDocument["records"][0]["episode"], lDocument["records"][1]["episode"]);
    EXPECT_EQ(lDocument["records"][1]["data"]["luns"], nlohmann::json({4}));
    EXPECT_THAT(run({"events", "--records"}).mOutput, HasSubstr("luns=3"));
}

TEST_F(EventsCommand, JsonHasAllAndTextTheNewestHundred) {
    std::vector<ZTSTestRecord> lRecords;
    for (int i = 0; i < 150; ++i) {
        const std::int64_t lTime = gcBase + i * 2 * gcMinute;
        lRecords.push_back(makeQueueFull(gcPortA, lTime, lTime, static_cast<std::uint32_t>(i + 1)));
    }
    takeIn(lRecords);
    EXPECT_EQ(counts({}).size(), 150U);
    const std::string lText = run({"events"}).mOutput;
    EXPECT_EQ(std::count(lText.begin(), lText.end(), '\n'), 101);
    EXPECT_THAT(lText, HasSubstr(" 150  queue-full"));
    EXPECT_THAT(lText, testing::Not(HasSubstr(" 50  queue-full")));
}

TEST_F(EventsCommand, PortsAreSummedAndTheWorstComesFirst) {
    fill();
    const nlohmann::json lDocument = runJson({"ports"});
    EXPECT_EQ(lDocument["schema"], "tavik.ports/1");
    ASSERT_EQ(lDocument["ports"].size(), 2U);
    EXPECT_EQ(lDocument["ports"][0]["remotePort"]["wwpn"], "50:06:01:68:3b:a0:12:34");
    EXPECT_EQ(lDocument["ports"][0]["count"], 7);
    EXPECT_EQ(lDocument["ports"][1]["remotePort"]["name"], "ctrl-A");
    EXPECT_EQ(lDocument["ports"][1]["kinds"], (nlohmann::json{{"logo", 1}, {"queue-full", 5}}));
    EXPECT_EQ(lDocument["ports"][1]["initiators"][0]["host"], "host7");
    EXPECT_EQ(runJson({"ports", "--kind", "logo"})["ports"].size(), 1U);
    EXPECT_THAT(run({"ports"}).mOutput, HasSubstr("queue-full 5, logo 1"));
}

TEST_F(EventsCommand, AnEpisodeIsExplainedWithItsRecords) {
    fill();
    const nlohmann::json lFirst = runJson({"events"})["episodes"][0];
    const nlohmann::json lDocument = runJson({"explain", std::to_string(lFirst["episode"].get<int>())});
    EXPECT_EQ(lDocument["schema"], "tavik.explain/1");
    EXPECT_EQ(lDocument["episode"], lFirst);
    EXPECT_EQ(lDocument["evidence"].size(), 2U);
    EXPECT_THAT(run({"explain", "queue-full"}).mOutput, HasSubstr("TASK SET FULL"));
}

TEST_F(EventsCommand, AReaderThatGoesAwayEndsItQuietly) {
    std::vector<ZTSTestRecord> lRecords;
    for (int i = 0; i < 2000; ++i) {
        const std::int64_t lTime = gcBase + i * 2 * gcMinute;
        lRecords.push_back(makeQueueFull(gcPortA, lTime, lTime));
    }
    takeIn(lRecords);
    for (const char* lpArguments : {"events --limit 0", "--json events", "events --records --limit 0"}) {
        const ZTSFinishedRun lRun =
            runShell("\"$0\" " + std::string(lpArguments) + " | head -1; echo ${PIPESTATUS:-done}");
        EXPECT_EQ(lRun.mStatus, 0);
        EXPECT_EQ(lRun.mErrors, "");
    }
    const ZTSFinishedRun lIgnoring = runShell("trap '' PIPE; \"$0\" events --limit 0 | head -1");
    EXPECT_EQ(lIgnoring.mErrors, "") << "a parent that ignores the signal changes nothing";
}
