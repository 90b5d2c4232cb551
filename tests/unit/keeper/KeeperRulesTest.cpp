#include "sensor/keeper/include/KeeperRules.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "sensor/keeper/include/BackOff.h"
#include "tests/support/TemporaryDirectory.h"

using std::chrono::seconds;

TEST(KeeperRules, StandInTheirOrderSoThatEachIsFoundByItsName) {
    for (std::size_t i = 0; i < keeperRules().size(); ++i) {
        EXPECT_EQ(keeperRules()[i].mRule, static_cast<ZTEKeeperRule>(i));
        EXPECT_EQ(&keeperRule(static_cast<ZTEKeeperRule>(i)), &keeperRules()[i]);
    }
    EXPECT_EQ(keeperRules().size(), static_cast<std::size_t>(ZTKR_Stop) + 1);
}

TEST(KeeperRules, AreTheRowsOfTheTableInTheDocumentation) {
    const std::string lPage = readFile(TAVIK_SENSOR_PAGE);
    ASSERT_NE(lPage, "");
    for (const ZTSKeeperRule& lcrRule : keeperRules()) {
        EXPECT_THAT(lPage, testing::HasSubstr(std::string("| ") + lcrRule.mpWhen + " | " + lcrRule.mpThen + " |\n"));
    }
}

TEST(KeeperRules, ThePageSaysWhetherTheEndOfAnAgentIsAFailure) {
    for (const bool lHasWorked : {false, true}) {
        for (const ZTEStatusEnd lReason : {ZTSE_NoAdapters, ZTSE_NoLibrary, ZTSE_NoEventSupport}) {
            EXPECT_EQ(classifyAgentEnd(lReason, lHasWorked, false), ZTKR_NothingToWatch);
            EXPECT_EQ(classifyAgentEnd(lReason, lHasWorked, true), ZTKR_NothingToWatch);
        }
        for (const ZTEStatusEnd lReason : {ZTSE_Running, ZTSE_ShutDown, ZTSE_Signal, ZTSE_SensorGone, ZTSE_Other}) {
            EXPECT_EQ(classifyAgentEnd(lReason, lHasWorked, false), lHasWorked ? ZTKR_AgentWorked : ZTKR_AgentFailed);
            EXPECT_EQ(classifyAgentEnd(lReason, lHasWorked, true), ZTKR_AgentReplaced);
        }
    }
}

TEST(BackOff, DoublesUpToItsLongestAndBeginsAnewAfterAReset) {
    ZTCBackOff lBackOff(seconds(1), seconds(5));
    for (const int lPause : {1, 2, 4, 5, 5}) {
        EXPECT_EQ(lBackOff.take(), seconds(lPause));
    }
    lBackOff.reset();
    EXPECT_EQ(lBackOff.take(), seconds(1));
}
