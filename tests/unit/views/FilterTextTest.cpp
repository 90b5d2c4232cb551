#include "sensor/views/include/FilterText.h"

#include <gmock/gmock.h>

#include "tests/unit/views/ViewSamples.h"

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

class FilterText : public LocalTime {
protected:
    FilterText() {
        mNames.addName(wwnOf("50:06:01:60:3b:a0:12:34"), "ctrl-A");
        mNames.addName(wwnOf("50:06:01:60:bb:a0:12:34"), "array7");
        mNames.addInitiator({wwnOf("10:00:00:00:c9:00:00:01"), std::nullopt, "host7"});
        mNames.addRemotePort({wwnOf("50:06:01:60:3b:a0:12:34"), wwnOf("50:06:01:60:bb:a0:12:34"), std::nullopt});
        mNames.addRemotePort({wwnOf("50:06:01:68:3b:a0:12:34"), wwnOf("50:06:01:60:bb:a0:12:34"), std::nullopt});
        mMarks = {{.mName = "before", .mTime = timeOf("2026-11-20T08:00:00+01:00")}};
    }

    ZTSHistoryFilter read(const ZTSFilterTexts& acrTexts) const {
        return readFilter(acrTexts, mNames, mMarks, mNow, 100);
    }
    std::string complaint(const ZTSFilterTexts& acrTexts) const {
        try {
            read(acrTexts);
        } catch (const ZTCBadFilterEx& lrEx) {
            return lrEx.what();
        }
        return "none";
    }

    const ZTCHistoryTime mNow = timeOf("2026-11-21T10:04:12+01:00");
    ZTCNameBook mNames;
    std::vector<ZTSMark> mMarks;
};

TEST_F(FilterText, SinceAndUntilTakeATimeADurationOrAMark) {
    const ZTSHistoryFilter lFilter = read({.mSince = "before", .mUntil = "10m"});
    EXPECT_EQ(lFilter.mSince, timeOf("2026-11-20T08:00:00+01:00"));
    EXPECT_EQ(lFilter.mUntil, mNow - std::chrono::minutes(10));
    EXPECT_EQ(read({.mSince = "2026-11-21 09:00"}).mSince, timeOf("2026-11-21T09:00:00+01:00"));
    EXPECT_THAT(complaint({.mSince = "never set"}), AllOf(HasSubstr("--since \"never set\""), HasSubstr("mark")));
    EXPECT_THAT(complaint({.mUntil = "10 min"}), HasSubstr("--until \"10 min\""));
}

TEST_F(FilterText, ASinceBehindItsUntilIsWrongUseAndBothAreNamed) {
    EXPECT_EQ(complaint({.mSince = "10m", .mUntil = "before"}),
              "--since \"10m\" (2026-11-21 09:54:12) is later than --until \"before\" (2026-11-20 08:00:00)");
    EXPECT_EQ(complaint({.mSince = "before", .mUntil = "before"}), "none") << "a moment is a stretch of time";
    EXPECT_EQ(complaint({.mSince = "2h", .mUntil = "1h"}), "none");
}

TEST_F(FilterText, NothingGivenIsEverythingUpToTheDefaultLimit) {
    const ZTSHistoryFilter lFilter = read({});
    EXPECT_FALSE(lFilter.mSince || lFilter.mUntil || lFilter.mIsOpenOnly || lFilter.mIsAllLuns);
    EXPECT_TRUE(lFilter.mKinds.empty() && lFilter.mPorts.empty() && lFilter.mInitiators.empty());
    EXPECT_EQ(lFilter.mLimit, 100U);
    EXPECT_EQ(read({.mLimit = "0"}).mLimit, 0U);
}

TEST_F(FilterText, AnUnknownKindIsNamedWithThoseThatThereAre) {
    EXPECT_THAT(read({.mKinds = {"rscn", "link"}}).mKinds, ElementsAre(*findKind("rscn"), *findKind("link")));
    EXPECT_THAT(complaint({.mKinds = {"rscn", "queue-ful"}}),
                AllOf(HasSubstr("--kind \"queue-ful\""), HasSubstr("plogi, prlo"), HasSubstr("adapter-arrival")));
    EXPECT_THROW(checkFilter({.mKinds = {"x"}}), ZTCBadFilterEx);
}

