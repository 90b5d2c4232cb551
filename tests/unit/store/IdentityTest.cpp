// What makes events of each kind alike, and what an episode of each kind gathers.
#include "sensor/store/src/KindShapes.h"

#include "libkpm/include/ScopeEventKinds.h"
#include "tests/unit/store/StoreFixture.h"

using IdentityTest = ZTCStoreTest;

namespace {

/// Data of one kind: two that are alike, and those that differ from them in one field of the identity each.
struct ZTSKindCase {
    ZTCKindKey mKind;
    ZTCBytes mData;
    ZTCBytes mAlike;
    std::vector<ZTCBytes> mOthers;
};

std::vector<ZTSKindCase> makeCases() {
    const ZTCBytes lGeneric = makeGenericData();
    std::vector<ZTSKindCase> lCases;
    for (const ZTCKindKey lKind : std::initializer_list<ZTCKindKey>{0x0201, 0x0420, 0x0801, 0x0802, 0x0804, 0x1001}) {
        lCases.push_back({lKind, lGeneric, lGeneric, {}});
    }
    for (const ZTCKindKey lKind : {gcPlogi, gcAdisc, gcLogo}) {
        lCases.push_back({lKind,
                          makeTwoNamesData(gcPortA, gcNode),
                          makeTwoNamesData(gcPortA, gcNode),
                          {makeTwoNamesData(gcPortB, gcNode), makeTwoNamesData(gcPortA, gcNode + 1)}});
    }
    for (const ZTCKindKey lKind : {gcPrlo, gcPortBusy}) {
        lCases.push_back({lKind, makePortData(gcPortA), makePortData(gcPortA), {makePortData(gcPortB)}});
    }
    lCases.push_back({gcLsRjt,
                      makeLsRjtData(gcPortA, 3, {{9, 0x2A}}),
                      makeLsRjtData(gcPortA, 3, {{5, 0}}),
                      {makeLsRjtData(gcPortB, 3, {{9, 0x2A}}), makeLsRjtData(gcPortA, 4, {{9, 0x2A}})}});
    lCases.push_back({gcRscn, makeRscnData(0x010203), makeRscnData(0x010203), {makeRscnData(0x010204)}});
    lCases.push_back({gcReadCheck,
                      makeReadCheckData(gcPortA, 0x28, 1, {7}),
                      makeReadCheckData(gcPortA, 0x28, 2, {8}),
                      {makeReadCheckData(gcPortB, 0x28, 1, {7}), makeReadCheckData(gcPortA, 0x2A, 1, {7})}});
    for (const ZTCKindKey lKind : {gcQueueFull, gcDeviceBusy}) {
        lCases.push_back({lKind, makeBusyData(gcPortA, {1}), makeBusyData(gcPortA, {2}), {makeBusyData(gcPortB, {1})}});
    }
    lCases.push_back({gcCheckCondition,
                      makeCheckConditionData(gcPortA, 6, 41, {1}, {40}, {0}),
                      makeCheckConditionData(gcPortA, 6, 41, {2}, {42}, {1}),
                      {makeCheckConditionData(gcPortB, 6, 41, {1}, {40}, {0}),
                       makeCheckConditionData(gcPortA, 5, 41, {1}, {40}, {0}),
                       makeCheckConditionData(gcPortA, 6, 42, {1}, {40}, {0})}});
    for (const ZTCKindKey lKind : {gcLunReset, gcTargetReset}) {
        lCases.push_back(
            {lKind, makeResetData(gcPortA, {1}), makeResetData(gcPortA, {2}), {makeResetData(gcPortB, {1})}});
    }
    lCases.push_back({gcQueueDepth,
                      makeQueueDepthData(gcPortA, {{1, 32}}),
                      makeQueueDepthData(gcPortA, {{2, 16}}),
                      {makeQueueDepthData(gcPortB, {{1, 32}})}});
    return lCases;
}

}  // namespace

TEST_F(IdentityTest, EveryKindHasARowInTheOrderOfTheCatalogue) {
    const auto lShapes = getKindShapes();
    ASSERT_EQ(lShapes.size(), gcScopeEventKinds.size());
    for (std::size_t i = 0; i < lShapes.size(); ++i) {
        EXPECT_EQ(lShapes[i].mCategory, gcScopeEventKinds[i].mDeliveredCategory) << i;
        EXPECT_EQ(lShapes[i].mSubcategory, gcScopeEventKinds[i].mDeliveredSubcategory) << i;
        EXPECT_EQ(findKind(gcScopeEventKinds[i].mpName), lShapes[i].getKey());
        EXPECT_EQ(getKindName(lShapes[i].getKey()), gcScopeEventKinds[i].mpName);
    }
}

