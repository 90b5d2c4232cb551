/// Each rule over the real chain: its scenario is recognised, and its near miss is not.

#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

#include "sensor/diagnosis/include/Diagnosis.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/unit/topology/FakeSysfs.h"

static std::string sScenarioPath(const std::string& acrName) {
    return std::string(TAVIK_RULE_SCENARIOS) + "/" + acrName + ".kpm";
}

/// The lines that play something.
static std::vector<std::string> sEventLines(const std::string& acrPath) {
    std::vector<std::string> lLines;
    std::ifstream lFile(acrPath);
    for (std::string lLine; std::getline(lFile, lLine);) {
        if (!lLine.empty() && lLine.front() != '#') {
            lLines.push_back(lLine);
        }
    }
    return lLines;
}

/// What san.kpm says, as the kernel would show it: host7 and host8 on one fabric, host9 on another.
static void sBuildSan(const ZTCFakeSysfs& acrTree) {
    for (const unsigned lHost : {7U, 8U, 9U}) {
        acrTree.addHost(lHost);
    }
    acrTree.write("devices/pci0/host9/fc_host/host9/fabric_name", "0x100000051e000002");
    for (const unsigned lPort : {0U, 1U, 4U, 5U, 8U}) {
        acrTree.addRemotePort(7, lPort, lPort);
    }
    acrTree.addRemotePort(8, 0, 0);
}

/// Names of the ports, as an administrator of that SAN would give them.
static constexpr const char* scSettings = R"(collect.period = 0.1
[names]
"50:06:01:60:00:00:00:00" = "array7 A0"
"50:06:01:60:00:00:00:01" = "array7 A1"
"50:06:01:60:00:00:00:04" = "array7 B0"
"50:06:01:60:00:00:00:05" = "array7 B1"
"50:06:01:60:00:00:00:08" = "shelf3"
)";

/// The lines from a finding's heading to its last one, which names the rule. Its number, its times and the numbers of
/// its evidence are of the moment, and are left out.
static std::vector<std::string> sFindingOf(const std::string& acrText, const std::string& acrRule) {
    std::vector<std::string> lLines;
    std::istringstream lText(acrText);
    for (std::string lLine; std::getline(lText, lLine);) {
        if (lLine.starts_with('[')) {
            lLines.assign(1, lLine.substr(lLine.find(']')));
        } else if (lLine.starts_with("    when: ")) {
            lLines.emplace_back("when");
        } else if (lLine.starts_with("evidence: ")) {
            lLines.emplace_back("evidence");
        } else {
            lLines.push_back(lLine);
        }
        if (lLine == "     see: tavik explain " + acrRule) {
            return lLines;
        }
    }
    return {};
}

class RuleScenario : public testing::TestWithParam<std::string> {
protected:
    RuleScenario() : mSensor(scSettings) {
        sBuildSan(mTree);
        for (unsigned lLun = 0; lLun < 12; ++lLun) {
            mTree.addPath(7, 0, lLun, "naa.6006016000000000" + std::to_string(lLun));
        }
        mSensor.setEnvironment("TAVIK_SYSFS_ROOT", mTree.path(""));
        mSensor.setScenario(readFile(sScenarioPath("san")));
    }

    /// `tavik explain`, with these arguments behind it.
    std::string explain(const std::vector<std::string>& acrArguments) {
        ZTSChildProcessSetup lSetup;
        lSetup.mProgram = TAVIK_PROGRAM;
        lSetup.mArguments = {"--config", mSensor.configPath(), "explain"};
        lSetup.mArguments.insert(lSetup.mArguments.end(), acrArguments.begin(), acrArguments.end());
        lSetup.mWorkingDirectory = mSensor.path("");
        lSetup.mOutputPrefix = mSensor.path("explain");
        ZTCChildProcess lProcess(lSetup);
        EXPECT_EQ(lProcess.waitForExit(), 0) << lProcess.standardError();
        return lProcess.standardOutput();
    }

