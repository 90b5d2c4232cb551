#include "sensor/outlets/include/Outlets.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "sensor/metrics/include/SeriesPorts.h"
#include "tests/support/Waiting.h"
#include "tests/unit/store/Damage.h"
#include "tests/unit/store/StoreFixture.h"
#include "tests/unit/web/HttpClient.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

static constexpr const char* scNdjsonSeq = "outlet.ndjson.seq";

/// Outlets over a history that the test fills.
class Outlets : public ZTCStoreTest {
protected:
    ZTSSettings settings() const {
        ZTSSettings lSettings;
        lSettings.mMetricsRemotePorts = 500;
        lSettings.mNdjsonSize = 1 << 20;
        lSettings.mNdjsonKeep = 2;
        return lSettings;
    }
    ZTCOutlets& start(const ZTSSettings& acrSettings, bool aMayRead = true) {
        store();
        startWithoutStore(acrSettings, aMayRead);
        return *mpOutlets;
    }
    ZTCOutlets& startWithoutStore(const ZTSSettings& acrSettings, bool aMayRead = true) {
        mpOutlets = std::make_unique<ZTCOutlets>(
            ZTSOutletsSetup{.mStateDirectory = mDirectory.path(),
                            .mHost = "db07",
                            .mVersion = "1.2.3",
                            .mSetValue =
                                [this](const std::string& acrName, const std::string& acrValue) {
                                    const std::lock_guard lLock(mValueMutex);
                                    mValues[acrName] = acrValue;
                                },
                            .mReport =
                                [this](const std::string& acrLine) {
                                    const std::lock_guard lLock(mValueMutex);
                                    mLines += acrLine + "\n";
                                }},
            acrSettings);
        if (aMayRead) {
            mpOutlets->openHistory();
        }
        return *mpOutlets;
    }
    std::string value(const std::string& acrName) {
        const std::lock_guard lLock(mValueMutex);
        return mValues[acrName];
    }
    std::string lines() {
        const std::lock_guard lLock(mValueMutex);
        return mLines;
    }
    void takeOne(ZTCKindKey aKind = gcLink, std::int64_t aAt = gcBase) {
        take({{.mKind = aKind,
               .mData = aKind == gcQueueFull ? makeBusyData(gcPortA, {1}) : makeGenericData(),
               .mBegin = aAt,
               .mEnd = aAt,
               .mOccurrences = 3,
               .mPortName = {}}});
    }

    std::mutex mValueMutex;
    std::map<std::string, std::string> mValues;
    std::string mLines;
    std::unique_ptr<ZTCOutlets> mpOutlets;
};

static std::vector<nlohmann::json> sParseLines(const std::string& acrText) {
    std::vector<nlohmann::json> lDocuments;
    std::istringstream lLines(acrText);
    for (std::string lLine; std::getline(lLines, lLine);) {
        lDocuments.push_back(nlohmann::json::parse(lLine));
    }
    return lDocuments;
}

TEST_F(Outlets, EveryChangeOfAnEpisodeIsALineWithItsIdentity) {
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    takeOne();
    ZTCOutlets& lrOutlets = start(lSettings);
    waitUntil([&] { return !value(scNdjsonSeq).empty(); }, "the first line");
    closeAt(gcBase + 10 * gcMinute);
    lrOutlets.wake();
    waitUntil([&] { return sParseLines(readFile(lSettings.mNdjsonPath)).size() == 2; }, "the second line");
    const std::vector<nlohmann::json> lLines = sParseLines(readFile(lSettings.mNdjsonPath));
    EXPECT_EQ(lLines[0]["phase"], "open");
    EXPECT_EQ(lLines[1]["phase"], "closed");
    for (const nlohmann::json& lrLine : lLines) {
        EXPECT_EQ(lrLine["host"], "db07");
        EXPECT_EQ(lrLine["storeId"], store().getStoreId());
        EXPECT_EQ(lrLine["count"], 3);
    }
    EXPECT_LT(lLines[0]["seq"], lLines[1]["seq"]);
}

