#include "tavik/include/KindStates.h"

#include <gtest/gtest.h>

#include "libkpm/include/ScopeEventKinds.h"
#include "tests/support/FailingAllocation.h"
#include "tests/unit/tavik/support/StatusPageFixture.h"

namespace {

class KindStates : public ZTCStatusPageFixture {
protected:
    void report(unsigned aBoard, unsigned aCategory, unsigned aSubcategory, unsigned aState,
                const char* apReason = "") {
        ASSERT_NE(nullptr, mLibrary.mpReportState);
        mLibrary.mpReportState(mLibrary.mpReportContext, aBoard, aCategory, aSubcategory, aState, apReason);
    }

    /// State and reason, as "no_rights: words".
    std::string state(unsigned aBoard, const std::string& acrKind) {
        const ZTSStatusRowCopy lRow = row(aBoard, acrKind);
        const std::string lName = gcStatusStateNames[lRow.mState];
        return lRow.mStateReason.empty() ? lName : lName + ": " + lRow.mStateReason;
    }

    KindStates() { mLibrary.mTakesReport = true; }
};

}  // namespace

TEST_F(KindStates, AreOffBeforeAStartCommandAndAfterAStopCommand) {
    bringUp(2);
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_EQ("off", state(1, lcrKind.mpName));
        EXPECT_EQ(0, row(1, lcrKind.mpName).mStateSince);
    }
    startScope();
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_EQ("listening", state(1, lcrKind.mpName));
        EXPECT_LT(0, row(1, lcrKind.mpName).mStateSince);
    }
    EXPECT_EQ("off", state(1, "other"));
    requestHex("02");
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_EQ("off", state(1, lcrKind.mpName));
    }
    startScope();
    EXPECT_EQ("listening", state(1, "rscn"));
}

TEST_F(KindStates, FollowTheStatusOfARegistration) {
    bringUp();
    mLibrary.mRegisterStatuses = {
        {{0, 1, 0x01}, KPM_STATUS_INFO_5}, {{0, 1, 0x02}, KPM_STATUS_NO_SOURCE}, {{0, 1, 0x04}, KPM_STATUS_NO_RIGHTS}};
    startScope();
    EXPECT_EQ("listening", state(0, "plogi"));
    EXPECT_EQ("no_source", state(0, "prlo"));
    EXPECT_EQ("no_rights", state(0, "adisc"));
}

TEST_F(KindStates, ARefusedRegistrationIsFailedAndWhatFollowsIsOff) {
    bringUp();
    mLibrary.mRegisterStatuses[{0, 1, 0x02}] = 3;
    EXPECT_EQ(gcNotAllowedHex, requestHex("0000001000"));
    EXPECT_EQ("listening", state(0, "plogi"));
    EXPECT_EQ("failed", state(0, "prlo"));
    EXPECT_EQ("off", state(0, "adisc"));
    mLibrary.mRegisterStatuses.clear();
    startScope();
    EXPECT_EQ("listening", state(0, "prlo"));
}

TEST_F(KindStates, AHandleAloneIsListeningAndNoneIsNoSourceForTemperatureAndFailedOtherwise) {
    bringUp();
    mLibrary.mRegisterHandles[{0, 0, FC_REG_TEMPERATURE_EVENT}] = 0;
    startScope();
    EXPECT_EQ("listening", state(0, "rscn"));
    EXPECT_EQ("no_source", state(0, "temperature"));

    mSystem->getProtocolHandler()->handleUnregisterEvents();
    mLibrary.mRegisterHandles[{0, 0, FC_REG_LINK_EVENT}] = 0;
    EXPECT_EQ(gcNotAllowedHex, requestHex("0000001000"));
    EXPECT_EQ("failed", state(0, "link"));
    EXPECT_EQ("off", state(0, "temperature")) << "it comes after the link";
}

