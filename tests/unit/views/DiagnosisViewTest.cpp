#include "sensor/views/include/DiagnosisView.h"

#include <gmock/gmock.h>

#include <sstream>

#include "sensor/views/include/TextTable.h"
#include "tests/unit/views/ViewSamples.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

class DiagnosisView : public LocalTime {
protected:
    DiagnosisView() {
        mNames.addName(wwnOf("50:06:01:60:3b:a0:12:34"), "array7 ctrl-A");
        mDiagnosis.mFrom = mNow - std::chrono::hours(24);
        mDiagnosis.mTo = mNow;
        mDiagnosis.mTopologyScanned = mNow;
    }

    /// What the rules make of these episodes.
    void look(std::vector<ZTSEpisode> aEpisodes) {
        ZTSEvidence lEvidence;
        lEvidence.mEpisodes = std::move(aEpisodes);
        lEvidence.mUnobserved = mDiagnosis.mUnobserved;
        lEvidence.mNameRemotePort = [this](const ZTSRemotePort& acrPort) { return mNames.describe(acrPort); };
        mDiagnosis.mFindings = diagnose(lEvidence);
        mDiagnosis.mEpisodes = lEvidence.mEpisodes.size();
        for (const ZTSEpisode& lrEpisode : lEvidence.mEpisodes) {
            mDiagnosis.mOccurrences += lrEpisode.mCount;
        }
    }
    static ZTSEpisode makeScan() {
        ZTSEpisode lScan = makeQueueFullEpisode();
        lScan.mEpisode = 13;
        lScan.mKind = *findKind("check-condition");
        lScan.mCount = 7;
        lScan.mDetail.mSenseKey = 5;
        lScan.mDetail.mAsc = 0x25;
        lScan.mDetail.mAscqs = {0};
        lScan.mDetail.mCommandCodes = {0x12};
        return lScan;
    }
    std::string text(bool aIsAll = false, std::size_t aWidth = 80) const {
        return formatDiagnosis(mDiagnosis, {.mWidth = aWidth, .mHasColor = false}, aIsAll, mNow);
    }

    ZTCHistoryTime mNow = timeOf("2026-11-21T10:04:12+01:00");
    ZTCNameBook mNames;
    ZTSDiagnosis mDiagnosis;
};

TEST_F(DiagnosisView, NothingIsSaidInWords) {
    EXPECT_EQ(text(), "Nothing: no event from 20 Nov 10:04 to 10:04:12.\n");
}

TEST_F(DiagnosisView, AFindingHasItsLinesInOrder) {
    look({makeQueueFullEpisode()});
    EXPECT_THAT(text(), StartsWith("1 finding. 20,000 events in 1 episode from 20 Nov 10:04 to 10:04:12.\n\n"
                                   "[1] LUN OVERLOADED\n   where: LUNs 0,1,40 of array7 ctrl-A\n"
                                   "    when: 09:58:03 to 09:58:40\n"
                                   "    seen: 20,000 QUEUE FULL answers on LUNs 0,1,40, seen by host7.\n   means: "));
    EXPECT_THAT(text(), AllOf(HasSubstr("\n against: More than one LUN"), HasSubstr("\n    next: Look at"),
                              HasSubstr("\nevidence: episode 12 (seq 41)\n"),
                              HasSubstr("\n     see: tavik explain lun-overload\n")));
}

TEST_F(DiagnosisView, NoiseIsCountedAndShownOnRequest) {
    look({makeScan()});
    EXPECT_THAT(text(), StartsWith("Nothing: no rule sees trouble. 7 events in 1 episode"));
    EXPECT_THAT(text(), AllOf(HasSubstr("  hidden: 7 events in 1 episode, scan-noise."), Not(HasSubstr("[1]"))));
    EXPECT_THAT(text(true), AllOf(HasSubstr("[1] ANSWERS TO A DEVICE SCAN"), Not(HasSubstr("hidden"))));
}

TEST_F(DiagnosisView, WhatLimitsTheAnswerIsSaid) {
    mDiagnosis.mUnobserved = {{makeQueueFullEpisode().mInitiator, *findKind("lsrjt"), ZTKST_NoSource},
                              {makeQueueFullEpisode().mInitiator, *findKind("link"), ZTKST_NoRights}};
    mDiagnosis.mNotRunning = std::chrono::hours(3);
    mDiagnosis.mGaps = 2;
    mDiagnosis.mTopologyScanned.reset();
    mDiagnosis.mUnexplained = {{*findKind("adisc"), 2, 5}};
    EXPECT_THAT(text(), AllOf(HasSubstr("   other: No rule explains 5 adisc."), HasSubstr("did not run for 3 h"),
                              HasSubstr("2 gaps, see tavik explain gap"), HasSubstr("link (no rights)"),
                              HasSubstr("lsrjt (no source)"), HasSubstr("login-limit"), HasSubstr("link-unstable"),
                              HasSubstr("is not known")));
    EXPECT_THAT(text(), Not(HasSubstr("lun-overload")));
}

TEST_F(DiagnosisView, LinesFitTheTerminal) {
    mDiagnosis.mUnobserved = {{makeQueueFullEpisode().mInitiator, *findKind("queue-depth"), ZTKST_NoSource}};
    look({makeQueueFullEpisode(), makeScan()});
    for (const std::size_t lWidth : {60U, 80U, 300U}) {
        std::istringstream lLines(text(true, lWidth));
        for (std::string lLine; std::getline(lLines, lLine);) {
            EXPECT_LE(countCharacters(lLine), std::min<std::size_t>(lWidth, 100)) << lLine;
        }
    }
}

TEST_F(DiagnosisView, JsonHasTheFindingsWithTheirEvidence) {
    mDiagnosis.mUnobserved = {{makeQueueFullEpisode().mInitiator, *findKind("queue-depth"), ZTKST_NoSource}};
    look({makeQueueFullEpisode()});
    const auto lDocument = makeDiagnosisDocument(mDiagnosis, "db07", "abc", mNames);
    EXPECT_EQ(lDocument["schema"], "tavik.explain/1");
    EXPECT_EQ(lDocument["subject"], "window");
    EXPECT_EQ(lDocument["count"], 20000);
    ASSERT_EQ(lDocument["findings"].size(), 1U);
    const auto& lrFinding = lDocument["findings"][0];
    EXPECT_EQ(lrFinding["rule"], "lun-overload");
    EXPECT_EQ(lrFinding["severity"], "problem");
    EXPECT_EQ(lrFinding["episodes"].dump(), "[12]");
    EXPECT_EQ(lrFinding["evidence"].dump(), "[41]");
    EXPECT_EQ(lrFinding["remotePorts"][0]["name"], "array7 ctrl-A");
    EXPECT_EQ(lrFinding["initiators"][0]["host"], "host7");
    EXPECT_EQ(lrFinding["unobserved"][0]["kind"], "queue-depth");
    EXPECT_EQ(lrFinding["unobserved"][0]["state"], "no_source");
    EXPECT_TRUE(lDocument["topology"].is_object());
}
