#include "sensor/views/include/KindTexts.h"

#include <gmock/gmock.h>

#include "libkpm/include/ScopeEventKinds.h"

using testing::HasSubstr;
using testing::StartsWith;

TEST(KindTexts, EveryKindHasASectionWithAllItsParts) {
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        SCOPED_TRACE(lrKind.mpName);
        const ZTSKindText* const lpText = findKindText(lrKind.mpName);
        ASSERT_NE(lpText, nullptr);
        for (const std::string* lpPart : {&lpText->mTitle, &lpText->mMeans, &lpText->mCauses, &lpText->mLookAt}) {
            EXPECT_FALSE(lpPart->empty());
            EXPECT_EQ(lpPart->find_first_of("*`|\n"), std::string::npos) << *lpPart;
        }
        EXPECT_THAT(lpText->mConsolidation, StartsWith("The next event of the kind is "));
    }
    EXPECT_EQ(getKindTexts().size(), gcScopeEventKinds.size());
    EXPECT_EQ(findKindText("no-such-kind"), nullptr);
}

TEST(KindTexts, TheTextIsThatOfThePage) {
    const ZTSKindText* const lpText = findKindText("queue-full");
    EXPECT_EQ(lpText->mTitle, "Queue full");
    EXPECT_THAT(lpText->mMeans, StartsWith("A target answered TASK SET FULL."));
    EXPECT_THAT(lpText->mCauses, StartsWith("More commands are in flight"));
    EXPECT_THAT(lpText->mLookAt, HasSubstr("Lower the hosts' queue depth"));
}

TEST(KindTexts, HeadingsWithoutAKindAndMissingPartsArePassedOver) {
    const auto lTexts = parseKindTexts(
        "# Page\n\n## Reading\n\nText.\n\n## One (`one`)\n\nCategory 1.\n\nIt means `x`.\n\n## "
        "Two (`two`)\n");
    ASSERT_EQ(lTexts.size(), 2U);
    EXPECT_EQ(lTexts[0].mMeans, "It means x.");
    EXPECT_EQ(lTexts[0].mCauses, "");
    EXPECT_EQ(lTexts[1].mTitle, "Two");
    EXPECT_TRUE(parseKindTexts("").empty());
}
