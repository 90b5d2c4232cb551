#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "sensor/views/include/DiffView.h"
#include "sensor/views/include/FilterText.h"
#include "sensor/views/include/TimeText.h"
#include "tests/unit/store/StoreFixture.h"
#include "tests/unit/views/SanSamples.h"

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

/// "what: before -> after" of each change.
static std::vector<std::string> sDescribe(const std::vector<ZTSDiffChange>& acrChanges) {
    std::vector<std::string> lTexts;
    for (const ZTSDiffChange& lrChange : acrChanges) {
        lTexts.push_back(std::string(getDiffThingName(lrChange.mSubject.mThing)) + ": " +
                         lrChange.mBefore.value_or("-") + " -> " + lrChange.mAfter.value_or("-"));
    }
    return lTexts;
}

TEST(Diff, TheSameTopologyHasNoChange) {
    EXPECT_THAT(compareTopologies(makeSan({}), makeSan({})), IsEmpty());
    EXPECT_THAT(compareTopologies({}, {}), IsEmpty());
}

TEST(Diff, ALostPortIsTheChangeOfThePortAndOfEachPathBehindIt) {
    ZTSTopology lAfter = makeSan({});
    removePort(lAfter, "rport-8:0-1");
    const std::vector<ZTSDiffChange> lChanges = compareTopologies(makeSan({}), lAfter);
    EXPECT_THAT(sDescribe(lChanges), ElementsAre("remotePort: Online -> Not Present", "path: running -> -",
                                                 "path: running -> -", "path: running -> -", "path: running -> -"));
    EXPECT_EQ(lChanges[0].mSubject.mInitiator.value().mHost, "host8");
    EXPECT_EQ(lChanges[1].mSubject.mLunName, "mpath0");
}

TEST(Diff, ALunThatWasUnmappedIsOneChange) {
    ZTSTopology lAfter = makeSan({});
    std::erase_if(lAfter.mPaths, [](const ZTSTopologyPath& acrPath) { return acrPath.mWwid == "naa.001"; });
    EXPECT_THAT(sDescribe(compareTopologies(makeSan({}), lAfter)), ElementsAre("lun: 8 paths -> -"));
    EXPECT_THAT(sDescribe(compareTopologies(lAfter, makeSan({}))), ElementsAre("lun: - -> 8 paths"));
}

TEST(Diff, ALinkThatIsDownIsAChange) {
    ZTSTopology lAfter = makeSan({.mLuns = 0});
    lAfter.mInitiators[0].mState = "Linkdown";
    EXPECT_THAT(sDescribe(compareTopologies(makeSan({.mLuns = 0}), lAfter)), ElementsAre("link: Online -> Linkdown"));
}

TEST(Diff, ARestartThatRenumbersHostsAndRenamesDisksIsNoChange) {
    ZTSTopology lAfter = makeSan({});
    for (ZTSTopologyInitiator& lrPort : lAfter.mInitiators) {
        lrPort.mHost += "0";
    }
    for (ZTSTopologyRemotePort& lrPort : lAfter.mRemotePorts) {
        lrPort.mHost += "0";
        lrPort.mName = "rport-x" + lrPort.mName;
    }
    for (ZTSTopologyPath& lrPath : lAfter.mPaths) {
        lrPath.mHost += "0";
        lrPath.mRemotePort = "rport-x" + lrPath.mRemotePort;
        lrPath.mDisk = *lrPath.mDisk + "b";
    }
    EXPECT_THAT(compareTopologies(makeSan({}), lAfter), IsEmpty());
}

TEST(Diff, AStateThatIsNotKnownIsNoChange) {
    ZTSTopology lAfter = makeSan({});
    lAfter.mInitiators[0].mState.reset();
    lAfter.mPaths[0].mState.reset();
    EXPECT_THAT(compareTopologies(makeSan({}), lAfter), IsEmpty());
}

