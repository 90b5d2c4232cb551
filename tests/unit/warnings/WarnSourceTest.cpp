#include "sensor/warnings/include/WarnSource.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <list>
#include <nlohmann/json.hpp>

#include "tests/support/TestThreads.h"
#include "tests/unit/store/StoreFixture.h"

using std::chrono::hours;
using std::chrono::minutes;
using std::chrono::seconds;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class WarnSource : public ZTCStoreTest {
protected:
    static ZTSWarnRule rule(const std::string& acrKind, seconds aWithin = seconds(300)) {
        ZTSWarnRule lRule;
        lRule.mKind = acrKind;
        lRule.mWithin = aWithin;
        return lRule;
    }
    std::vector<ZTSWarnOccurrence> read(ZTCWarnSource& arSource) {
        std::vector<ZTSWarnOccurrence> lFound = arSource.read(history(), mNow);
        for (const auto& lrValue : arSource.takeValues()) {
            inTransaction([&] { store().setValue(lrValue.first, lrValue.second); });
        }
        return lFound;
    }
    void noteRefused(std::uint64_t aCount) {
        ZTSPageCounts lCounts;
        lCounts.mWwpn = makeName(gcLocalPort);
        lCounts.mKind = gcQueueFull;
        lCounts.mReceived = lCounts.mRefused[ZTRF_TotalLimit] = aCount;
        inTransaction([&] { store().noteLedger(gcGeneration, {&lCounts, 1}); });
    }
    void noteGap(const std::string& acrReason, ZTCHistoryTime aTo) {
        ZTSGap lGap;
        lGap.mFrom = lGap.mTo = aTo;
        lGap.mReason = acrReason;
        inTransaction([&] { store().noteGap(lGap); });
    }
    static ZTSLiveState live(const char* apText) { return readLiveState(nlohmann::json::parse(apText)); }
    static std::vector<std::string> holding(const ZTSLiveState& acrLive) {
        std::vector<std::string> lKinds;
        for (const ZTSWarnOccurrence& lrState : ZTCWarnSource::findHolding(acrLive, nullptr, ZTCHistoryTime{})) {
            lKinds.push_back(lrState.mKind + ": " + lrState.mText);
        }
        return lKinds;
    }

    ZTCHistoryTime mNow = fromMicroseconds(gcBase + 10 * gcSecond);
};

TEST_F(WarnSource, EventsThatComeAreFoundOnceEachWithTheirPort) {
    ZTCWarnSource lSource({rule("queue-full")});
    EXPECT_THAT(read(lSource), IsEmpty());
    take({makeQueueFull(gcPortA, gcBase, gcBase, 5), makeQueueFull(gcPortB, gcBase, gcBase, 2)});
    take({{.mKind = gcLink, .mData = makeGenericData(), .mPortName = {}}});
    std::vector<ZTSWarnOccurrence> lFound = read(lSource);
    ASSERT_EQ(lFound.size(), 2U);
    EXPECT_EQ(lFound[0].mCount + lFound[1].mCount, 7U);
    EXPECT_EQ(lFound[0].mTime, mNow);
    ASSERT_TRUE(lFound[0].mRemotePort);
    EXPECT_EQ(lFound[0].mInitiator.mWwpn, makeName(gcLocalPort));
    EXPECT_THAT(read(lSource), IsEmpty());
    take({makeQueueFull(gcPortA, gcBase + gcSecond, gcBase + gcSecond, 1)});
    lFound = read(lSource);
    ASSERT_EQ(lFound.size(), 1U);
    EXPECT_EQ(lFound[0].mCount, 1U);
}

TEST_F(WarnSource, ANewProcessFindsWhatCameLatelyAndNotWhatIsOld) {
    take({makeQueueFull(gcPortA, gcBase - 60 * gcMinute, gcBase - 60 * gcMinute, 100)});
    take({makeQueueFull(gcPortA, gcBase - gcMinute, gcBase - gcMinute, 5)});
    ZTCWarnSource lSource({rule("queue-full")});
    const std::vector<ZTSWarnOccurrence> lFound = read(lSource);
    ASSERT_EQ(lFound.size(), 1U);
    EXPECT_EQ(lFound[0].mCount, 5U);
    EXPECT_LE(lFound[0].mTime, mNow);
    EXPECT_GE(lFound[0].mTime, mNow - minutes(2));
}

TEST_F(WarnSource, WhatIsStoredWhileANewProcessBeginsCountsOnce) {
    static constexpr std::uint64_t scEvents = 200;
    take({makeQueueFull(gcPortA, gcBase, gcBase, 1)});
    const ZTCHistory lReader(mDirectory.path());
    const ZTCTestThread lWriter([&] {
        for (std::uint64_t i = 1; i < scEvents; ++i) {
            take({makeQueueFull(gcPortA, gcBase, gcBase, 1)});
        }
    });
    std::list<ZTCWarnSource> lSources;
    std::vector<std::uint64_t> lCounts;
    const auto lAdd = [&](ZTCWarnSource& arSource, std::uint64_t& arCount) {
        for (const ZTSWarnOccurrence& lrOccurrence : arSource.read(lReader, mNow)) {
            arCount += lrOccurrence.mCount;
        }
    };
    while (lWriter.isRunning()) {
        lAdd(lSources.emplace_back(std::vector{rule("queue-full")}), lCounts.emplace_back());
    }
    ASSERT_FALSE(lSources.empty());
    std::size_t lIndex = 0;
    for (ZTCWarnSource& lrSource : lSources) {
        lAdd(lrSource, lCounts[lIndex]);
        EXPECT_EQ(lCounts[lIndex], scEvents) << "the source that began as number " << lIndex;
        ++lIndex;
    }
}

