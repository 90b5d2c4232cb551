#include "sensor/collector/include/SpoolRecovery.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "tests/support/Seed.h"

using testing::ElementsAre;
using testing::IsEmpty;

static ZTSSpoolEntry sEntry(std::uint64_t aNumber, const char* apGeneration, ZTESpoolState aState,
                            std::uint64_t aSize = 9) {
    return {{.mNumber = aNumber, .mGeneration = apGeneration, .mState = aState}, aSize};
}

TEST(SpoolRecovery, AnEmptyFolderBeginsWithNumberOne) {
    const ZTSSpoolPlan lPlan = planSpoolRecovery({}, "aa");
    EXPECT_EQ(lPlan.mNextNumber, 1U);
    EXPECT_THAT(lPlan.mWaiting, IsEmpty());
    EXPECT_FALSE(lPlan.mResume);
}

TEST(SpoolRecovery, FramesAndTornFilesWaitInTheOrderOfTheirNumbers) {
    const std::vector<ZTSSpoolEntry> lEntries{sEntry(12, "aa", ZTSPS_Frame), sEntry(4, "bb", ZTSPS_Torn),
                                              sEntry(5, "aa", ZTSPS_Frame)};
    const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, "aa");
    EXPECT_THAT(lPlan.mWaiting, ElementsAre(lEntries[1], lEntries[2], lEntries[0]));
    EXPECT_EQ(lPlan.mNextNumber, 13U);
}

TEST(SpoolRecovery, ThePartOfTheRunningAgentGoesOn) {
    const std::vector<ZTSSpoolEntry> lEntries{sEntry(3, "aa", ZTSPS_Part, 0)};
    EXPECT_EQ(planSpoolRecovery(lEntries, "aa").mResume, lEntries[0]);
}

TEST(SpoolRecovery, ThePartOfAnotherAgentIsTorn) {
    const std::vector<ZTSSpoolEntry> lEntries{sEntry(3, "aa", ZTSPS_Part)};
    for (const char* lpRunning : {"", "ab"}) {
        const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, lpRunning);
        EXPECT_FALSE(lPlan.mResume);
        EXPECT_THAT(lPlan.mTear, ElementsAre(lEntries[0]));
    }
}

TEST(SpoolRecovery, OfTwoPartsTheOneThatHasBegunGoesOn) {
    const std::vector<ZTSSpoolEntry> lEntries{sEntry(3, "aa", ZTSPS_Part, 0), sEntry(4, "aa", ZTSPS_Part, 2)};
    const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, "aa");
    EXPECT_EQ(lPlan.mResume, lEntries[1]);
    EXPECT_THAT(lPlan.mTear, ElementsAre(lEntries[0]));
}

TEST(SpoolRecovery, EveryFileHasOnePlaceInThePlan) {
    ZTCTestSeed lSeed;
    for (int i = 0; i < 2000; ++i) {
        std::vector<ZTSSpoolEntry> lEntries;
        for (unsigned lCount = lSeed.below(8); lCount > 0; --lCount) {
            lEntries.push_back(sEntry(lSeed.below(6), lSeed.below(2) == 0 ? "aa" : "bb",
                                      static_cast<ZTESpoolState>(lSeed.below(3)), lSeed.below(3)));
        }
        const ZTSSpoolPlan lPlan = planSpoolRecovery(lEntries, "aa");
        EXPECT_EQ(lPlan.mWaiting.size() + lPlan.mTear.size() + (lPlan.mResume ? 1 : 0), lEntries.size());
        EXPECT_TRUE(std::ranges::all_of(
            lEntries, [&](const ZTSSpoolEntry& acrEntry) { return acrEntry.mName.mNumber < lPlan.mNextNumber; }));
        const bool lHasPart = std::ranges::any_of(lEntries, [](const ZTSSpoolEntry& acrEntry) {
            return acrEntry.mName.mState == ZTSPS_Part && acrEntry.mName.mGeneration == "aa";
        });
        EXPECT_EQ(lPlan.mResume.has_value(), lHasPart);
    }
}

TEST(SpooledBody, AWholeFrameIsItsBody) {
    const std::vector<std::uint8_t> lBytes{0, 0, 0, 2, 7, 8};
    const ZTSSpooledBody lBody = readSpooledBody(lBytes);
    EXPECT_TRUE(lBody.isWhole());
    EXPECT_THAT(lBody.mBody, ElementsAre(7, 8));
}

TEST(SpooledBody, ACutFrameSaysHowMuchIsMissing) {
    const std::vector<std::uint8_t> lBytes{0, 1, 0, 2, 7};
    const ZTSSpooledBody lBody = readSpooledBody(lBytes);
    EXPECT_FALSE(lBody.isWhole());
    EXPECT_THAT(lBody.mBody, ElementsAre(7));
    EXPECT_EQ(lBody.mMissing, 0x10001U);
}

TEST(SpooledBody, ACutLengthHasNoBody) {
    const std::vector<std::uint8_t> lBytes{0, 0, 0};
    const ZTSSpooledBody lBody = readSpooledBody(lBytes);
    EXPECT_FALSE(lBody.mHasLength);
    EXPECT_FALSE(lBody.isWhole());
    EXPECT_TRUE(lBody.mBody.empty());
}

TEST(SpooledBody, BytesBehindTheFrameAreCountedAndLeftOut) {
    const std::vector<std::uint8_t> lBytes{0, 0, 0, 1, 7, 8, 9};
    const ZTSSpooledBody lBody = readSpooledBody(lBytes);
    EXPECT_FALSE(lBody.isWhole());
    EXPECT_THAT(lBody.mBody, ElementsAre(7));
    EXPECT_EQ(lBody.mBehind, 2U);
}
