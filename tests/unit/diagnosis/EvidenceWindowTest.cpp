#include "sensor/diagnosis/include/EvidenceWindow.h"

#include <gmock/gmock.h>

#include "tests/unit/store/StoreFixture.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

class EvidenceWindow : public ZTCStoreTest {
protected:
    static ZTCHistoryTime at(int aMinutes) { return fromMicroseconds(gcBase + aMinutes * gcMinute); }
    ZTSEvidenceWindow gather(int aFrom, int aTo) { return gatherEvidence(history(), at(aFrom), at(aTo)); }
    void noteStates(int aMinutes, const std::vector<std::pair<ZTCKindKey, ZTEKindState>>& acrStates) {
        std::vector<ZTSKindStateNow> lStates;
        for (const auto& [lKind, lState] : acrStates) {
            lStates.push_back({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mKind = lKind, .mState = lState});
        }
        inTransaction([&] { store().noteCoverage(at(aMinutes), lStates); });
    }
    void noteInitiator(int aMinutes, std::optional<ZTSFcName> aFabric) {
        ZTSTopology lTopology;
        ZTSTopologyInitiator& lrInitiator = lTopology.mInitiators.emplace_back();
        lrInitiator.mHost = "host7";
        lrInitiator.mWwpn = makeName(gcLocalPort);
        lrInitiator.mFabric = aFabric;
        inTransaction([&] { EXPECT_TRUE(store().noteTopology(toMicroseconds(at(aMinutes)), lTopology)); });
    }
};

TEST_F(EvidenceWindow, AnEmptyHistoryIsNoEvidenceAndTavikDidNotRun) {
    const ZTSEvidenceWindow lWindow = gather(0, 60);
    EXPECT_THAT(lWindow.mEvidence.mEpisodes, IsEmpty());
    EXPECT_FALSE(lWindow.mEvidence.mTopology);
    EXPECT_FALSE(lWindow.mTopologyScanned);
    EXPECT_EQ(lWindow.mNotRunning, std::chrono::minutes(60));
    EXPECT_FALSE(lWindow.mIsCut);
}

TEST_F(EvidenceWindow, EpisodesThatOverlapTheTimeAreEvidence) {
    for (const int lMinute : {0, 10, 20}) {
        const std::int64_t lTime = gcBase + lMinute * gcMinute;
        take({makeQueueFull(gcPortA, lTime, lTime + gcMinute)});
    }
    const ZTSEvidenceWindow lWindow = gather(11, 15);
    ASSERT_THAT(lWindow.mEvidence.mEpisodes, SizeIs(1));
    EXPECT_EQ(lWindow.mEvidence.mEpisodes[0].mFirst, at(10));
}

TEST_F(EvidenceWindow, OfTooManyEpisodesTheNewestCountAndTheTimeBeginsWithThem) {
    std::vector<ZTSTestRecord> lRecords;
    for (std::uint64_t i = 0; i <= gcMostEvidenceEpisodes; ++i) {
        const std::int64_t lTime = gcBase + gcMinute + static_cast<std::int64_t>(i);
        lRecords.push_back(makeQueueFull(gcPortA + i, lTime, lTime));
    }
    take(lRecords);
    const ZTSEvidenceWindow lWindow = gather(0, 60);
    EXPECT_TRUE(lWindow.mIsCut);
    EXPECT_THAT(lWindow.mEvidence.mEpisodes, SizeIs(gcMostEvidenceEpisodes));
    EXPECT_EQ(lWindow.mEvidence.mFrom, fromMicroseconds(gcBase + gcMinute + 1)) << "the oldest one is left out";
}

TEST_F(EvidenceWindow, ARunThatGoesOnBehindTheTimeCountsAsFarAsTheTimeGoes) {
    inTransaction([&] { store().beginRun(at(10)); });
    inTransaction([&] { store().noteRunning(at(60)); });
    EXPECT_EQ(gather(0, 20).mNotRunning, std::chrono::minutes(10));
}