TEST_F(Outlets, LinesGoOnBehindTheStoredNumberAfterARestart) {
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    takeOne();
    start(lSettings);
    waitUntil([&] { return !value(scNdjsonSeq).empty(); }, "the first line");
    mpOutlets.reset();
    inTransaction([this] { store().setValue(scNdjsonSeq, value(scNdjsonSeq)); });
    takeOne(gcQueueFull);
    start(lSettings);
    waitUntil([&] { return sParseLines(readFile(lSettings.mNdjsonPath)).size() >= 2; }, "the second line");
    mpOutlets.reset();
    const std::vector<nlohmann::json> lLines = sParseLines(readFile(lSettings.mNdjsonPath));
    ASSERT_EQ(lLines.size(), 2U);
    EXPECT_EQ(lLines[1]["kind"], "queue-full");
}

TEST_F(Outlets, AFileThatCannotBeWrittenIsReportedOnceAndCatchesUp) {
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("missing/events.ndjson");
    takeOne();
    ZTCOutlets& lrOutlets = start(lSettings);
    waitUntil([&] { return !lines().empty(); }, "the report");
    EXPECT_THAT(lines(), AllOf(HasSubstr("ndjson.path"), HasSubstr(lSettings.mNdjsonPath)));
    EXPECT_EQ(value(scNdjsonSeq), "");
    ASSERT_EQ(mkdir(mDirectory.path("missing").c_str(), 0700), 0);
    lrOutlets.wake();
    waitUntil([&] { return exists(lSettings.mNdjsonPath) && !value(scNdjsonSeq).empty(); }, "the line");
    EXPECT_EQ(std::ranges::count(lines(), '\n'), 2);  // the problem, and its end
}

TEST_F(Outlets, TheMetricsFileIsWrittenAndNewPortsAreGivenTheirSeries) {
    ZTSSettings lSettings = settings();
    lSettings.mMetricsTextfile = mDirectory.path("tavik.prom");
    takeOne(gcQueueFull);
    start(lSettings);
    waitUntil([&] { return !value(gcSeriesPortsValue).empty() && exists(lSettings.mMetricsTextfile); }, "the file");
    EXPECT_THAT(readFile(lSettings.mMetricsTextfile), HasSubstr("tavik_build_info{version=\"1.2.3\"} 1\n"));
    EXPECT_EQ(value(gcSeriesPortsValue), makeName(gcPortA).toText());
}

TEST_F(Outlets, APortThatWasShownOnItsOwnIsNeverCountedAmongTheOthersLater) {
    ZTSSettings lSettings = settings();
    lSettings.mHttpListen = "127.0.0.1:0";
    lSettings.mMetricsRemotePorts = 1;
    take({{.mKind = gcQueueFull, .mData = makeBusyData(gcPortB, {1}), .mPortName = {}}});
    ZTCOutlets& lrOutlets = start(lSettings);
    waitUntil([&] { return lrOutlets.getPort() != 0; }, "the server");
    const std::string lOwn = "remote_port=\"" + makeName(gcPortB).toText() + "\"} ";
    EXPECT_THAT(ZTCHttpClient::get(lrOutlets.getPort(), "/metrics"), HasSubstr(lOwn + "1\n"));
    // A port whose name is smaller comes later.
    take({{.mKind = gcQueueFull, .mData = makeBusyData(gcPortA, {1}), .mOccurrences = 5, .mPortName = {}}});
    EXPECT_THAT(ZTCHttpClient::get(lrOutlets.getPort(), "/metrics"),
                AllOf(HasSubstr(lOwn + "1\n"), HasSubstr("remote_port=\"other\"} 5\n")));
}

TEST_F(Outlets, AStreamGetsChangesThatComeBehindItsBeginning) {
    ZTSSettings lSettings = settings();
    lSettings.mHttpListen = "127.0.0.1:0";
    takeOne();
    ZTCOutlets& lrOutlets = start(lSettings);
    waitUntil([&] { return lrOutlets.getPort() != 0; }, "the server");
    ZTCHttpClient lClient(lrOutlets.getPort());
    ASSERT_TRUE(lClient.send("GET /api/v1/stream HTTP/1.1\r\nHost: localhost\r\n\r\n"));
    lClient.readUntil("begins\n\n");
    lrOutlets.wake();
    // The first look only notes where the history is; what comes after that is sent.
    std::int64_t lAt = gcBase;
    std::string lEvent;
    waitUntil(
        [&] {
            takeOne(gcQueueFull, lAt += 5 * gcMinute);
            lrOutlets.wake();
            return mpOutlets->getPort() != 0 && lAt > gcBase + 30 * gcMinute;
        },
        "a few changes");
    lEvent = lClient.readUntil("}\n\n");
    EXPECT_THAT(lEvent, AllOf(HasSubstr("event: episode\n"), HasSubstr("\"kind\":\"queue-full\"")));
}

