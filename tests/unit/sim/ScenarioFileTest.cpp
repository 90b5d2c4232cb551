#include "libkpm/sim/src/ScenarioFile.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <utility>

#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/sim/Recorder.h"

static std::string sShipped(const std::string& acrName) {
    return std::string(TAVIK_SCENARIOS) + "/" + acrName;
}

TEST(ScenarioFile, ReadsWhatIsThere) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("f"), "one\ntwo");
    EXPECT_EQ(readSimFile(lDirectory.path("f")), "one\ntwo");
}

TEST(ScenarioFile, RefusesAFileThatIsTooLarge) {
    const ZTCTemporaryDirectory lDirectory;
    writeFile(lDirectory.path("f"), std::string(gcSimMaxTextSize, '\n'));
    EXPECT_EQ(readSimFile(lDirectory.path("f")).size(), gcSimMaxTextSize);
    writeFile(lDirectory.path("f"), std::string(gcSimMaxTextSize + 1, '\n'));
    EXPECT_THROW(readSimFile(lDirectory.path("f")), ZTCSimUnreadable);
}

TEST(ScenarioFile, ARefusalNamesFileAndLine) {
    EXPECT_EQ(describeSimRefusal("f.kpm", ZTCSimRefusal(3, "why")), "f.kpm:3: why");
    EXPECT_EQ(describeSimRefusal("f.kpm", ZTCSimRefusal(0, "why")), "f.kpm: why");
}

class ShippedScenario : public testing::TestWithParam<std::string> {};

TEST_P(ShippedScenario, Parses) {
    EXPECT_NO_THROW(parseSimScenario(readSimFile(sShipped(GetParam()))));
}

INSTANTIATE_TEST_SUITE_P(Files, ShippedScenario,
                         testing::Values<std::string>("demo.kpm", "day.kpm", "storm.kpm", "no-adapters.kpm",
                                                      "old-driver.kpm", "init-fails.kpm", "info-fails.kpm",
                                                      "registration-fails.kpm", "adapters-come-and-go.kpm",
                                                      "malformed-events.kpm", "states-and-losses.kpm"));

TEST(ScenarioFile, TheDemoShowsEveryKindOnEveryAdapter) {
    const ZTSSimScenario lScenario = parseSimScenario(readSimFile(sShipped("demo.kpm")));
    EXPECT_EQ(lScenario.mAdapters.size(), 2u);
    EXPECT_GE(lScenario.mPorts.size(), 6u);
    std::set<std::pair<std::uint32_t, std::size_t>> lKindsOfBoards;
    for (const ZTSSimEvent& lrEvent : lScenario.mEvents) {
        for (const std::uint32_t lBoard : lrEvent.mBoards.mBoards) {
            lKindsOfBoards.emplace(lBoard, lrEvent.mKind);
        }
    }
    EXPECT_EQ(lKindsOfBoards.size(), 2 * gcSimKindCount);
}

TEST(ScenarioFile, MalformedEventsAreDeliveredWithoutHarm) {
    const ZTSSimScenario lScenario = parseSimScenario(readSimFile(sShipped("malformed-events.kpm")));
    ZTCRecorder lRecorder;
    ZTCSimEngine lEngine(lScenario);
    lRecorder.registerAll(lEngine, 0);
    for (const ZTSSimEvent& lrEvent : lScenario.mEvents) {
        EXPECT_EQ(lEngine.inject(lrEvent), 1u);
    }
    EXPECT_EQ(lRecorder.getCount(), lScenario.mEvents.size());
}