TEST_F(WarnSource, AGapIsFoundOnceEvenWhereANewProcessWroteItBeforeItLooked) {
    noteGap("an old one", mNow - hours(100));
    {
        ZTCWarnSource lSource({rule("gap")});
        EXPECT_THAT(read(lSource), IsEmpty());
        noteGap("killed", mNow);
        const std::vector<ZTSWarnOccurrence> lFound = read(lSource);
        ASSERT_EQ(lFound.size(), 1U);
        EXPECT_THAT(lFound[0].mText, HasSubstr("killed"));
        EXPECT_THAT(read(lSource), IsEmpty());
    }
    noteGap("the host was down", mNow - hours(50));
    ZTCWarnSource lNext({rule("gap")});
    const std::vector<ZTSWarnOccurrence> lFound = read(lNext);
    ASSERT_EQ(lFound.size(), 1U);
    EXPECT_THAT(lFound[0].mText, HasSubstr("the host was down"));
}

TEST_F(WarnSource, RefusalsAreCountedFromTheFirstLookOnAndOverRestarts) {
    noteRefused(1000);
    {
        ZTCWarnSource lSource({rule("refused")});
        EXPECT_THAT(read(lSource), IsEmpty());
        noteRefused(1010);
        const std::vector<ZTSWarnOccurrence> lFound = read(lSource);
        ASSERT_EQ(lFound.size(), 1U);
        EXPECT_EQ(lFound[0].mCount, 10U);
        EXPECT_EQ(lFound[0].mInitiator.mWwpn, makeName(gcLocalPort));
    }
    noteRefused(1030);
    ZTCWarnSource lNext({rule("refused")});
    const std::vector<ZTSWarnOccurrence> lFound = read(lNext);
    ASSERT_EQ(lFound.size(), 1U);
    EXPECT_EQ(lFound[0].mCount, 20U);
}

TEST_F(WarnSource, NothingHoldsWhereNothingIsKnown) {
    EXPECT_THAT(holding(live("{}")), IsEmpty());
    for (const char* const lpKind : {"deaf", "agent-down", "disk-full", "path-lost"}) {
        EXPECT_TRUE(ZTCWarnSource::isState(lpKind));
        EXPECT_FALSE(ZTCWarnSource::isKnown(live("{}"), nullptr, lpKind));
    }
    EXPECT_FALSE(ZTCWarnSource::isState("gap"));
}

TEST_F(WarnSource, AKindThatFailedOrHasNoRightsIsDeafAndOneWithoutASourceIsNot) {
    EXPECT_THAT(holding(live(R"({"kinds": [{"initiator": {"wwpn": "10:00:00:00:c9:00:00:01"},
        "kinds": {"rscn": "no_rights", "link": "failed", "temperature": "no_source", "plogi": "listening"}}]})")),
                ElementsAre("deaf: events of these kinds do not reach the agent: rscn no_rights, link failed"));
}

TEST_F(WarnSource, AnAgentIsDownUnlessItWaitsForAdapters) {
    EXPECT_THAT(holding(live(R"({"keeper": {"state": "waiting-to-restart"}, "agent": {"problem": "killed"}})")),
                ElementsAre("agent-down: killed"));
    EXPECT_THAT(holding(live(R"({"keeper": {"state": "waiting-for-adapters"}, "agent": {"endReason": "no-library"}})")),
                ElementsAre("agent-down: the agent does not run"));
    EXPECT_THAT(
        holding(live(R"({"keeper": {"state": "waiting-for-adapters"}, "agent": {"endReason": "no-adapters"}})")),
        IsEmpty());
    EXPECT_THAT(holding(live(R"({"keeper": {"state": "running"}})")), IsEmpty());
}

TEST_F(WarnSource, AFullAndAReadOnlyDiskHold) {
    for (const char* const lpDisk : {"full", "read-only"}) {
        const std::string lText = std::string(R"({"collector": {"diskProblem": "why", "disk": ")") + lpDisk + "\"}}";
        EXPECT_THAT(holding(live(lText.c_str())), ElementsAre("disk-full: why"));
    }
    EXPECT_THAT(holding(live(R"({"collector": {"disk": "ok"}})")), IsEmpty());
}

TEST_F(WarnSource, ALostPortAndADownLinkHoldButNoticesDoNot) {
    ZTSSanFacts lSan;
    const ZTSInitiator lInitiator{.mWwpn = {}, .mWwnn = {}, .mHost = "host8"};
    lSan.mTroubles.push_back({.mKind = ZTST_PathLost,
                              .mSeverity = ZTSS_Warning,
                              .mInitiators = {lInitiator},
                              .mRemotePorts = {ZTSRemotePort{makeName(gcPortB), {}, {}}},
                              .mState = "Not Present"});
    lSan.mTroubles.push_back(
        {.mKind = ZTST_LinkDown, .mSeverity = ZTSS_Warning, .mInitiators = {lInitiator}, .mState = "Linkdown"});
    lSan.mTroubles.push_back({.mKind = ZTST_LinkDown, .mSeverity = ZTSS_Notice, .mInitiators = {lInitiator}});
    lSan.mTroubles.push_back({.mKind = ZTST_UselessPort, .mSeverity = ZTSS_Warning});
    const std::vector<ZTSWarnOccurrence> lFound = ZTCWarnSource::findHolding(live("{}"), &lSan, mNow);
    ASSERT_EQ(lFound.size(), 2U);
    EXPECT_EQ(lFound[0].mRemotePort.value().mWwpn, makeName(gcPortB));
    EXPECT_EQ(lFound[1].mInitiator.mHost, "host8");
    EXPECT_TRUE(ZTCWarnSource::isKnown(live("{}"), &lSan, "path-lost"));
    EXPECT_FALSE(ZTCWarnSource::isKnown(live("{}"), nullptr, "path-lost"));
}
