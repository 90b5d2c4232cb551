#include "sensor/views/include/SanView.h"

#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "sensor/views/include/PathsView.h"
#include "tests/unit/store/StoreFixture.h"
#include "tests/unit/views/SanSamples.h"

using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

/// Paths out of a history.
class SanView : public ZTCStoreTest {
protected:
    void note(std::int64_t aTime, const ZTSTopology& acrTopology) {
        inTransaction([&] { ASSERT_TRUE(store().noteTopology(aTime, acrTopology)); });
    }
    ZTSSanView at(std::int64_t aTime) { return readSan(history(), fromMicroseconds(aTime)).value(); }
    std::string format(const ZTSSanView& acrView, const ZTSPathsFilter& acrFilter = {}, bool aIsEachPath = false) {
        return formatPaths(acrView,
                           {.mFilter = acrFilter, .mTime = fromMicroseconds(gcBase), .mIsEachPath = aIsEachPath},
                           mNames, 80, {});
    }

    ZTCNameBook mNames;
};

TEST_F(SanView, WithoutATopologyNothingIsKnown) {
    EXPECT_EQ(readSan(history(), fromMicroseconds(gcBase)), std::nullopt);
    const nlohmann::ordered_json lDocument = makePathsDocument(nullptr, {}, mNames, "db07", "id");
    EXPECT_EQ(lDocument["schema"], "tavik.paths/1");
    EXPECT_EQ(lDocument["luns"], nullptr);
}

TEST_F(SanView, ALostPortIsMissedUntilAMarkSaysThatThisIsMeant) {
    ZTSTopology lLess = makeSan({});
    removePort(lLess, "rport-8:0-1");
    note(gcBase - 2 * gcDay, makeSan({}));
    note(gcBase - gcMinute, lLess);
    const ZTSSanView lView = at(gcBase);
    ASSERT_THAT(lView.mFacts.mTroubles, SizeIs(1));
    EXPECT_EQ(lView.mFacts.mTroubles[0].mKind, ZTST_PathLost);
    EXPECT_EQ(lView.mFacts.mTroubles[0].mSince, fromMicroseconds(gcBase - gcMinute));
    EXPECT_EQ(at(gcBase + 5 * gcDay).mFacts.getWorst(), ZTSS_Warning);
    // After a week too, and after a month.
    for (const std::int64_t lDays : {8, 30}) {
        EXPECT_EQ(at(gcBase + lDays * gcDay).mFacts.getWorst(), ZTSS_Warning);
        EXPECT_EQ(at(gcBase + lDays * gcDay).mFacts.countLuns(ZTRD_Reduced), 4U);
        EXPECT_EQ(at(gcBase + lDays * gcDay).mFacts.mLuns[0].mExpected, 8U);
    }
    inTransaction([&] { store().setMark("before update", fromMicroseconds(gcBase + 9 * gcDay)); });
    EXPECT_EQ(at(gcBase + 30 * gcDay).mFacts.getWorst(), ZTSS_Warning);
    inTransaction([&] { store().setMark(gcBaselineMark, fromMicroseconds(gcBase + 10 * gcDay)); });
    EXPECT_EQ(at(gcBase + 10 * gcDay).mFacts.getWorst(), ZTSS_Notice);
    EXPECT_EQ(at(gcBase + 30 * gcDay).mFacts.mLuns[0].mExpected, 7U);
    EXPECT_EQ(at(gcBase + 9 * gcDay).mFacts.getWorst(), ZTSS_Warning) << "the mark came later";
    EXPECT_THAT(at(gcBase - gcDay).mFacts.mTroubles, IsEmpty());
}

TEST_F(SanView, LunsThatWereLostInTheFirstHourOfAHistoryAreMissed) {
    ZTSTopology lNothing = makeSan({.mHosts = 1, .mPortsOfAHost = 1});
    note(gcBase - 10 * gcMinute, lNothing);
    removePort(lNothing, "rport-7:0-0");
    note(gcBase - 5 * gcMinute, lNothing);
    EXPECT_EQ(at(gcBase).mFacts.countLuns(ZTRD_None), 4U);
    EXPECT_EQ(at(gcBase).mFacts.getWorst(), ZTSS_Critical);
    EXPECT_THAT(at(gcBase - 6 * gcMinute).mFacts.mTroubles, IsEmpty());
}

TEST_F(SanView, APortThatWentAndCameTwiceInAnHourFlaps) {
    const ZTSTopology lUp = makeSan({});
    ZTSTopology lDown = lUp;
    losePort(lDown, "rport-7:0-2");
    note(gcBase - gcDay, lUp);
    for (std::int64_t i = 0; i < 2; ++i) {
        note(gcBase - (10 - 4 * i) * gcMinute, lDown);
        note(gcBase - (8 - 4 * i) * gcMinute, lUp);
    }
    ASSERT_THAT(at(gcBase).mFacts.mTroubles, SizeIs(1));
    EXPECT_EQ(at(gcBase).mFacts.mTroubles[0].mKind, ZTST_Flapping);
    EXPECT_EQ(at(gcBase).mFacts.mTroubles[0].mChanges, 4U);
    EXPECT_THAT(at(gcBase + 60 * gcMinute).mFacts.mTroubles, IsEmpty());
}