TEST(Diff, RatesDifferOnlyWhereChanceDoesNotExplainIt) {
    EXPECT_FALSE(areRatesDifferent(0, 1, 0, 1));
    EXPECT_FALSE(areRatesDifferent(0, 1, 9, 1));
    EXPECT_TRUE(areRatesDifferent(0, 1, 10, 1));
    EXPECT_TRUE(areRatesDifferent(10, 1, 0, 1));
    EXPECT_FALSE(areRatesDifferent(10, 1, 20, 1));
    EXPECT_FALSE(areRatesDifferent(1000, 1, 1900, 1));
    EXPECT_TRUE(areRatesDifferent(1000, 1, 2000, 1));
    EXPECT_FALSE(areRatesDifferent(100, 10, 10, 1));
    EXPECT_TRUE(areRatesDifferent(100, 10, 100, 1));
}

/// Two moments an hour apart in a history.
class DiffOfAHistory : public ZTCStoreTest {
protected:
    static constexpr std::int64_t scFrom = gcBase;
    static constexpr std::int64_t scTo = gcBase + 60 * gcMinute;

    void note(std::int64_t aTime, const ZTSTopology& acrTopology) {
        inTransaction([&] { ASSERT_TRUE(store().noteTopology(aTime, acrTopology)); });
    }
    ZTSDiff diff() {
        return makeDiff(history(), {.mFrom = {.mTime = fromMicroseconds(scFrom), .mMark = "before update"},
                                    .mTo = {.mTime = fromMicroseconds(scTo), .mMark = ""}});
    }
    std::string format(const ZTSDiff& acrDiff) const { return formatDiff(acrDiff, mNames, 80, {}); }

    ZTCNameBook mNames;
};

TEST_F(DiffOfAHistory, ALinkThatWentDownAndCameBackIsTheSameAndIsNamed) {
    const ZTSTopology lUp = makeSan({});
    ZTSTopology lDown = lUp;
    lDown.mInitiators[1].mState = "Linkdown";
    for (const char* lpPort : {"0", "1", "2", "3"}) {
        losePort(lDown, std::string("rport-8:0-") + lpPort);
    }
    note(scFrom - gcMinute, lUp);
    note(scFrom + gcMinute, lDown);
    note(scFrom + 2 * gcMinute, lUp);
    const ZTSDiff lDiff = diff();
    EXPECT_TRUE(lDiff.isSame());
    ASSERT_THAT(lDiff.mPassing, SizeIs(5)) << format(lDiff);  // the link and its ports; their paths follow
    EXPECT_EQ(lDiff.mPassing[0].mSubject.mThing, ZTDF_Link);
    ASSERT_THAT(lDiff.mPassing[0].mStates, SizeIs(2));
    EXPECT_EQ(lDiff.mPassing[0].mStates[0].second, "Linkdown");
    EXPECT_EQ(lDiff.mPassing[0].mStates[1].second, "Online");
    EXPECT_THAT(format(lDiff), HasSubstr("  diff: SAME\n"));
}

TEST_F(DiffOfAHistory, ATargetThatIsGoneIsADifferenceWithItsPathsInOneRow) {
    note(scFrom - gcMinute, makeSan({}));
    ZTSTopology lNow = makeSan({});
    removePort(lNow, "rport-8:0-1");
    note(scFrom + gcMinute, lNow);
    mNames.addName(ZTSFcName::fromText("50:06:01:60:00:00:01:01"), "array7 ctrl-B");
    const ZTSDiff lDiff = diff();
    EXPECT_FALSE(lDiff.isSame());
    EXPECT_THAT(lDiff.mPassing, IsEmpty());
    const std::string lText = format(lDiff);
    EXPECT_THAT(lText, HasSubstr("  mark \"before update\"\n"));
    EXPECT_THAT(lText, HasSubstr("  diff: DIFFERENT: 5 states, 0 rates\n"));
    EXPECT_THAT(lText, HasSubstr("\nremote port  array7 ctrl-B from host8        Online   Not Present\n"));
    EXPECT_THAT(lText, HasSubstr("\npath         4 LUNs by host8, array7 ctrl-B  running  -\n")) << lText;
    const nlohmann::ordered_json lDocument = makeDiffDocument(lDiff, mNames, "db07", "id");
    EXPECT_EQ(lDocument["schema"], "tavik.diff/1");
    EXPECT_EQ(lDocument["same"], false);
    EXPECT_EQ(lDocument["from"]["mark"], "before update");
    EXPECT_EQ(lDocument["changes"][0]["what"], "remotePort");
    EXPECT_EQ(lDocument["changes"][0]["after"], "Not Present");
    EXPECT_EQ(lDocument["changes"][1]["after"], nullptr);
    EXPECT_EQ(lDocument["changes"].size(), 5U);
}

