// `tavik warn --test` as a person runs it: the real program asks the real sensor, which runs the hooks.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "sensor/metrics/include/Metrics.h"
#include "sensor/store/include/History.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/sensor/TavikRun.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

class SensorWarn : public testing::Test {
protected:
    /// A rule whose hook is this script; an empty one is not there. Returns the hook's path.
    std::string addRule(const std::string& acrKind, const std::string& acrName, const std::string& acrScript) {
        const std::string lPath = mSensor.path(acrName);
        if (!acrScript.empty()) {
            writeScript(lPath, acrScript);
        }
        mRules += "[[warn]]\nkind = \"" + acrKind + "\"\nrun = [\"" + lPath + "\", \"now\"]\n";
        return lPath;
    }
    void start() {
        mSensor.configure("http.listen = \"\"\n" + mRules);
        mSensor.start();
    }
    ZTSTavikRun run(const std::vector<std::string>& acrArguments) const { return runTavik(mSensor, acrArguments); }

    ZTCSensorProcess mSensor;
    std::string mRules;
};

TEST_F(SensorWarn, TheTestRunsEveryHookSaysWhichFailedAndEndsWith1UntilAllDoTheirWork) {
    const std::string lRecord = mSensor.path("record");
    const std::string lGood = addRule("queue-full", "good", "cat > " + lRecord);
    const std::string lFailing = addRule("gap", "failing", "echo no mail server >&2\nexit 75");
    const std::string lMissing = addRule("deaf", "missing", "");
    start();

    const ZTSTavikRun lFirst = run({"warn", "--test"});
    EXPECT_EQ(lFirst.mExit, 1) << lFirst.mError;
    EXPECT_THAT(
        lFirst.mOutput,
        AllOf(StartsWith("queue-full: " + lGood + " now: done\ngap: " + lFailing + " now: failed: "),
              HasSubstr("status 75: no mail server\ndeaf: " + lMissing + " now: failed: "), HasSubstr("No such file")));
    const nlohmann::json lGiven = nlohmann::json::parse(readFile(lRecord));
    EXPECT_EQ(lGiven["kind"], "queue-full");
    EXPECT_EQ(lGiven["warning"]["test"], true);
    waitUntil([&] { return ZTCHistory(mSensor.stateDirectory()).getValue(gcHookFailuresValue) == "2"; },
              "the counted failures");

    writeScript(lFailing, "exit 0");
    writeScript(lMissing, "exit 0");
    const ZTSTavikRun lSecond = run({"--json", "warn", "--test"});
    EXPECT_EQ(lSecond.mExit, 0) << lSecond.mError;
    const nlohmann::json lDocument = nlohmann::json::parse(lSecond.mOutput);
    EXPECT_EQ(lDocument["schema"], "tavik.warn/1");
    ASSERT_EQ(lDocument["hooks"].size(), 3U) << lDocument;
    for (const nlohmann::json& lrHook : lDocument["hooks"]) {
        EXPECT_EQ(lrHook["problem"], nullptr) << lrHook;
    }

    EXPECT_EQ(mSensor.stop(), 0);
    const ZTSTavikRun lThird = run({"warn", "--test"});
    EXPECT_EQ(lThird.mExit, 3);
    EXPECT_EQ(lThird.mOutput, "");
    EXPECT_THAT(lThird.mError, HasSubstr("the hooks were not tested: "));
}

TEST_F(SensorWarn, WithoutAHookTheTestSaysSoAndWithoutTestTheCommandIsWrong) {
    start();
    const ZTSTavikRun lTest = run({"warn", "--test"});
    EXPECT_EQ(lTest.mExit, 0) << lTest.mError;
    EXPECT_THAT(lTest.mOutput, StartsWith("no hook is set"));
    const ZTSTavikRun lWrong = run({"warn"});
    EXPECT_EQ(lWrong.mExit, 2);
    EXPECT_THAT(lWrong.mError, HasSubstr("--test"));
    EXPECT_EQ(mSensor.stop(), 0);
}
