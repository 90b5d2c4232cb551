// The real sensor runs the hooks of its configuration: what they get, and every way in which one fails.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <cerrno>
#include <filesystem>

#include "sensor/metrics/include/Metrics.h"
#include "sensor/store/include/History.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/sensor/UnixLine.h"
#include "tests/support/SettableClock.h"

using testing::AllOf;
using testing::HasSubstr;

class SensorHook : public testing::Test {
protected:
    /// A rule on queue-full whose hook is this script. Returns the hook's path.
    std::string addRule(const std::string& acrName, const std::string& acrScript) {
        const std::string lPath = mSensor.path(acrName);
        if (!acrScript.empty()) {
            writeScript(lPath, acrScript);
        }
        mRules += "[[warn]]\nkind = \"queue-full\"\nper = \"host\"\nrun = [\"" + lPath +
                  "\", \"first argument\"]\ntimeout = 2\n";
        return lPath;
    }
    /// A script that keeps what it gets in a file that then appears whole.
    std::string keep(const std::string& acrName) const {
        const std::string lPath = mSensor.path(acrName);
        return "cat > " + lPath + ".part\nenv | sort > " + lPath + ".variables\necho \"$1\" > " + lPath +
               ".argument\nmv " + lPath + ".part " + lPath;
    }
    nlohmann::json waitForDocument(const std::string& acrName) const {
        waitUntil([&] { return exists(mSensor.path(acrName)); }, "the hook's file " + acrName);
        return nlohmann::json::parse(readFile(mSensor.path(acrName)));
    }
    void start() {
        mSensor.configure("collect.period = 0.1\nhttp.listen = \"\"\n" + mRules);
        mSensor.start();
    }
    /// The open warnings of the kind "hook".
    std::vector<std::string> listFailures() const {
        std::vector<std::string> lTexts;
        const nlohmann::json lStatus = mSensor.status();
        for (const nlohmann::json& lrWarning : lStatus["warnings"]) {
            if (lrWarning["kind"] == "hook") {
                lTexts.push_back(lrWarning["text"].get<std::string>());
            }
        }
        return lTexts;
    }
    nlohmann::json test() const {
        return nlohmann::json::parse(askLine(mSensor.path("run/control"), R"({"request":"warn-test"})"));
    }

    ZTCSensorProcess mSensor;
    std::string mRules;
};

TEST_F(SensorHook, GetsTheEpisodeAndIsWarnedOfAgainBehindTheDocumentedPause) {
    ZTCSettableClock lClock(mSensor.path("clock"));
    for (const auto& [lrName, lrValue] : lClock.getEnvironment()) {
        mSensor.setEnvironment(lrName, lrValue);
    }
    addRule("hook", keep("warned"));
    start();
    mSensor.simulate("queue-full board=hba0 times=7");
    const nlohmann::json lFirst = waitForDocument("warned");
    EXPECT_EQ(lFirst["kind"], "queue-full");
    EXPECT_EQ(lFirst["count"], 7);
    EXPECT_FALSE(lFirst["storeId"].get<std::string>().empty());
    EXPECT_EQ(lFirst["warning"]["previous"], 0);
    EXPECT_EQ(lFirst["warning"]["test"], false);
    EXPECT_EQ(readFile(mSensor.path("warned.argument")), "first argument\n");
    EXPECT_THAT(readFile(mSensor.path("warned.variables")),
                AllOf(HasSubstr("TAVIK_KIND=queue-full\n"), HasSubstr("TAVIK_COUNT=7\n"), HasSubstr("TAVIK_PER=host\n"),
                      HasSubstr("TAVIK_PREVIOUS=0\n"), HasSubstr("TAVIK_TEST=0\n"), HasSubstr("TAVIK_EPISODE=1\n"),
                      HasSubstr("TAVIK_NEXT=2")));
    std::filesystem::remove(mSensor.path("warned"));
    // A minute later it still goes on.
    lClock.setAhead(std::chrono::seconds(50));
    mSensor.simulate("queue-full board=hba0 times=3");
    mSensor.waitUntilAllIsStored();
    lClock.setAhead(std::chrono::seconds(61));
    const nlohmann::json lSecond = waitForDocument("warned");
    EXPECT_EQ(lSecond["warning"]["previous"], 1);
    EXPECT_EQ(lSecond["warning"]["first"], lFirst["warning"]["first"]);
    EXPECT_EQ(mSensor.stop(), 0);
}

TEST_F(SensorHook, ThatFailsInAnyWayIsAWarningAndCountedUntilItWorksAgain) {
    const std::string lMissing = addRule("missing", "");
    const std::string lFailing = addRule("failing", "echo no mail server >&2\nexit 3");
    const std::string lHanging = addRule("hanging", "sleep 1000");
    const std::string lForking =
        addRule("forking", "setsid sleep 1000 &\necho $! > " + mSensor.path("daemon") + "\nexit 0");
    addRule("good", keep("warned"));
    start();
    mSensor.simulate("queue-full board=hba0 times=7");
    waitUntil([&] { return listFailures().size() == 4; }, "four hooks that fail", ZTCDeadline(2 * gcTestPatience));
    EXPECT_THAT(listFailures(),
                testing::ElementsAre(AllOf(HasSubstr(lMissing), HasSubstr("No such file")),
                                     AllOf(HasSubstr(lFailing), HasSubstr("status 3: no mail server")),
                                     AllOf(HasSubstr(lHanging), HasSubstr("after 2 s, its timeout: it was ended")),
                                     AllOf(HasSubstr(lForking), HasSubstr("left processes behind"))));
    EXPECT_EQ(waitForDocument("warned")["count"], 7) << "the good one is run all the same";
    const pid_t lDaemon = std::stoi(readFile(mSensor.path("daemon")));
    EXPECT_TRUE(kill(lDaemon, 0) != 0 && errno == ESRCH);
    EXPECT_THAT(mSensor.standardError(), HasSubstr("the hook " + lFailing + " for queue-full failed"));
    waitUntil([&] { return ZTCHistory(mSensor.stateDirectory()).getValue(gcHookFailuresValue) == "4"; },
              "the counted failures");

    for (const std::string& lrHook : {lMissing, lFailing, lHanging, lForking}) {
        writeScript(lrHook, "exit 0");
    }
    const nlohmann::json lAnswer = test();
    ASSERT_EQ(lAnswer["hooks"].size(), 5U) << lAnswer;
    for (const nlohmann::json& lrHook : lAnswer["hooks"]) {
        EXPECT_EQ(lrHook["problem"], nullptr) << lrHook;
    }
    EXPECT_EQ(nlohmann::json::parse(readFile(mSensor.path("warned")))["warning"]["test"], true);
    waitUntil([&] { return listFailures().empty(); }, "the end of the warnings");
    EXPECT_EQ(mSensor.stop(), 0);
}
