#include "sensor/views/include/Explanation.h"

#include <gmock/gmock.h>

#include <sstream>

#include "libkpm/include/ScopeEventKinds.h"
#include "sensor/views/include/TextTable.h"
#include "tests/unit/views/ViewSamples.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

class Explanation : public LocalTime {};

TEST_F(Explanation, EveryStateAndEveryKindIsExplained) {
    for (const ZTSStateRow& lrRow : getStateTable()) {
        const auto lExplanation = explainTopic(lrRow.mpId);
        ASSERT_TRUE(lExplanation) << lrRow.mpId;
        EXPECT_EQ(lExplanation->mSubject, "state");
    }
    for (const ZTSScopeEventKind& lrKind : gcScopeEventKinds) {
        const auto lExplanation = explainTopic(lrKind.mpName);
        ASSERT_TRUE(lExplanation) << lrKind.mpName;
        EXPECT_EQ(lExplanation->mSubject, "kind");
    }
    for (const ZTSRule& lrRule : getRules()) {
        const auto lExplanation = explainTopic(lrRule.mpId);
        ASSERT_TRUE(lExplanation) << lrRule.mpId;
        EXPECT_EQ(lExplanation->mSubject, "rule");
        EXPECT_THAT(formatExplanation(*lExplanation, {}, {}), testing::Not(HasSubstr("{wwpn}")));
    }
    EXPECT_FALSE(explainTopic("12"));
}

TEST_F(Explanation, TheListNamesEverythingThatIsExplained) {
    const std::string lText = formatExplanation(*explainTopic("topics"), {}, {});
    for (const char* lpName : {"disk-full", "queue-full", "adapter-arrival", "port-overload", "scan-noise"}) {
        EXPECT_THAT(lText, HasSubstr(lpName));
    }
}

TEST_F(Explanation, AnEpisodeShowsItsFactsItsKindAndItsRecords) {
    ZTCNameBook lNames;
    lNames.addName(wwnOf("50:06:01:60:3b:a0:12:34"), "array7 ctrl-A");
    const ZTSExplanation lExplanation =
        explainEpisode(makeQueueFullEpisode(), {38, 39, 41}, {}, lNames, timeOf("2026-11-21T10:04:12+01:00"));
    const std::string lText = formatExplanation(lExplanation, {}, {});
    EXPECT_THAT(lText,
                StartsWith("Episode 12: Queue full\n\nfacts\n  20,000 events in 3 records, from 09:58:03 to 09:58:40; "
                           "closed.\n  Initiator: host7.\n  Remote port: 50:06:01:60:3b:a0:12:34 (array7 ctrl-A).\n"));
    EXPECT_THAT(lText, HasSubstr("\nmeans\n  A target answered TASK SET FULL"));
    EXPECT_THAT(lText, HasSubstr("\nevidence\n  Records 38, 39, 41: tavik events --records\n"));
    const auto lDocument = makeExplainDocument(lExplanation, "db07", "abc", lNames);
    EXPECT_EQ(lDocument["schema"], "tavik.explain/1");
    EXPECT_EQ(lDocument["subject"], "episode");
    EXPECT_EQ(lDocument["id"], "12");
    EXPECT_EQ(lDocument["evidence"].dump(), "[38,39,41]");
    EXPECT_EQ(lDocument["episode"]["count"], 20000);
}

TEST_F(Explanation, LinesFitTheTerminal) {
    for (const std::size_t lWidth : {30U, 80U, 300U}) {
        std::istringstream lLines(formatExplanation(*explainTopic("deaf"), {.mWidth = lWidth, .mHasColor = false}, {}));
        for (std::string lLine; std::getline(lLines, lLine);) {
            EXPECT_LE(countCharacters(lLine), std::max<std::size_t>(lWidth, 60)) << lLine;
            EXPECT_LE(countCharacters(lLine), 100U) << lLine;
        }
    }
}