TEST_F(IdentityTest, EveryKindJoinsWhatTheAgentComparesAndNothingElse) {
    const auto lCases = makeCases();
    ASSERT_EQ(lCases.size(), gcScopeEventKinds.size());
    for (const ZTSKindCase& lrCase : lCases) {
        SCOPED_TRACE(getKindName(lrCase.mKind));
        take({{.mKind = lrCase.mKind, .mData = lrCase.mData, .mPortName = {}},
              {.mKind = lrCase.mKind, .mData = lrCase.mAlike, .mOccurrences = 2, .mPortName = {}}});
        ZTSHistoryFilter lFilter;
        lFilter.mKinds = {lrCase.mKind};
        auto lEpisodes = episodes(lFilter);
        ASSERT_EQ(lEpisodes.size(), 1U);
        EXPECT_EQ(lEpisodes[0].mCount, 3U);
        EXPECT_FALSE(lEpisodes[0].mIsMalformed);
        for (std::size_t i = 0; i < lrCase.mOthers.size(); ++i) {
            take({{.mKind = lrCase.mKind, .mData = lrCase.mOthers[i], .mPortName = {}}});
            lEpisodes = episodes(lFilter);
            ASSERT_EQ(lEpisodes.size(), i + 2);
            EXPECT_EQ(lEpisodes.back().mCount, 1U);
        }
    }
}

TEST_F(IdentityTest, CodesAndLunsAreUnitedAndReasonsCounted) {
    take({{.mKind = gcCheckCondition,
           .mData = makeCheckConditionData(gcPortA, 6, 41, {0, 255}, {40}, {1}),
           .mPortName = {}},
          {.mKind = gcCheckCondition,
           .mData = makeCheckConditionData(gcPortA, 6, 41, {7}, {40, 42}, {0}),
           .mPortName = {}},
          {.mKind = gcLsRjt,
           .mData = makeLsRjtData(gcPortA, 3, {{9, 0x2A}, {5, 0}, {9, 0x2A}}),
           .mOccurrences = 3,
           .mPortName = {}},
          {.mKind = gcLsRjt, .mData = makeLsRjtData(gcPortA, 3, {{9, 0x2A}}), .mPortName = {}},
          {.mKind = gcReadCheck,
           .mData = makeReadCheckData(gcPortA, 0x28, 300, {7, 8, 7}),
           .mOccurrences = 3,
           .mPortName = {}},
          {.mKind = gcQueueDepth,
           .mData = makeQueueDepthData(gcPortA, {{1, 32}, {2, 16}, {1, 16}}),
           .mOccurrences = 3,
           .mPortName = {}},
          {.mKind = gcPlogi, .mData = makeTwoNamesData(gcPortA, gcNode), .mPortName = {}},
          {.mKind = gcLogo, .mData = makeTwoNamesData(gcPortA, gcPortB), .mPortName = {}}});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 6U);
    ZTSEpisodeDetail lCheck;
    lCheck.mSenseKey = 6;
    lCheck.mAsc = 41;
    lCheck.mLuns = ZTSLunSet{.mIsAll = false, .mNumbers = {0, 7, 255}};
    lCheck.mCommandCodes = {40, 42};
    lCheck.mAscqs = {0, 1};
    EXPECT_EQ(lEpisodes[0].mDetail, lCheck);
    ZTSEpisodeDetail lReject;
    lReject.mOriginalCommand = 3;
    lReject.mReasons = {{5, 0, 1}, {9, 0x2A, 3}};
    EXPECT_EQ(lEpisodes[1].mDetail, lReject);
    ZTSEpisodeDetail lReadCheck;
    lReadCheck.mOpCode = 0x28;
    lReadCheck.mLuns = ZTSLunSet{.mIsAll = false, .mNumbers = {300}};
    lReadCheck.mReasons = {{7, 0, 2}, {8, 0, 1}};
    EXPECT_EQ(lEpisodes[2].mDetail, lReadCheck);
    ZTSEpisodeDetail lDepth;
    lDepth.mLuns = ZTSLunSet{.mIsAll = false, .mNumbers = {1, 2}};
    lDepth.mReasons = {{16, 0, 2}, {32, 0, 1}};
    EXPECT_EQ(lEpisodes[3].mDetail, lDepth);
    EXPECT_EQ(lEpisodes[4].mDetail.mNodeName, makeName(gcNode));
    EXPECT_EQ(lEpisodes[5].mDetail.mPayloadPortName, makeName(gcPortB));
}

TEST_F(IdentityTest, AnEventForEveryLunIsAllLunsAndKeepsTheNumbersThatWereNamed) {
    take({makeQueueFull(gcPortA, gcBase, gcBase, 1, 9)});
    take({{.mKind = gcQueueFull, .mData = makeAllLunsBusyData(gcPortA), .mPortName = {}},
          {.mKind = gcLunReset, .mData = makeResetData(gcPortA, {0xFFFFFFFF}), .mPortName = {}}});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 2U);
    EXPECT_EQ(lEpisodes[0].mDetail.mLuns, (ZTSLunSet{.mIsAll = true, .mNumbers = {9}}));
    EXPECT_EQ(lEpisodes[1].mDetail.mLuns, (ZTSLunSet{.mIsAll = true, .mNumbers = {}}));
}