TEST_F(FilterText, PortsAreNamedByWwpnByTheirNameOrByTheirNodes) {
    const ZTSFcName lA = wwnOf("50:06:01:60:3b:a0:12:34");
    EXPECT_THAT(read({.mPorts = {"500601603BA01234"}}).mPorts, ElementsAre(lA));
    EXPECT_THAT(read({.mPorts = {"ctrl-A"}}).mPorts, ElementsAre(lA));
    EXPECT_THAT(read({.mPorts = {"array7"}}).mPorts, testing::IsSupersetOf({lA, wwnOf("50:06:01:68:3b:a0:12:34")}));
    EXPECT_THAT(complaint({.mPorts = {"ctrl-B"}}), HasSubstr("--port \"ctrl-B\""));
}

TEST_F(FilterText, InitiatorsAreNamedByWwpnOrHost) {
    EXPECT_THAT(read({.mInitiators = {"host7"}}).mInitiators, ElementsAre(wwnOf("10:00:00:00:c9:00:00:01")));
    EXPECT_THAT(read({.mInitiators = {"10:00:00:00:c9:00:00:09"}}).mInitiators,
                ElementsAre(wwnOf("10:00:00:00:c9:00:00:09")));
    EXPECT_THAT(complaint({.mInitiators = {"host9"}}), HasSubstr("--initiator \"host9\""));
}

TEST_F(FilterText, LunsAreNumbersOrAll) {
    const ZTSHistoryFilter lFilter = read({.mLuns = {"0", "all", "70000"}});
    EXPECT_THAT(lFilter.mLuns, ElementsAre(0U, 70000U));
    EXPECT_TRUE(lFilter.mIsAllLuns);
    for (const char* lpText : {"", "-1", "1x", "4294967295", "99999999999999999999"}) {
        EXPECT_THAT(complaint({.mLuns = {lpText}}), HasSubstr("--lun")) << lpText;
    }
}

TEST_F(FilterText, ALimitIsANumber) {
    EXPECT_EQ(read({.mLimit = "7"}).mLimit, 7U);
    for (const char* lpText : {"-1", "many", "1e3", "1000000000001"}) {
        EXPECT_THAT(complaint({.mLimit = lpText}), HasSubstr("--limit")) << lpText;
    }
}

TEST_F(FilterText, ATooLongDurationIsSaidToBeTooLongUnlessAMarkHasThatName) {
    EXPECT_EQ(complaint({.mSince = "40000d"}), "--since \"40000d\" is too long: a duration is at most 36500d");
    mMarks.push_back({.mName = "40000d", .mTime = timeOf("2026-11-20T09:00:00+01:00")});
    EXPECT_EQ(read({.mSince = "40000d"}).mSince, timeOf("2026-11-20T09:00:00+01:00"));
}

TEST_F(FilterText, ANameThatReadsAsATimeIsNoMark) {
    EXPECT_TRUE(isTimeOrDuration("10m"));
    EXPECT_TRUE(isTimeOrDuration("10:04"));
    EXPECT_TRUE(isTimeOrDuration("2026-11-21"));
    EXPECT_FALSE(isTimeOrDuration("before update"));
}

TEST_F(FilterText, AParameterOfARequestIsNamedWithoutTheDashesOfAnOption) {
    EXPECT_THAT(complaint({.mSince = "1h", .mUntil = "2h", .mNamePrefix = ""}),
                AllOf(StartsWith("since \"1h\" ("), HasSubstr(" is later than until \"2h\" (")));
    EXPECT_EQ(complaint({.mLuns = {"x"}, .mNamePrefix = ""}), "lun \"x\" is not a number or \"all\"");
    EXPECT_EQ(complaint({.mLuns = {"x"}}), "--lun \"x\" is not a number or \"all\"");
}

TEST_F(FilterText, PortsAndAdaptersAreDescribedByTheBestNameThereIs) {
    EXPECT_EQ(mNames.describe(ZTSRemotePort{wwnOf("50:06:01:68:3b:a0:12:34"), wwnOf("50:06:01:60:bb:a0:12:34"), {}}),
              "array7");
    EXPECT_EQ(mNames.describe(ZTSInitiator{wwnOf("10:00:00:00:c9:00:00:01"), {}, "host7"}), "host7");
    EXPECT_EQ(mNames.describe(ZTSInitiator{wwnOf("10:00:00:00:c9:00:00:01"), {}, ""}), "10:00:00:00:c9:00:00:01");
    EXPECT_EQ(mNames.describe(ZTSInitiator{}), "unknown adapter");
    EXPECT_EQ(abbreviateWwn(wwnOf("10:00:00:00:c9:00:00:01")), "10:..:01");
}
