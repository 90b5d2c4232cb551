// When Tavik ran and listened; names; marks and values.
#include "tests/unit/store/StoreFixture.h"

namespace {

class CoverageTest : public ZTCStoreTest {
protected:
    static ZTCHistoryTime at(int aMinutes) { return fromMicroseconds(gcBase + aMinutes * gcMinute); }
    void note(int aMinutes, const std::vector<std::pair<ZTCKindKey, ZTEKindState>>& acrStates) {
        std::vector<ZTSKindStateNow> lStates;
        for (const auto& [lKind, lState] : acrStates) {
            lStates.push_back({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mKind = lKind, .mState = lState});
        }
        inTransaction([&] { store().noteCoverage(at(aMinutes), lStates); });
    }
    std::vector<std::string> intervals() {
        std::vector<std::string> lTexts;
        for (const ZTSCoverage& lrInterval : history().readCoverage()) {
            lTexts.push_back(getKindName(lrInterval.mKind) + " " + getKindStateName(lrInterval.mState) + " " +
                             std::to_string((toMicroseconds(lrInterval.mFrom) - gcBase) / gcMinute) + "-" +
                             std::to_string((toMicroseconds(lrInterval.mTo) - gcBase) / gcMinute) +
                             (lrInterval.mIsOpen ? " open" : ""));
        }
        return lTexts;
    }
};

}  // namespace

TEST_F(CoverageTest, AnIntervalLastsUntilTheStateChanges) {
    inTransaction([&] { store().beginRun(at(0)); });
    note(0, {{gcLink, ZTKST_Off}, {gcRscn, ZTKST_Listening}});
    note(1, {{gcLink, ZTKST_Listening}, {gcRscn, ZTKST_Listening}});
    note(2, {{gcLink, ZTKST_Listening}});
    inTransaction([&] { store().noteRunning(at(9)); });
    EXPECT_EQ(intervals(), (std::vector<std::string>{"link off 0-1", "rscn listening 0-2", "link listening 1-9 open"}));
}

TEST_F(CoverageTest, ARunThatVanishedEndsWhereItWasLastSeen) {
    inTransaction([&] { store().beginRun(at(0)); });
    note(0, {{gcLink, ZTKST_Listening}});
    inTransaction([&] { store().noteRunning(at(5)); });
    closeStore();
    inTransaction([&] { store().beginRun(at(60)); });
    note(61, {{gcLink, ZTKST_NoRights}});
    inTransaction([&] { store().endRun(at(70)); });
    EXPECT_EQ(intervals(), (std::vector<std::string>{"link listening 0-5", "link no_rights 61-70"}));
    const auto lRuns = history().readRuns();
    ASSERT_EQ(lRuns.size(), 2U);
    EXPECT_EQ(lRuns[0].mTo, at(5));
    EXPECT_TRUE(lRuns[0].mIsOpen) << "it did not end in order";
    EXPECT_EQ(lRuns[1].mFrom, at(60));
    EXPECT_FALSE(lRuns[1].mIsOpen);
    EXPECT_EQ(history().readCoverage(at(6)).size(), 1U);
    EXPECT_EQ(history().readCoverage(std::nullopt, at(6)).size(), 1U);
}

TEST_F(CoverageTest, AnOpenIntervalGoesOnAfterARollback) {
    inTransaction([&] { store().beginRun(at(0)); });
    note(0, {{gcLink, ZTKST_Listening}});
    {
        const ZTCStoreTransaction lTransaction = store().begin();
        store().noteCoverage(at(3), {});
    }
    note(4, {{gcLink, ZTKST_Listening}});
    inTransaction([&] { store().noteRunning(at(5)); });
    EXPECT_EQ(intervals(), (std::vector<std::string>{"link listening 0-5 open"}));
}

TEST_F(CoverageTest, NamesAreMergedAndNeverForgotten) {
    inTransaction([&] {
        store().noteInitiator({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mHost = "host7"});
        store().noteRemotePort({.mWwpn = makeName(gcPortA), .mWwnn = {}, .mFcId = 0x010200});
    });
    take({makeQueueFull(gcPortA, gcBase, gcBase)});
    inTransaction([&] {
        store().noteInitiator({.mWwpn = makeName(gcLocalPort), .mWwnn = {}, .mHost = {}});
        store().noteRemotePort({.mWwpn = makeName(gcPortA), .mWwnn = makeName(gcNode), .mFcId = {}});
    });
    const ZTSEpisode lEpisode = episodes()[0];
    EXPECT_EQ(lEpisode.mInitiator,
              (ZTSInitiator{.mWwpn = makeName(gcLocalPort), .mWwnn = makeName(gcLocalNode), .mHost = "host7"}));
    EXPECT_EQ(lEpisode.mRemotePort,
              (ZTSRemotePort{.mWwpn = makeName(gcPortA), .mWwnn = makeName(gcNode), .mFcId = 0x010200}));
    EXPECT_EQ(history().readInitiators().size(), 1U);
    EXPECT_EQ(history().readRemotePorts().size(), 1U);
}

TEST_F(CoverageTest, MarksAndValuesAreKept) {
    inTransaction([&] {
        store().setMark("after the switch", at(9));
        store().setMark("before", at(1));
        store().setMark("after the switch", at(7));
        store().setValue("cursor", "12");
        store().setValue("cursor", "13");
    });
    const auto lMarks = history().readMarks();
    ASSERT_EQ(lMarks.size(), 2U);
    EXPECT_EQ(lMarks[0].mName, "before");
    EXPECT_EQ(lMarks[1].mTime, at(7));
    EXPECT_EQ(store().getValue("cursor"), "13");
    EXPECT_EQ(history().getValue("cursor"), "13");
    EXPECT_EQ(history().getValue("none"), "");
}
