#include <gmock/gmock.h>
#include <signal.h>

#include <sstream>

#include "tests/unit/commands/TavikProgram.h"

using testing::HasSubstr;

class Follow : public TavikProgram {
protected:
    void waitForOutput(const ZTCChildProcess& acrProcess, const std::string& acrText) {
        waitUntil([&] { return acrProcess.standardOutput().find(acrText) != std::string::npos; }, acrText);
    }
};

TEST_F(Follow, PrintsWhatThereIsThenWhatComes) {
    fill();
    ZTCChildProcess lProcess(setup({"events", "--follow", "--kind", "queue-full"}));
    waitForOutput(lProcess, "host8");
    takeIn({makeQueueFull(gcPortA, gcBase + 10 * gcMinute, gcBase + 10 * gcMinute, 42, 77),
            {.mKind = gcLogo,
             .mData = makeTwoNamesData(gcPortA, gcPortA),
             .mBegin = gcBase + 10 * gcMinute,
             .mEnd = gcBase + 10 * gcMinute,
             .mOccurrences = 1,
             .mPortName = std::nullopt}});
    waitForOutput(lProcess, "LUN 77");
    EXPECT_THAT(lProcess.standardOutput(), testing::Not(HasSubstr("logo")));
    const std::string lText = lProcess.standardOutput();
    EXPECT_EQ(lText.find("EPISODE"), lText.rfind("EPISODE")) << "one heading";
    EXPECT_THAT(lText, HasSubstr("closed      5  queue-full")) << "the first one has ended with the new event";
    EXPECT_EQ(std::count(lText.begin(), lText.end(), '\n'), 5) << lText;
    lProcess.sendSignal(SIGINT);
    EXPECT_EQ(lProcess.waitForExit(), 1000 + SIGINT);
    EXPECT_EQ(lProcess.standardError(), "");
}

TEST_F(Follow, WritesOneDocumentALineAsJson) {
    fill();
    ZTCChildProcess lProcess(setup({"--json", "events", "--follow"}));
    waitForOutput(lProcess, "host8");
    takeIn({makeQueueFull(gcPortB, gcBase + 10 * gcMinute, gcBase + 10 * gcMinute, 42, 77)});
    waitForOutput(lProcess, "[77]");
    lProcess.sendSignal(SIGTERM);
    lProcess.waitForExit();
    std::istringstream lLines(lProcess.standardOutput());
    int lCount = 0;
    for (std::string lLine; std::getline(lLines, lLine); ++lCount) {
        const nlohmann::json lDocument = nlohmann::json::parse(lLine);
        EXPECT_EQ(lDocument["schema"], "tavik.events/1");
        EXPECT_EQ(lDocument["storeId"], store().getStoreId());
        EXPECT_EQ(lDocument["episodes"].size(), 1U);
    }
    EXPECT_EQ(lCount, 4);
}

TEST_F(Follow, FollowsRecordsToo) {
    fill();
    ZTCChildProcess lProcess(setup({"events", "--follow", "--records"}));
    waitForOutput(lProcess, "host8");
    takeIn({makeQueueFull(gcPortA, gcBase + 10 * gcMinute, gcBase + 10 * gcMinute, 1, 77)});
    waitForOutput(lProcess, "luns=77");
    const std::string lText = lProcess.standardOutput();
    EXPECT_EQ(std::count(lText.begin(), lText.end(), '\n'), 6) << lText;
}

TEST_F(Follow, WaitsForAHistoryThatDoesNotExistYet) {
    ZTCChildProcess lProcess(setup({"events", "--follow"}));
    waitUntil([&] { return lProcess.standardError().find("waiting for it") != std::string::npos; }, "its word");
    fill();
    waitForOutput(lProcess, "host8");
}
