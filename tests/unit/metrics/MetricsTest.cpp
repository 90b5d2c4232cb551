#include "sensor/metrics/include/Metrics.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <sstream>

#include "sensor/client/include/ClientErrors.h"
#include "tests/support/TemporaryDirectory.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

static ZTSFcName sWwn(const char* apText) {
    return ZTSFcName::fromText(apText);
}

static ZTSInitiator sInitiator() {
    return {.mWwpn = sWwn("10:00:00:00:00:00:00:01"), .mWwnn = sWwn("20:00:00:00:00:00:00:01"), .mHost = "host7"};
}

static ZTSTotal sTotal(const char* apKind, const char* apPort, std::uint64_t aOccurrences) {
    ZTSTotal lTotal;
    lTotal.mInitiator = sInitiator();
    lTotal.mKind = findKind(apKind).value();
    if (apPort != nullptr) {
        lTotal.mRemotePort = ZTSRemotePort{.mWwpn = sWwn(apPort), .mWwnn = {}, .mFcId = {}};
    }
    lTotal.mOccurrences = aOccurrences;
    return lTotal;
}

static constexpr const char* scPortA = "50:06:01:60:00:00:00:0a";
static constexpr const char* scPortB = "50:06:01:60:00:00:00:0b";
static constexpr const char* scPortC = "50:06:01:60:00:00:00:0c";

static ZTSMetricFacts sFacts() {
    ZTSMetricFacts lFacts;
    lFacts.mStatus.mAnswer = ZTAN_Answered;
    lFacts.mStatus.mLive.emplace();
    lFacts.mStatus.mHistory.emplace();
    lFacts.mVersion = "1.2.3";
    return lFacts;
}

static std::string sTextOf(const ZTSMetricFacts& acrFacts) {
    return formatMetrics(makeMetrics(acrFacts));
}

TEST(Metrics, EventsAreCountedByInitiatorKindAndRemotePort) {
    ZTSMetricFacts lFacts = sFacts();
    lFacts.mTotals = {sTotal("queue-full", scPortA, 20000), sTotal("link", nullptr, 3)};
    lFacts.mSeriesPorts.extend(lFacts.mTotals, 10);
    const std::string lText = sTextOf(lFacts);
    EXPECT_THAT(lText, HasSubstr("# TYPE tavik_events_total counter\n"));
    EXPECT_THAT(lText, HasSubstr("tavik_events_total{initiator=\"10:00:00:00:00:00:00:01\",kind=\"queue-full\","
                                 "remote_port=\"50:06:01:60:00:00:00:0a\"} 20000\n"));
    EXPECT_THAT(lText, HasSubstr("kind=\"link\",remote_port=\"\"} 3\n"));
    EXPECT_THAT(lText, HasSubstr("\ntavik_remote_ports_other 0\n"));
}

TEST(Metrics, CountsAreExactUpToTheirLastDigit) {
    ZTSMetricFacts lFacts = sFacts();
    lFacts.mTotals = {sTotal("queue-full", nullptr, 9007199254740991)};
    EXPECT_THAT(sTextOf(lFacts), HasSubstr("} 9007199254740991\n"));
}

TEST(Metrics, PortsBeyondTheLimitShareOneSeriesAndAreCounted) {
    ZTSMetricFacts lFacts = sFacts();
    lFacts.mTotals = {sTotal("queue-full", scPortA, 1), sTotal("queue-full", scPortB, 20),
                      sTotal("queue-full", scPortC, 300)};
    lFacts.mSeriesPorts.extend(lFacts.mTotals, 1);
    const std::string lText = sTextOf(lFacts);
    EXPECT_THAT(lText, AllOf(HasSubstr("0a\"} 1\n"), HasSubstr("remote_port=\"other\"} 320\n"),
                             HasSubstr("\ntavik_remote_ports_other 2\n"), Not(HasSubstr(scPortB))));
}

TEST(Metrics, ExactlyOneStateOfAKindIsOne) {
    ZTSMetricFacts lFacts = sFacts();
    lFacts.mStatus.mLive->mKinds = {{{.mInitiator = sInitiator(), .mStates = {{"rscn", "no_rights"}}, .mWords = {}}}};
    const std::string lText = sTextOf(lFacts);
    for (const char* lpState : {"off", "listening", "failed", "no_source"}) {
        EXPECT_THAT(lText, HasSubstr("kind=\"rscn\",state=\"" + std::string(lpState) + "\"} 0\n"));
    }
    EXPECT_THAT(lText, HasSubstr("kind=\"rscn\",state=\"no_rights\"} 1\n"));
}