TEST_F(KindStates, AReportBeforeTheRegistrationIsTheStateOfAHandleAlone) {
    bringUp();
    report(0, 1, 0x20, KPM_STATE_NO_RIGHTS, "needs CAP_NET_ADMIN");
    report(0, 8, 0x04, KPM_STATE_NO_RIGHTS, "needs a right");
    mLibrary.mRegisterHandles[{0, 0, FC_REG_TEMPERATURE_EVENT}] = 0;
    EXPECT_EQ("off", state(0, "rscn"));
    startScope();
    EXPECT_EQ("no_rights: needs CAP_NET_ADMIN", state(0, "rscn"));
    EXPECT_EQ("no_rights: needs a right", state(0, "temperature"));
    EXPECT_EQ("listening", state(0, "link"));
}

TEST_F(KindStates, AKindWithoutAHandleIsNotListeningWhateverWasReportedBefore) {
    bringUp();
    report(0, 8, 0x02, KPM_STATE_WORKING, "");
    report(0, 8, 0x04, KPM_STATE_WORKING, "");
    mLibrary.mRegisterHandles[{0, 0, FC_REG_TEMPERATURE_EVENT}] = 0;
    startScope();
    EXPECT_EQ("no_source", state(0, "temperature"));

    mSystem->getProtocolHandler()->handleUnregisterEvents();
    mLibrary.mRegisterHandles[{0, 0, FC_REG_LINK_EVENT}] = 0;
    EXPECT_EQ(gcNotAllowedHex, requestHex("0000001000"));
    EXPECT_EQ("failed", state(0, "link"));
}

TEST_F(KindStates, AReportDuringInitIsKept) {
    // The page has no boards yet.
    mLibrary.mBeforeCounted = [this] { report(0, 8, 0x02, KPM_STATE_FAILED, "gone"); };
    bringUp();
    mLibrary.mBeforeCounted = nullptr;
    startScope();
    EXPECT_EQ("failed: gone", state(0, "link"));
}

TEST_F(KindStates, AStatusCountsMoreThanAReportBeforeItAndKeepsItsWordsWhereBothSayTheSame) {
    bringUp();
    report(0, 1, 0x01, KPM_STATE_NO_RIGHTS, "stale words");
    report(0, 1, 0x02, KPM_STATE_NO_RIGHTS, "good words");
    mLibrary.mRegisterStatuses[{0, 1, 0x02}] = KPM_STATUS_NO_RIGHTS;
    startScope();
    EXPECT_EQ("listening", state(0, "plogi"));
    EXPECT_EQ("no_rights: good words", state(0, "prlo"));
}

TEST_F(KindStates, WhereTheStatusSaysThatTheSourceMayComeLaterAReportOfAFailureIsKept) {
    bringUp();
    report(0, 4, 0x01, KPM_STATE_FAILED, "the filter cannot be set");
    mLibrary.mRegisterStatuses[{0, 4, 0x01}] = KPM_STATUS_NO_RIGHTS;
    startScope();
    EXPECT_EQ("failed: the filter cannot be set", state(0, "queue-full"));
    report(0, 4, 0x01, KPM_STATE_WORKING);
    EXPECT_EQ("listening", state(0, "queue-full"));
}

TEST_F(KindStates, AReportThatComesWhileTheRegistrationRunsCountsMoreThanItsStatus) {
    bringUp();
    mLibrary.mBeforeRegistered = [this](const ZTCRegistrationKey& acrKey) {
        if (acrKey == ZTCRegistrationKey(0, 1, 0x01)) {
            report(0, 1, 0x01, KPM_STATE_FAILED, "broke at once");
        }
    };
    startScope();
    EXPECT_EQ("failed: broke at once", state(0, "plogi"));
    EXPECT_EQ("listening", state(0, "prlo"));
}

TEST_F(KindStates, ALaterReportChangesTheStateAndItsTime) {
    collect(2);
    const std::int64_t lSince = row(1, "rscn").mStateSince;
    report(1, 1, 0x20, KPM_STATE_NO_RIGHTS, "the right was taken");
    EXPECT_EQ("no_rights: the right was taken", state(1, "rscn"));
    EXPECT_LE(lSince, row(1, "rscn").mStateSince);
    EXPECT_EQ("listening", state(0, "rscn"));
    const std::int64_t lChange = row(1, "rscn").mStateSince;
    report(1, 1, 0x20, KPM_STATE_NO_RIGHTS, "in other words");
    EXPECT_EQ("no_rights: in other words", state(1, "rscn"));
    EXPECT_EQ(lChange, row(1, "rscn").mStateSince) << "the state is the same";
    report(1, 1, 0x20, KPM_STATE_WORKING);
    EXPECT_EQ("listening", state(1, "rscn"));
    report(1, 1, 0x20, KPM_STATE_NO_SOURCE);
    EXPECT_EQ("no_source", state(1, "rscn"));
    report(1, 1, 0x20, 4711, "a state of later versions");
    EXPECT_EQ("failed: a state of later versions", state(1, "rscn"));
}