TEST_F(Outlets, APortInUseIsReportedAndANewAddressTakesEffectWithTheSettings) {
    ZTSSettings lSettings = settings();
    lSettings.mHttpListen = "127.0.0.1:0";
    ZTCOutlets& lrFirst = start(lSettings);
    waitUntil([&] { return lrFirst.getPort() != 0; }, "the server");
    const auto lpFirst = std::move(mpOutlets);
    const std::string lTaken = "127.0.0.1:" + std::to_string(lpFirst->getPort());
    lSettings.mHttpListen = lTaken;
    ZTCOutlets& lrSecond = start(lSettings);
    waitUntil([&] { return lines().find(lTaken) != std::string::npos; }, "the report");
    lSettings.mHttpListen = "127.0.0.1:0";
    lrSecond.setSettings(lSettings);
    waitUntil([&] { return lrSecond.getPort() != 0; }, "the new address");
    EXPECT_THAT(ZTCHttpClient::get(lrSecond.getPort(), "/api/v1/status"), StartsWith("HTTP/1.1 200 "));
}

TEST_F(Outlets, AHostNameThatIsAddedTakesEffectWithTheSettings) {
    ZTSSettings lSettings = settings();
    lSettings.mHttpListen = "127.0.0.1:0";
    ZTCOutlets& lrOutlets = start(lSettings);
    const auto lIsServed = [&lrOutlets] {
        try {
            return ZTCHttpClient::get(lrOutlets.getPort(), "/", "db07.example").starts_with("HTTP/1.1 200 ");
        } catch (const std::runtime_error&) {
            return false;  // the server is just made anew
        }
    };
    waitUntil([&] { return lrOutlets.getPort() != 0; }, "the server");
    ASSERT_FALSE(lIsServed());
    lSettings.mHttpHosts = {"db07.example"};
    lrOutlets.setSettings(lSettings);
    waitUntil(lIsServed, "an answer under the new name");
}

TEST_F(Outlets, WhatRetentionTookBeforeTheFileHadItIsALineWithTheirNumber) {
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    mLimits.mDays = 1;
    takeOne();
    start(lSettings);
    waitUntil([&] { return !value(scNdjsonSeq).empty(); }, "the first line");
    mpOutlets.reset();
    inTransaction([this] { store().setValue(scNdjsonSeq, value(scNdjsonSeq)); });
    // While it is away an episode closes, another comes and goes, and both are retired.
    takeOne(gcQueueFull, gcBase + gcMinute);
    closeAt(gcBase + 60 * gcMinute);
    const std::int64_t lLater = gcBase + 10 * gcDay;
    while (store().retireStep(fromMicroseconds(lLater), std::chrono::steady_clock::now())) {
    }
    ASSERT_TRUE(episodes().empty());
    takeOne(gcLink, lLater);
    start(lSettings);
    waitUntil([&] { return sParseLines(readFile(lSettings.mNdjsonPath)).size() >= 3; }, "the lines");
    mpOutlets.reset();
    const std::vector<nlohmann::json> lLines = sParseLines(readFile(lSettings.mNdjsonPath));
    ASSERT_EQ(lLines.size(), 3U);
    EXPECT_EQ(lLines[1]["kind"], "missed");
    EXPECT_EQ(lLines[1]["count"], 3);  // the end of the first, and both changes of the second
    EXPECT_EQ(lLines[2]["kind"], "link");
    EXPECT_EQ(value("outlet.ndjson.told"), "3");
    EXPECT_THAT(lines(), HasSubstr("retention removed 3 changes"));
    EXPECT_EQ(history().getValue("outlet.ndjson.missed"), "3");
}