TEST_F(DiffOfAHistory, ARateThatRoseIsADifference) {
    note(scFrom - gcMinute, makeSan({}));
    take({makeQueueFull(gcPortA, scFrom - 10 * gcMinute, scFrom - 10 * gcMinute, 3)}, scFrom);
    take({makeQueueFull(gcPortA, scFrom + 10 * gcMinute, scFrom + 10 * gcMinute, 5)}, scTo);
    ZTSDiff lDiff = diff();
    ASSERT_THAT(lDiff.mRates, SizeIs(1));
    EXPECT_TRUE(lDiff.isSame());
    EXPECT_THAT(format(lDiff), HasSubstr("\n1 more rate does not differ: tavik --json diff\n"));
    take({makeQueueFull(gcPortA, scFrom + 11 * gcMinute, scFrom + 11 * gcMinute, 500)}, scTo);
    lDiff = diff();
    EXPECT_FALSE(lDiff.isSame());
    EXPECT_EQ(lDiff.mRates[0].mBefore, 3U);
    EXPECT_EQ(lDiff.mRates[0].mAfter, 505U);
    EXPECT_THAT(format(lDiff), HasSubstr("\nqueue-full"));
    EXPECT_THAT(format(lDiff), HasSubstr("3.0  505.0"));
}

TEST_F(DiffOfAHistory, AStormThatEndedBeforeTheMarkOfTheSameMinuteIsNoDifference) {
    note(scFrom - gcMinute, makeSan({}));
    const std::int64_t lStorm = scFrom - scFrom % gcMinute + 1;
    const std::int64_t lMark = lStorm + gcMinute / 2;
    take({makeQueueFull(gcPortA, lStorm, lStorm + 9, 500)}, lStorm + 9);
    const auto lDiff = [&] {
        return makeDiff(history(), {.mFrom = {.mTime = fromMicroseconds(lMark), .mMark = "a"},
                                    .mTo = {.mTime = fromMicroseconds(lMark + 9), .mMark = ""}});
    };
    EXPECT_TRUE(lDiff().isSame());
    ASSERT_THAT(lDiff().mRates, SizeIs(1));
    EXPECT_EQ(lDiff().mRates[0].mBefore, 500U);
    EXPECT_EQ(lDiff().mRates[0].mAfter, 0U);
    take({makeQueueFull(gcPortA, lMark + 1, lMark + 5, 500)}, lMark + 9);
    EXPECT_FALSE(lDiff().isSame());
}

TEST_F(DiffOfAHistory, TheTextAndTheDocumentSayWhereTheMinutesThatWereCountedEnd) {
    constexpr std::int64_t lTo = scTo + 30 * gcSecond;
    take({makeQueueFull(gcPortA, lTo + 20 * gcSecond, lTo + 20 * gcSecond, 500)}, lTo + gcMinute);
    const ZTSDiff lDiff = makeDiff(history(), {.mFrom = {.mTime = fromMicroseconds(scFrom + 5 * gcSecond), .mMark = ""},
                                               .mTo = {.mTime = fromMicroseconds(lTo), .mMark = ""}});
    ASSERT_THAT(lDiff.mRates, SizeIs(1));
    EXPECT_EQ(lDiff.mRates[0].mAfter, 500U) << "they came in the minute of the end";
    const auto lTime = [](std::int64_t aTime) {
        return formatShortTime(fromMicroseconds(aTime), fromMicroseconds(lTo));
    };
    EXPECT_THAT(format(lDiff), HasSubstr(" rates: of the 1 h up to " + lTime(scFrom) + ", and of the 1 h up to " +
                                         lTime(scTo + gcMinute) + "\n"));
    const nlohmann::ordered_json lDocument = makeDiffDocument(lDiff, mNames, "db07", "id");
    EXPECT_EQ(lDocument["endBefore"], toRfc3339(fromMicroseconds(scFrom)));
    EXPECT_EQ(lDocument["endAfter"], toRfc3339(fromMicroseconds(scTo + gcMinute)));
    EXPECT_EQ(lDocument["secondsAfter"], 3660);
    EXPECT_EQ(lDocument["secondsBefore"], 3660) << "as long, where nothing else is asked for";
}