TEST_F(KindStates, ALongReasonIsCut) {
    collect();
    report(0, 1, 0x20, KPM_STATE_FAILED, std::string(4000, 'x').c_str());
    EXPECT_EQ(std::string(111, 'x'), row(0, "rscn").mStateReason);
}

TEST_F(KindStates, AReportOnWhatThereIsNotIsIgnored) {
    collect();
    const ZTSStatusSnapshot lBefore = page();
    report(1, 1, 0x20, KPM_STATE_FAILED, "no such board");
    report(0xFFFFFFFF, 1, 0x20, KPM_STATE_FAILED, "no such board");
    report(0, 4, 0x80, KPM_STATE_FAILED, "no such kind");
    const ZTSStatusSnapshot lAfter = page();
    for (unsigned lRow = 0; lRow < gcStatusRowsPerBoard; ++lRow) {
        EXPECT_EQ(lBefore.mBoards[0].mRows[lRow].mState, lAfter.mBoards[0].mRows[lRow].mState);
    }
}

TEST_F(KindStates, AReportThatFindsNoMemoryChangesNothingAndTheNextOneCounts) {
    bringUp();
    EXPECT_TRUE(failAllocation(1, [this] { report(0, 1, 0x20, KPM_STATE_FAILED, "lost"); }));
    EXPECT_TRUE(mLog.has("-E- The status page lacks a report of Libkpm: Out of Memory"));
    report(0, 1, 0x20, KPM_STATE_NO_RIGHTS, "kept");
    startScope();
    EXPECT_EQ("no_rights: kept", state(0, "rscn"));
}

TEST_F(KindStates, LossesAreRunningTotalsByName) {
    bringUp();
    ASSERT_NE(nullptr, mLibrary.mpReportLoss);
    const auto lLoss = [this](const std::string& acrName, std::uint64_t aTotal) {
        mLibrary.mpReportLoss(mLibrary.mpReportContext, acrName.c_str(), aTotal);
    };
    lLoss("messages", 1);
    lLoss("trace events", 5);
    lLoss("messages", 7);
    lLoss("messages", 6);
    ZTSStatusSnapshot lPage = page();
    ASSERT_EQ(2u, lPage.mLosses.size());
    EXPECT_EQ("messages", lPage.mLosses[0].mName);
    EXPECT_EQ(7u, lPage.mLosses[0].mTotal) << "a smaller total is ignored";
    EXPECT_EQ("trace events", lPage.mLosses[1].mName);
    EXPECT_EQ(5u, lPage.mLosses[1].mTotal);

    for (unsigned lName = 2; lName < gcStatusLosses + 3; ++lName) {
        lLoss("loss " + std::to_string(lName), 1);
    }
    lLoss("messages", 8);
    lPage = page();
    EXPECT_EQ(gcStatusLosses, lPage.mLosses.size());
    EXPECT_EQ(8u, lPage.mLosses[0].mTotal);
    EXPECT_EQ(3u, lPage.mLossesLost);
}

TEST_F(KindStates, WithoutAPageReportsAreTakenAndChangeNothing) {
    unsetenv(gcStatusPageVariable);
    collect();
    report(0, 1, 0x20, KPM_STATE_FAILED, "unseen");
    mLibrary.mpReportLoss(mLibrary.mpReportContext, "messages", 1);
    requestHex("02");
    EXPECT_FALSE(exists(pagePath()));
}

TEST_F(KindStates, AreOffWhenAllRegistrationsAreTakenBack) {
    collect();
    mSystem->getProtocolHandler()->handleUnregisterEvents();
    for (const ZTSScopeEventKind& lcrKind : gcScopeEventKinds) {
        EXPECT_EQ("off", state(0, lcrKind.mpName));
    }
}