    /// Plays the lines of a scenario, and returns what the sensor then makes of them.
    nlohmann::json play(const std::string& acrName) {
        mSensor.start();
        const std::vector<std::string> lLines = sEventLines(sScenarioPath(acrName));
        EXPECT_FALSE(lLines.empty()) << "nothing is played: " << sScenarioPath(acrName);
        for (const std::string& lrLine : lLines) {
            mSensor.simulate(lrLine);
        }
        std::uint64_t lDelivered = 0;
        const auto lCounts = mSensor.countDelivered();
        for (const char* lpKind :
             {"plogi", "prlo", "adisc", "lsrjt", "logo", "rscn", "port-busy", "fcp-read-check", "queue-full",
              "device-busy", "check-condition", "lun-reset", "queue-depth", "link"}) {
            lDelivered += lCounts.at(lpKind);
        }
        EXPECT_NE(lDelivered, 0U);
        nlohmann::json lDocument;
        waitUntil(
            [&] {
                lDocument = nlohmann::json::parse(explain({"--json"}));
                return lDocument["count"] == lDelivered && !lDocument["topology"].is_null();
            },
            "all events and the topology in the history");
        return lDocument;
    }

    /// The first finding of that rule; null where there is none.
    static nlohmann::json find(const nlohmann::json& acrDocument, const std::string& acrRule) {
        for (const nlohmann::json& lrFinding : acrDocument["findings"]) {
            if (lrFinding["rule"] == acrRule) {
                return lrFinding;
            }
        }
        return nullptr;
    }

    ZTCFakeSysfs mTree;
    ZTCSensorProcess mSensor;
};

TEST_P(RuleScenario, IsRecognizedAndItsEpisodesLeadToIt) {
    const nlohmann::json lDocument = play(GetParam());
    const nlohmann::json lFinding = find(lDocument, GetParam());
    ASSERT_FALSE(lFinding.is_null()) << lDocument.dump(1);
    ASSERT_FALSE(lFinding["episodes"].empty());
    EXPECT_EQ(lFinding["episodes"].size(), lFinding["evidence"].size());
    EXPECT_FALSE(lFinding["seen"].empty());
    const bool lIsNoise = lFinding["severity"] == "noise";
    const std::string lTitle = lFinding["title"];
    EXPECT_EQ(explain({}).find(lTitle) == std::string::npos, lIsNoise) << explain({});
    EXPECT_NE(explain({"--all"}).find(lTitle), std::string::npos);
    EXPECT_EQ(sFindingOf(readFile(TAVIK_TROUBLESHOOTING), GetParam()), sFindingOf(explain({"--all"}), GetParam()))
        << "docs/troubleshooting.md shows what is printed";
    for (const nlohmann::json& lrEpisode : lFinding["episodes"]) {
        const auto lEpisode = nlohmann::json::parse(explain({std::to_string(lrEpisode.get<int>()), "--json"}));
        EXPECT_FALSE(find(lEpisode, GetParam()).is_null()) << lEpisode.dump(1);
    }
}

TEST_P(RuleScenario, IsNotSeenInItsNearMiss) {
    const nlohmann::json lDocument = play(GetParam() + "-near-miss");
    EXPECT_TRUE(find(lDocument, GetParam()).is_null()) << lDocument.dump(1);
}

static std::vector<std::string> sRuleIds() {
    std::vector<std::string> lIds;
    for (const ZTSRule& lrRule : getRules()) {
        lIds.emplace_back(lrRule.mpId);
    }
    return lIds;
}

INSTANTIATE_TEST_SUITE_P(Rules, RuleScenario, testing::ValuesIn(sRuleIds()),
                         [](const testing::TestParamInfo<std::string>& acrInfo) {
                             std::string lName = acrInfo.param;
                             std::ranges::replace(lName, '-', '_');
                             return lName;
                         });

TEST(RuleScenarios, EveryFileBelongsToARule) {
    std::set<std::string> lExpected{"san.kpm"};
    for (const std::string& lrId : sRuleIds()) {
        lExpected.insert({lrId + ".kpm", lrId + "-near-miss.kpm"});
    }
    std::set<std::string> lThere;
    for (const auto& lrEntry : std::filesystem::directory_iterator(TAVIK_RULE_SCENARIOS)) {
        lThere.insert(lrEntry.path().filename());
    }
    EXPECT_EQ(lThere, lExpected);
}
