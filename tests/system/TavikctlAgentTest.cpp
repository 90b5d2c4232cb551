#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

// The tool that people use beside the real agent.

using testing::HasSubstr;

/// One real agent, and runs of the tool against it.
class TavikctlWithAgent : public testing::Test {
protected:
    std::unique_ptr<ZTCChildProcess> launch(const std::vector<std::string>& acrArguments) {
        return std::make_unique<ZTCChildProcess>(
            ZTSChildProcessSetup{.mProgram = TAVIKCTL_PROGRAM,
                                 .mArguments = acrArguments,
                                 .mEnvironment = {{"ZT_QRV_SENSOR_DIR", mAgent.sensorDirectory()}},
                                 .mWorkingDirectory = mDirectory.path(),
                                 .mOutputPrefix = mDirectory.path("run" + std::to_string(++mRuns))});
    }

    /// Runs the tool to its end, which has to be the status, and returns what it printed.
    std::string run(const std::vector<std::string>& acrArguments, int aStatus = 0) {
        const auto lProcess = launch(acrArguments);
        EXPECT_EQ(lProcess->waitForExit(), aStatus) << lProcess->standardError();
        return lProcess->standardOutput();
    }

    nlohmann::json getJson() { return nlohmann::json::parse(run({"--json", "get"})); }

    const ZTCTemporaryDirectory mDirectory;
    ZTCAgentProcess mAgent{2};
    int mRuns = 0;
};

TEST_F(TavikctlWithAgent, LeadsAnAgentFromItsStartToItsEnd) {
    mAgent.start();
    EXPECT_EQ(run({"--wait", "targets", "2000000000000001,1000000000000001,0x010203"}), "targets: done\n");
    EXPECT_EQ(run({"start"}), "start: done\n");
    EXPECT_THAT(run({"status"}), HasSubstr("answers  yes"));
    mAgent.library().deliver(ZTSLibraryEvent::rscn(1, rscnPayload({0x00010203, 0x00010203})));

    const nlohmann::json lAnswer = getJson();
    EXPECT_EQ(lAnswer["totals"], (nlohmann::json{{"lists", 2}, {"records", 1}, {"occurrences", 2}}));
    const nlohmann::json& lrRecord = lAnswer["lists"][1]["records"][0];
    EXPECT_EQ(lrRecord["kind"], "rscn");
    EXPECT_EQ(lrRecord["remotePort"]["portName"], "10:00:00:00:00:00:00:01");
    EXPECT_EQ(getJson()["totals"]["records"], 0);  // each record is handed out once

    EXPECT_EQ(run({"stop"}), "stop: done\n");
    mAgent.library().deliver(ZTSLibraryEvent::rscn(1, rscnPayload({0x00010203})));
    EXPECT_EQ(getJson()["totals"]["records"], 0);
    EXPECT_EQ(run({"shutdown"}), "shutdown: done\n");
    EXPECT_EQ(mAgent.waitForExit(), 0);
    EXPECT_EQ(run({"get"}, 3), "");
}

TEST_F(TavikctlWithAgent, AWatchAndAGetBesideItShareTheRecordsAndLoseNone) {
    mAgent.start();
    const auto lWatch = launch({"watch", "--interval", "0.05", "--json"});
    waitUntil([&] { return !lWatch->standardOutput().empty(); }, "the first retrieval");
    std::uint64_t lTaken = 0;
    constexpr int scRounds = 20;
    for (int i = 0; i < scRounds; ++i) {
        mAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010203})));
        lTaken += getJson()["totals"]["occurrences"].get<std::uint64_t>();
    }
    lWatch->sendSignal(SIGTERM);
    EXPECT_EQ(lWatch->waitForExit(), 0) << lWatch->standardError();
    std::istringstream lLines(lWatch->standardOutput());
    for (std::string lLine; std::getline(lLines, lLine);) {
        lTaken += nlohmann::json::parse(lLine)["totals"]["occurrences"].get<std::uint64_t>();
    }
    lTaken += getJson()["totals"]["occurrences"].get<std::uint64_t>();
    EXPECT_EQ(lTaken, scRounds);
}

TEST_F(TavikctlWithAgent, WhatAClientGaveUpDoesNotSpoilTheNextAnswer) {
    mAgent.start();
    run({"--wait", "start"});
    // More than the FIFO holds: the agent is still writing this answer when its client has gone.
    for (unsigned i = 0; i < 2000; ++i) {
        mAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({0x00010000 + i})));
    }
    const auto lGone = launch({"get", "--raw", "/dev/full"});
    mAgent.log().waitForLine(
        [](const ZTSLogLine& acrLine) {
            return acrLine.mFunction == "handleGetScopeDataCommand" && acrLine.mText == "Entered";
        },
        "the agent's work on the command");
    lGone->kill();
    mAgent.library().deliver(ZTSLibraryEvent::rscn(1, rscnPayload({0x00010203})));
    const nlohmann::json lAnswer = getJson();
    EXPECT_TRUE(lAnswer["problem"].is_null());
    EXPECT_EQ(lAnswer["lists"][1]["records"].size(), 1U);
}