TEST_F(EvidenceWindow, ARunThatBeginsBehindTheTimeChangesNothing) {
    inTransaction([&] { store().beginRun(at(0)); });
    inTransaction([&] { store().endRun(at(20)); });
    inTransaction([&] { store().beginRun(at(60)); });
    inTransaction([&] { store().noteRunning(at(90)); });
    EXPECT_EQ(gather(0, 20).mNotRunning, std::chrono::minutes(0));
    EXPECT_EQ(gather(0, 30).mNotRunning, std::chrono::minutes(10));
}

TEST_F(EvidenceWindow, OnlyTheLatestStateOfAKindCountsAndListeningIsNone) {
    inTransaction([&] { store().beginRun(at(0)); });
    noteStates(0, {{gcLink, ZTKST_Off}, {gcRscn, ZTKST_NoRights}, {gcPlogi, ZTKST_NoSource}});
    noteStates(5, {{gcLink, ZTKST_Failed}, {gcRscn, ZTKST_Listening}, {gcPlogi, ZTKST_NoSource}});
    inTransaction([&] { store().noteRunning(at(20)); });
    std::vector<std::string> lTexts;
    for (const ZTSUnobserved& lrUnobserved : gather(0, 20).mEvidence.mUnobserved) {
        lTexts.push_back(getKindName(lrUnobserved.mKind) + " " + getKindStateName(lrUnobserved.mState));
    }
    EXPECT_THAT(lTexts, ElementsAre("plogi no_source", "link failed"));
    EXPECT_EQ(gather(0, 20).mNotRunning, std::chrono::minutes(0));
    EXPECT_EQ(gather(10, 30).mNotRunning, std::chrono::minutes(10));
}

TEST_F(EvidenceWindow, AFabricThatIsNotShownWhileTheLinkIsDownIsTheOneBefore) {
    const ZTSFcName lFabric = makeName(0x100000051E000001);
    noteInitiator(0, lFabric);
    take({{.mKind = gcLink,
           .mData = makeGenericData(),
           .mBegin = gcBase + 5 * gcMinute,
           .mEnd = gcBase + 5 * gcMinute,
           .mOccurrences = 1,
           .mPortName = std::nullopt}});
    noteInitiator(6, std::nullopt);
    const ZTSEvidenceWindow lWindow = gather(1, 10);
    ASSERT_TRUE(lWindow.mEvidence.mTopology);
    EXPECT_EQ(lWindow.mEvidence.mTopology->mInitiators.at(0).mFabric, lFabric);
    EXPECT_EQ(lWindow.mTopologyScanned, at(6));
}

TEST_F(EvidenceWindow, CountersOfTheTimeAreEvidence) {
    for (const int lMinute : {0, 10, 20}) {
        const ZTSCounterSample lSample{.mMinute = gcBase + lMinute * gcMinute,
                                       .mInitiator = makeName(gcLocalPort),
                                       .mRemotePort = std::nullopt,
                                       .mCounter = "invalid_crc_count",
                                       .mDifference = static_cast<std::uint64_t>(lMinute + 1)};
        inTransaction([&] { store().noteCounters({&lSample, 1}); });
    }
    const std::vector<ZTSCounterRise> lRises = gather(5, 15).mEvidence.mCounters;
    ASSERT_THAT(lRises, SizeIs(1));
    EXPECT_EQ(lRises[0].mDifference, 11U);
    EXPECT_EQ(lRises[0].mMinute, at(10));
}

TEST_F(EvidenceWindow, GapsOfTheTimeAreCounted) {
    for (const int lMinute : {0, 10, 20}) {
        ZTSGap lGap;
        lGap.mFrom = at(lMinute);
        lGap.mTo = at(lMinute + 1);
        lGap.mReason = "the agent was killed";
        lGap.mGeneration = std::to_string(lMinute);
        inTransaction([&] { EXPECT_TRUE(store().noteGap(lGap)); });
    }
    EXPECT_THAT(gather(5, 15).mGaps, SizeIs(1));
}