TEST_F(DiffOfAHistory, TheRatesOfTwoStretchesAreThoseOfNothingElse) {
    take({makeQueueFull(gcPortA, scFrom - 50 * gcMinute, scFrom - 50 * gcMinute, 1000)}, scFrom);
    take({makeQueueFull(gcPortA, scFrom - 10 * gcMinute, scFrom - 10 * gcMinute, 7)}, scFrom);
    take({makeQueueFull(gcPortA, scFrom + 10 * gcMinute, scFrom + 10 * gcMinute, 2000)}, scTo);
    take({makeQueueFull(gcPortA, scTo - 5 * gcMinute, scTo - 5 * gcMinute, 90)}, scTo);
    const ZTSDiff lDiff = makeDiff(history(), {.mFrom = {.mTime = fromMicroseconds(scFrom), .mMark = ""},
                                               .mTo = {.mTime = fromMicroseconds(scTo), .mMark = ""},
                                               .mBeforeSince = fromMicroseconds(scFrom - 20 * gcMinute),
                                               .mAfterSince = fromMicroseconds(scTo - 30 * gcMinute)});
    EXPECT_EQ(lDiff.mBeforeSpan, std::chrono::minutes(20));
    EXPECT_EQ(lDiff.mAfterSpan, std::chrono::minutes(30));
    ASSERT_THAT(lDiff.mRates, SizeIs(1));
    EXPECT_EQ(lDiff.mRates[0].mBefore, 7U);
    EXPECT_EQ(lDiff.mRates[0].mAfter, 90U);
}

TEST(DiffRequest, TheLastMarkIsWhereItBeginsAndNowIsWhereItEnds) {
    const ZTCHistoryTime lNow = fromMicroseconds(gcBase);
    const std::vector<ZTSMark> lMarks{{.mName = "old", .mTime = lNow - std::chrono::hours(3)},
                                      {.mName = "before update", .mTime = lNow - std::chrono::hours(2)}};
    const ZTSDiffRequest lRequest = readDiffRequest({}, lMarks, lNow);
    EXPECT_EQ(lRequest.mFrom.mTime, lMarks[1].mTime);
    EXPECT_EQ(lRequest.mFrom.mMark, "before update");
    EXPECT_EQ(lRequest.mTo.mTime, lNow);
    EXPECT_EQ(readDiffRequest({}, {}, lNow).mFrom.mTime, lNow - std::chrono::hours(24));
    EXPECT_EQ(readDiffRequest({.mFrom = "old", .mTo = "1h"}, lMarks, lNow).mTo.mTime, lNow - std::chrono::hours(1));
    EXPECT_EQ(readDiffRequest({.mFrom = "old", .mBeforeSince = "5h"}, lMarks, lNow).mBeforeSince,
              lNow - std::chrono::hours(5));
}

TEST(DiffRequest, AStretchThatEndsBeforeItBeginsIsWrongUse) {
    const ZTCHistoryTime lNow = fromMicroseconds(gcBase);
    const ZTSDiffTexts lWrong[] = {{.mFrom = "1h", .mTo = "2h"},
                                   {.mFrom = "1h", .mTo = "1h"},
                                   {.mFrom = "2h", .mTo = "1h", .mBeforeSince = "2h"},
                                   {.mFrom = "2h", .mTo = "1h", .mAfterSince = "30m"}};
    for (const ZTSDiffTexts& lrTexts : lWrong) {
        EXPECT_THROW(readDiffRequest(lrTexts, {}, lNow), ZTCBadFilterEx);
    }
}

TEST_F(DiffOfAHistory, WithoutATopologyNothingIsSaidToBeTheSame) {
    note(scFrom + gcMinute, makeSan({}));
    const ZTSDiff lDiff = diff();
    EXPECT_FALSE(lDiff.mHasTopology);
    EXPECT_THAT(format(lDiff), Not(HasSubstr("SAME")));
    EXPECT_EQ(makeDiffDocument(lDiff, mNames, "db07", "id")["same"], nullptr);
    EXPECT_EQ(makeDiffDocument(lDiff, mNames, "db07", "id")["changes"], nullptr);
}