TEST_F(SanView, PathsAsTextNameTheLunItsMountAndWhatDoesNotRun) {
    ZTSTopology lLess = makeSan({});
    losePort(lLess, "rport-8:0-1");
    note(gcBase, lLess);
    mNames.addName(ZTSFcName::fromText("50:06:01:60:00:00:01:01"), "array7 ctrl-B");
    const std::string lText = format(at(gcBase));
    EXPECT_THAT(lText, HasSubstr("!  mpath0"));
    EXPECT_THAT(lText, HasSubstr("7 of 8 REDUCED  /data/0"));
    EXPECT_THAT(lText, HasSubstr("!   8:0:1:0"));
    EXPECT_THAT(lText, HasSubstr("port Blocked"));
    EXPECT_THAT(lText, HasSubstr("array7 ctrl-B"));
    EXPECT_THAT(lText, Not(HasSubstr("7:0:0:0")));
    EXPECT_THAT(lText, HasSubstr(" paths: 4 LUNs, 28 of 32 paths running\n"));
    EXPECT_THAT(lText, HasSubstr("[1] PATH LOST"));
    EXPECT_THAT(format(at(gcBase), {}, true), HasSubstr("7:0:0:0"));
}

TEST_F(SanView, FiltersChooseLunsByNameNumberPortInitiatorAndTrouble) {
    ZTSTopology lLess = makeSan({});
    lLess.mPaths[9].mState = "offline";
    note(gcBase, lLess);
    const ZTSSanView lView = at(gcBase);
    const auto lCount = [&lView](const ZTSPathsFilter& acrFilter) {
        return std::ranges::count_if(lView.mFacts.mLuns,
                                     [&acrFilter](const ZTSSanLun& acrLun) { return matches(acrLun, acrFilter); });
    };
    EXPECT_EQ(lCount({}), 4);
    EXPECT_EQ(lCount({.mLuns = {"mpath1"}}), 1);
    EXPECT_EQ(lCount({.mLuns = {"2", "dm-3", "sd0-7-0"}}), 3);
    EXPECT_EQ(lCount({.mLuns = {"naa.003"}}), 1);
    EXPECT_EQ(lCount({.mLuns = {"nothing"}}), 0);
    EXPECT_EQ(lCount({.mPorts = {ZTSFcName::fromText("50:06:01:60:00:00:01:01")}}), 4);
    EXPECT_EQ(lCount({.mPorts = {ZTSFcName::fromText("50:06:01:60:00:00:01:99")}}), 0);
    // Both have to hold for one path.
    EXPECT_EQ(lCount({.mPorts = {ZTSFcName::fromText("50:06:01:60:00:00:01:01")},
                      .mInitiators = {ZTSFcName::fromText("10:00:00:00:00:00:00:07")}}),
              0);
    EXPECT_EQ(lCount({.mIsTroubleOnly = true}), 1);
}

TEST_F(SanView, TheDocumentHasEachPathWithItsPortsAndNullForWhatIsNotKnown) {
    ZTSTopology lSan = makeSan({});
    lSan.mPaths[0].mState.reset();
    note(gcBase, lSan);
    const ZTSSanView lView = at(gcBase);
    const nlohmann::ordered_json lDocument =
        makePathsDocument(&lView, {.mTime = fromMicroseconds(gcBase)}, mNames, "db07", "id");
    ASSERT_EQ(lDocument["luns"].size(), 4U);
    const nlohmann::ordered_json& lrLun = lDocument["luns"][0];
    EXPECT_EQ(lrLun["multipath"], "mpath0");
    EXPECT_EQ(lrLun["mounts"][0], "/data/0");
    EXPECT_EQ(lrLun["redundancy"], "unknown");
    EXPECT_EQ(lrLun["paths"][0]["running"], nullptr);
    EXPECT_EQ(lrLun["paths"][0]["state"], nullptr);
    EXPECT_EQ(lrLun["paths"][1]["running"], true);
    EXPECT_EQ(lrLun["paths"][1]["disk"], "sd0-7-1");
    EXPECT_EQ(lrLun["paths"][1]["initiator"]["host"], "host7");
    EXPECT_EQ(lrLun["paths"][1]["remotePort"]["wwpn"], "50:06:01:60:00:00:00:01");
    EXPECT_EQ(lDocument["troubles"].size(), 0U);
}