TEST_F(Outlets, BeforeTheDatabaseIsOpenTheMetricsAreWrittenAndTheServerAnswers) {
    ZTSSettings lSettings = settings();
    lSettings.mMetricsTextfile = mDirectory.path("tavik.prom");
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    lSettings.mHttpListen = "127.0.0.1:0";
    takeOne();
    ZTCOutlets& lrOutlets = start(lSettings, false);
    waitUntil([&] { return exists(lSettings.mMetricsTextfile) && lrOutlets.getPort() != 0; }, "file and server");
    EXPECT_THAT(readFile(lSettings.mMetricsTextfile), Not(HasSubstr("tavik_events_total")));
    EXPECT_THAT(ZTCHttpClient::get(lrOutlets.getPort(), "/api/v1/events"), HasSubstr("has not opened its history yet"));
    EXPECT_FALSE(exists(lSettings.mNdjsonPath));
    lrOutlets.openHistory();
    waitUntil([&] { return exists(lSettings.mNdjsonPath); }, "the lines");
    EXPECT_THAT(ZTCHttpClient::get(lrOutlets.getPort(), "/metrics"), HasSubstr("tavik_events_total"));
}

TEST_F(Outlets, AHistoryThatCannotBeReadIsReportedAndReadLater) {
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    takeOne();
    closeStore();
    ASSERT_EQ(rename(path().c_str(), (path() + ".away").c_str()), 0);
    ZTCOutlets& lrOutlets = startWithoutStore(lSettings);
    waitUntil([&] { return lines().find("cannot read the history") != std::string::npos; }, "the report");
    ASSERT_EQ(rename((path() + ".away").c_str(), path().c_str()), 0);
    lrOutlets.wake();
    waitUntil([&] { return lines().find("works again") != std::string::npos; }, "the end of the problem");
    EXPECT_TRUE(exists(lSettings.mNdjsonPath));
}

TEST_F(Outlets, ANewHistoryInThePlaceOfADamagedOneIsFedFromItsBeginning) {
    static constexpr std::uint64_t scChanges = 200;
    ZTSSettings lSettings = settings();
    lSettings.mNdjsonPath = mDirectory.path("events.ndjson");
    for (std::uint64_t i = 0; i < scChanges; ++i) {
        take({makeQueueFull(gcPortA + i, gcBase, gcBase)});
    }
    const std::string lFormerId = store().getStoreId();
    ZTCOutlets& lrOutlets = start(lSettings);
    waitUntil([&] { return !value(scNdjsonSeq).empty(); }, "the lines of the first history");
    closeStore();
    damageHistory(path());
    waitUntil(
        [&] {
            lrOutlets.wake();
            return lines().find("cannot read the history") != std::string::npos;
        },
        "the report of the damage");
    takeOne();  // its writer sets the damaged one aside
    ASSERT_NE(store().getStoreId(), lFormerId);
    lrOutlets.wake();
    waitUntil([&] { return sParseLines(readFile(lSettings.mNdjsonPath)).size() > scChanges; },
              "the new history's line");
    const nlohmann::json lLast = sParseLines(readFile(lSettings.mNdjsonPath)).back();
    EXPECT_EQ(lLast["storeId"], store().getStoreId());
    EXPECT_EQ(lLast["kind"], "link");
}

TEST_F(Outlets, AMetricsFileWhoseFolderIsGoneIsReportedOnceAndComesBackWithIt) {
    ZTSSettings lSettings = settings();
    lSettings.mMetricsTextfile = mDirectory.path("missing/tavik.prom");
    start(lSettings);
    waitUntil([&] { return !lines().empty(); }, "the report");
    EXPECT_THAT(lines(), HasSubstr(lSettings.mMetricsTextfile));
    ASSERT_EQ(mkdir(mDirectory.path("missing").c_str(), 0700), 0);
    waitUntil([&] { return exists(lSettings.mMetricsTextfile); }, "the file", ZTCDeadline(2 * gcTestPatience));
    mpOutlets.reset();
    EXPECT_EQ(std::ranges::count(lines(), '\n'), 2);
}