TEST(Metrics, WhatIsNotKnownHasNoSample) {
    ZTSMetricFacts lFacts;
    lFacts.mVersion = "1";
    const std::string lText = sTextOf(lFacts);
    EXPECT_THAT(lText, Not(HasSubstr("tavik_events_total")));
    EXPECT_THAT(lText, Not(HasSubstr("tavik_held_bytes")));
    EXPECT_THAT(lText, Not(HasSubstr("tavik_last_event_timestamp_seconds")));
    EXPECT_THAT(lText, HasSubstr("\ntavik_agent_up 0\n"));
    EXPECT_THAT(lText, HasSubstr("tavik_build_info{version=\"1\"} 1\n"));
}

TEST(Metrics, RefusalsShowEveryReasonFromZeroOn) {
    ZTSMetricFacts lFacts = sFacts();
    ZTSLedgerRow lRow;
    lRow.mInitiator = sInitiator();
    lRow.mKind = findKind("rscn").value();
    lRow.mRefused[ZTRF_TotalLimit] = 7;
    lRow.mDropped = 2;
    lFacts.mStatus.mHistory->mLedger = {lRow, lRow};
    lFacts.mLostInGaps = 5;
    const std::string lText = sTextOf(lFacts);
    EXPECT_THAT(lText, HasSubstr("reason=\"total-limit\"} 14\n"));
    EXPECT_THAT(lText, HasSubstr("reason=\"too-short\"} 0\n"));
    EXPECT_THAT(lText, HasSubstr("tavik_lost_events_total{source=\"dropped\"} 4\n"));
    EXPECT_THAT(lText, HasSubstr("tavik_lost_events_total{source=\"gap\"} 5\n"));
}

TEST(SeriesPorts, APortKeepsItsSeriesWhenOthersComeAndWhenTheLimitFalls) {
    ZTCSeriesPorts lPorts;
    const std::vector<ZTSTotal> lFirst = {sTotal("plogi", scPortC, 1)};
    const std::vector<ZTSTotal> lAll = {sTotal("plogi", scPortA, 1), sTotal("plogi", scPortB, 1),
                                        sTotal("plogi", scPortC, 1), sTotal("link", nullptr, 1)};
    EXPECT_TRUE(lPorts.extend(lFirst, 2));
    EXPECT_TRUE(lPorts.extend(lAll, 2));
    EXPECT_FALSE(lPorts.extend(lAll, 1));
    EXPECT_EQ(lPorts.toText(), std::string(scPortC) + " " + scPortA);
    const ZTCSeriesPorts lStored(lPorts.toText());
    EXPECT_TRUE(lStored.has(sWwn(scPortC)));
    EXPECT_TRUE(lStored.has(sWwn(scPortA)));
    EXPECT_FALSE(lStored.has(sWwn(scPortB)));
    EXPECT_EQ(lStored.toText(), lPorts.toText());
}

TEST(SeriesPorts, AStoredTextThatIsDamagedKeepsWhatCanBeRead) {
    EXPECT_EQ(ZTCSeriesPorts("nonsense 50:06:01:60:00:00:00:0a  50:06:01:60:00:00:00:0a 50:06").toText(), scPortA);
    EXPECT_EQ(ZTCSeriesPorts("").getSize(), 0U);
}

TEST(MetricsFile, IsReplacedWholeAndReadableByAll) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("tavik.prom");
    const mode_t lMask = umask(0077);
    writeMetricsFile(lPath, "one 1\n");
    std::ifstream lReader(lPath);
    writeMetricsFile(lPath, "two 2\n");
    umask(lMask);
    EXPECT_EQ(readFile(lPath), "two 2\n");
    // A program that has opened the file reads to the end of what it has opened.
    std::ostringstream lOld;
    lOld << lReader.rdbuf();
    EXPECT_EQ(lOld.str(), "one 1\n");
    struct stat lStatus {};
    ASSERT_EQ(stat(lPath.c_str(), &lStatus), 0);
    EXPECT_EQ(lStatus.st_mode & 0777U, 0644U);
    EXPECT_FALSE(exists(lPath + ".new"));
}

TEST(MetricsFile, AFailureLeavesTheOldFileAndNoPart) {
    const ZTCTemporaryDirectory lDirectory;
    EXPECT_THROW(writeMetricsFile(lDirectory.path("missing/tavik.prom"), "x"), ZTCSystemCallEx);
    const std::string lPath = lDirectory.path("folder");
    ASSERT_EQ(mkdir(lPath.c_str(), 0700), 0);
    EXPECT_THROW(writeMetricsFile(lPath, "x"), ZTCSystemCallEx);
    EXPECT_FALSE(exists(lPath + ".new"));
}

TEST(MetricsFile, NothingStaysOfThePartThatAKilledProcessHasLeft) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("tavik.prom");
    writeFile(lPath + ".new", "a longer text than the one that is written now 1\n");
    writeMetricsFile(lPath, "one 1\n");
    EXPECT_EQ(readFile(lPath), "one 1\n");
}