TEST_F(IdentityTest, MoreLunsThanAreKeptAreMarkedAndTheCountStaysExact) {
    std::vector<std::uint32_t> lLuns;
    for (std::uint32_t i = 0; i < gcMostOtherLuns + 1; ++i) {
        lLuns.push_back(1000 + i);
    }
    take({{.mKind = gcLunReset,
           .mData = makeResetData(gcPortA, lLuns),
           .mOccurrences = static_cast<std::uint32_t>(lLuns.size()),
           .mPortName = {}}});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 1U);
    EXPECT_EQ(lEpisodes[0].mCount, gcMostOtherLuns + 1);
    EXPECT_TRUE(lEpisodes[0].mDetail.mLuns->mHasMore);
    EXPECT_EQ(lEpisodes[0].mDetail.mLuns->mNumbers.size(), gcMostOtherLuns);
}

TEST_F(IdentityTest, MoreReasonsThanAreKeptAreCountedTogether) {
    std::vector<std::pair<std::uint32_t, std::uint32_t>> lReasons;
    for (std::uint32_t i = 0; i < gcMostReasons + 5; ++i) {
        lReasons.emplace_back(i, 0);
    }
    take({{.mKind = gcLsRjt, .mData = makeLsRjtData(gcPortA, 3, lReasons), .mPortName = {}}});
    EXPECT_EQ(episodes()[0].mDetail.mReasons.size(), gcMostReasons);
    EXPECT_EQ(episodes()[0].mDetail.mOtherReasons, 5U);
}

TEST_F(IdentityTest, DataThatDoNotFitAreCountedAndKeptApart) {
    ZTCBytes lShort = makeBusyData(gcPortA, {3});
    lShort.pop_back();
    take({{.mKind = gcQueueFull, .mData = lShort, .mOccurrences = 4, .mPortName = gcPortA},
          makeQueueFull(gcPortA, gcBase, gcBase),
          {.mKind = 0x4242, .mData = {1, 2, 3}, .mPortName = {}}});
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 3U);
    EXPECT_TRUE(lEpisodes[0].mIsMalformed);
    EXPECT_EQ(lEpisodes[0].mCount, 4U);
    EXPECT_EQ(lEpisodes[0].mDetail, ZTSEpisodeDetail{});
    EXPECT_EQ(lEpisodes[0].mRemotePort->mWwpn, makeName(gcPortA));
    EXPECT_FALSE(lEpisodes[1].mIsMalformed);
    EXPECT_TRUE(lEpisodes[2].mIsMalformed);
    EXPECT_EQ(getKindName(lEpisodes[2].mKind), "unknown-66-66");
    EXPECT_EQ(records()[2].mRecord.mEventData, (ZTCBytes{1, 2, 3}));
    closeStore();
    take({{.mKind = gcQueueFull, .mData = lShort, .mPortName = gcPortA}});
    EXPECT_EQ(episodes()[0].mCount, 5U);
}

TEST_F(IdentityTest, TheNamesOfARecordGiveThePortItsNodeName) {
    ZTSTestRecord lRecord = makeQueueFull(gcPortA, gcBase, gcBase);
    lRecord.mPortName = gcPortA;
    take({lRecord});
    EXPECT_EQ(episodes()[0].mRemotePort->mWwnn, makeName(gcNode));
}

TEST_F(IdentityTest, ThePortOfAnRscnIsWhatTheResolverKnowsAndNeverTheRecordsNames) {
    ZTSTestRecord lRscn = {.mKind = gcRscn, .mData = makeRscnData(0x010203), .mPortName = gcPortB};
    take({lRscn});
    EXPECT_EQ(episodes()[0].mRemotePort, std::nullopt);
    EXPECT_EQ(episodes()[0].mDetail.mPage, 0x010203U);
    std::vector<std::uint32_t> lAsked;
    store().setAddressResolver([&](const ZTSFcName& acrInitiator, std::uint32_t aFcId) -> std::optional<ZTSRemotePort> {
        EXPECT_EQ(acrInitiator, makeName(gcLocalPort));
        lAsked.push_back(aFcId);
        return ZTSRemotePort{.mWwpn = makeName(gcPortA), .mWwnn = makeName(gcNode), .mFcId = aFcId};
    });
    ZTSTestRecord lArea = lRscn;
    lArea.mData = makeRscnData(0x01010300);
    take({lRscn, lArea});
    EXPECT_EQ(lAsked, (std::vector<std::uint32_t>{0x010203})) << "an area has no port";
    const auto lEpisodes = episodes();
    ASSERT_EQ(lEpisodes.size(), 3U);
    EXPECT_EQ(lEpisodes[1].mRemotePort,
              (ZTSRemotePort{.mWwpn = makeName(gcPortA), .mWwnn = makeName(gcNode), .mFcId = 0x010203}));
    EXPECT_EQ(lEpisodes[2].mRemotePort, std::nullopt);
}
