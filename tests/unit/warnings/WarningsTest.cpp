#include "sensor/warnings/include/Warnings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/stat.h>

#include <fstream>
#include <nlohmann/json.hpp>

#include "tests/support/Waiting.h"
#include "tests/unit/store/StoreFixture.h"

using std::chrono::seconds;
using testing::AllOf;
using testing::HasSubstr;

static constexpr const char* scFailuresValue = "metrics.hook_failures";
static constexpr const char* scDiskFull = R"({"collector": {"disk": "full", "diskProblem": "no room"}})";
static constexpr const char* scDiskOk = R"({"collector": {"disk": "ok"}})";

/// Warnings over a history that the test fills.
class Warnings : public ZTCStoreTest {
protected:
    ZTSWarnRule rule(const std::string& acrKind, const std::string& acrScript) {
        const std::string lPath = mDirectory.path("hook" + std::to_string(++mScripts));
        std::ofstream(lPath) << "#!/bin/sh\n" << acrScript << "\n";
        chmod(lPath.c_str(), 0700);
        ZTSWarnRule lRule;
        lRule.mKind = acrKind;
        lRule.mRun = {lPath};
        return lRule;
    }
    /// A hook that writes its input to a file that then appears whole.
    std::string keep(const std::string& acrName) const {
        const std::string lPath = mDirectory.path(acrName);
        return "cat > " + lPath + ".part\nenv | grep ^TAVIK_ | sort > " + lPath + ".variables\nmv " + lPath + ".part " +
               lPath;
    }
    ZTCWarnings& start(std::vector<ZTSWarnRule> aRules) {
        ZTSSettings lSettings;
        lSettings.mNames[makeName(gcPortA).toText()] = "array7 ctrl-A";
        lSettings.mWarnings = std::move(aRules);
        store();
        mpWarnings = std::make_unique<ZTCWarnings>(
            ZTSWarningsSetup{.mStateDirectory = mDirectory.path(),
                             .mHost = "db07",
                             .mFailuresValue = scFailuresValue,
                             .mSetValue =
                                 [this](const std::string& acrName, const std::string& acrValue) {
                                     const std::lock_guard lLock(mTextMutex);
                                     mValues[acrName] = acrValue;
                                 },
                             .mReport =
                                 [this](const std::string& acrLine) {
                                     const std::lock_guard lLock(mTextMutex);
                                     mLines += acrLine + "\n";
                                 }},
            lSettings);
        return *mpWarnings;
    }
    void storeValues() {
        const std::lock_guard lLock(mTextMutex);
        for (const auto& lrValue : mValues) {
            inTransaction([&] { store().setValue(lrValue.first, lrValue.second); });
        }
    }
    std::string value(const std::string& acrName) {
        const std::lock_guard lLock(mTextMutex);
        return mValues[acrName];
    }
    std::string lines() {
        const std::lock_guard lLock(mTextMutex);
        return mLines;
    }
    void takeNow(std::uint32_t aCount) {
        const std::int64_t lNow = toMicroseconds(getHistoryTime());
        take({makeQueueFull(gcPortA, lNow, lNow, aCount)}, lNow);
    }
    nlohmann::json document(const std::string& acrName) {
        waitUntil([&] { return exists(mDirectory.path(acrName)); }, "the hook's file " + acrName);
        return nlohmann::json::parse(readFile(mDirectory.path(acrName)));
    }
    nlohmann::json test() {
        EXPECT_GT(mpWarnings->test(7).count(), 0);
        std::vector<ZTSHookTest> lTests;
        waitUntil([&] { return !(lTests = mpWarnings->takeTests()).empty(); }, "the end of the test");
        EXPECT_EQ(lTests.front().mTicket, 7U);
        return nlohmann::json::parse(lTests.front().mAnswer);
    }

    std::mutex mTextMutex;
    std::map<std::string, std::string> mValues;
    std::string mLines;
    int mScripts = 0;
    std::unique_ptr<ZTCWarnings> mpWarnings;
};

TEST_F(Warnings, AHookGetsTheEpisodeAndWhatIsToBeKnownOfTheWarning) {
    ZTSWarnRule lRule = rule("queue-full", keep("warned"));
    lRule.mCount = 5;
    start({lRule}).openHistory();
    takeNow(5);
    mpWarnings->setLive("{}");
    const nlohmann::json lDocument = document("warned");
    EXPECT_EQ(lDocument["kind"], "queue-full");
    EXPECT_EQ(lDocument["host"], "db07");
    EXPECT_EQ(lDocument["storeId"], store().getStoreId());
    EXPECT_EQ(lDocument["count"], 5);
    EXPECT_EQ(lDocument["remotePort"]["wwpn"], makeName(gcPortA).toText());
    EXPECT_EQ(lDocument["remotePort"]["name"], "array7 ctrl-A");
    EXPECT_EQ(lDocument["warning"]["previous"], 0);
    EXPECT_EQ(lDocument["warning"]["count"], 5);
    EXPECT_EQ(lDocument["warning"]["test"], false);
    EXPECT_TRUE(lDocument["warning"]["next"].is_string());
    EXPECT_THAT(readFile(mDirectory.path("warned.variables")),
                AllOf(HasSubstr("TAVIK_KIND=queue-full\n"), HasSubstr("TAVIK_PREVIOUS=0\n"),
                      HasSubstr("TAVIK_REMOTE_PORT_NAME=array7 ctrl-A\n"), HasSubstr("TAVIK_FIRST=2"),
                      HasSubstr("TAVIK_NEXT=2"), HasSubstr("TAVIK_EPISODE=1\n"), HasSubstr("TAVIK_TEST=0\n")));
}

TEST_F(Warnings, AHookOfAPortGetsThatPortsEpisodeThoughAnotherPortHasANewerOne) {
    ZTSWarnRule lRule = rule("queue-full", keep("warned"));
    lRule.mCount = 5;
    start({lRule}).openHistory();
    const std::int64_t lNow = toMicroseconds(getHistoryTime());
    take({makeQueueFull(gcPortA, lNow, lNow, 5), makeQueueFull(gcPortB, lNow, lNow, 1)}, lNow);
    mpWarnings->setLive("{}");
    const nlohmann::json lDocument = document("warned");
    EXPECT_EQ(lDocument["remotePort"]["wwpn"], makeName(gcPortA).toText());
    EXPECT_EQ(lDocument["count"], 5);
}

TEST_F(Warnings, AHookOfAnInitiatorGetsItsEpisodeThoughAnotherInitiatorHasANewerOne) {
    ZTSWarnRule lRule = rule("queue-full", keep("warned"));
    lRule.mCount = 5;
    lRule.mPer = "initiator";
    start({lRule}).openHistory();
    const std::int64_t lNow = toMicroseconds(getHistoryTime());
    take({makeQueueFull(gcPortA, lNow, lNow, 5)}, lNow);
    take({makeQueueFull(gcPortA, lNow, lNow, 1)}, lNow, gcLocalPort + 1);
    mpWarnings->setLive("{}");
    const nlohmann::json lDocument = document("warned");
    EXPECT_EQ(lDocument["initiator"]["wwpn"], makeName(gcLocalPort).toText());
    EXPECT_EQ(lDocument["count"], 5);
}

TEST_F(Warnings, AHookGetsTheDisksBehindTheEpisode) {
    ZTSTopology lTopology;
    lTopology.mInitiators.emplace_back();
    lTopology.mInitiators[0].mHost = "host7";
    lTopology.mInitiators[0].mWwpn = makeName(gcLocalPort);
    lTopology.mRemotePorts = {{.mName = "rport-7:0-3", .mHost = "host7", .mWwpn = makeName(gcPortA)}};
    lTopology.mPaths = {
        {.mAddress = "7:0:3:3", .mHost = "host7", .mRemotePort = "rport-7:0-3", .mLun = 3, .mDisk = "sdb"}};
    const std::int64_t lNow = toMicroseconds(getHistoryTime());
    inTransaction([&] { ASSERT_TRUE(store().noteTopology(lNow, lTopology)); });
    start({rule("queue-full", keep("warned"))}).openHistory();
    takeNow(5);
    mpWarnings->setLive("{}");
    const nlohmann::json lDocument = document("warned");
    ASSERT_EQ(lDocument["devices"].size(), 1U) << lDocument;
    EXPECT_EQ(lDocument["devices"][0]["disk"], "sdb");
    EXPECT_EQ(lDocument["remotePort"]["rport"], "rport-7:0-3");
}

TEST_F(Warnings, AStateIsWarnedOfWithoutAnEpisodeAndItsEndIsReported) {
    ZTSWarnRule lRule = rule("disk-full", keep("warned"));
    lRule.mWithin = seconds(1);
    start({lRule}).openHistory();
    mpWarnings->setLive(scDiskFull);
    const nlohmann::json lDocument = document("warned");
    EXPECT_EQ(lDocument["kind"], "disk-full");
    EXPECT_EQ(lDocument["episode"], nullptr);
    EXPECT_EQ(lDocument["remotePort"], nullptr);
    waitUntil([&] { return mpWarnings->describe() != "[]"; }, "the open warning");
    const nlohmann::json lOpen = nlohmann::json::parse(mpWarnings->describe());
    EXPECT_EQ(lOpen[0]["kind"], "disk-full");
    EXPECT_EQ(lOpen[0]["given"], 1);
    EXPECT_THAT(lOpen[0]["text"].get<std::string>(), HasSubstr("no room"));
    mpWarnings->setLive(scDiskOk);
    waitUntil([&] { return mpWarnings->describe() == "[]"; }, "the end of the warning");
    EXPECT_THAT(lines(), HasSubstr("the trouble is over: disk-full"));
}

TEST_F(Warnings, ARestartWarnsOfTheSameTroubleNoSoonerThanPromised) {
    const ZTSWarnRule lRule = rule("disk-full", keep("warned"));
    start({lRule}).openHistory();
    mpWarnings->setLive(scDiskFull);
    document("warned");
    waitUntil([&] { return !value(gcWarnBookValue).empty(); }, "the stored trouble");
    mpWarnings.reset();
    storeValues();
    unlink(mDirectory.path("warned").c_str());
    start({lRule}).openHistory();
    mpWarnings->setLive(scDiskFull);
    waitUntil([&] { return mpWarnings->describe() != "[]"; }, "the open warning");
    EXPECT_EQ(nlohmann::json::parse(mpWarnings->describe())[0]["given"], 1);
    mpWarnings.reset();  // ends behind a whole turn
    EXPECT_FALSE(exists(mDirectory.path("warned")));
}

TEST_F(Warnings, AHookThatIsMissingFailsOrHangsIsReportedCountedAndAnOpenWarning) {
    ZTSWarnRule lMissing = rule("disk-full", "");
    lMissing.mRun = {mDirectory.path("missing")};
    const ZTSWarnRule lFailing = rule("disk-full", "exit 9");
    ZTSWarnRule lHanging = rule("disk-full", "sleep 1000");
    lHanging.mTimeout = seconds(1);
    inTransaction([&] { store().setValue(scFailuresValue, "40"); });
    start({lMissing, lFailing, lHanging}).openHistory();
    mpWarnings->setLive(scDiskFull);
    waitUntil([&] { return value(scFailuresValue) == "43"; }, "three failures");
    EXPECT_THAT(lines(), AllOf(HasSubstr(lMissing.mRun.front() + " for disk-full failed: cannot run"),
                               HasSubstr("ended with status 9"), HasSubstr("still ran after 1 s")));
    waitUntil([&] { return nlohmann::json::parse(mpWarnings->describe()).size() == 6; }, "the open warnings");
}

TEST_F(Warnings, ATestRunsEveryHookAndSaysWhichFailed) {
    const ZTSWarnRule lGood = rule("queue-full", keep("tested"));
    const ZTSWarnRule lBad = rule("gap", "exit 9");
    start({lGood, lBad});
    const nlohmann::json lAnswer = test();
    ASSERT_EQ(lAnswer["hooks"].size(), 2U);
    EXPECT_EQ(lAnswer["hooks"][0]["problem"], nullptr);
    EXPECT_EQ(lAnswer["hooks"][0]["run"][0], lGood.mRun.front());
    EXPECT_THAT(lAnswer["hooks"][1]["problem"].get<std::string>(), HasSubstr("status 9"));
    const nlohmann::json lDocument = document("tested");
    EXPECT_EQ(lDocument["kind"], "queue-full");
    EXPECT_EQ(lDocument["warning"]["test"], true);
    EXPECT_THAT(readFile(mDirectory.path("tested.variables")), HasSubstr("TAVIK_TEST=1\n"));
}

TEST_F(Warnings, AHookThatWorksAgainIsNoLongerAWarning) {
    const ZTSWarnRule lRule = rule("gap", "test -e " + mDirectory.path("mended"));
    start({lRule});
    EXPECT_NE(test()["hooks"][0]["problem"], nullptr);
    waitUntil([&] { return mpWarnings->describe() != "[]"; }, "the warning");
    writeFile(mDirectory.path("mended"), "");
    EXPECT_EQ(test()["hooks"][0]["problem"], nullptr);
    waitUntil([&] { return mpWarnings->describe() == "[]"; }, "its end");
}

TEST_F(Warnings, ATestWithoutHooksSaysSo) {
    start({});
    EXPECT_EQ(test()["hooks"].size(), 0U);
}

TEST_F(Warnings, TheBellRingsForTheAnswerToATestAndIsSilentOnceTheAnswerIsTaken) {
    start({});
    const auto lIsRung = [this] {
        pollfd lBell{.fd = mpWarnings->getBell(), .events = POLLIN, .revents = 0};
        return poll(&lBell, 1, 0) == 1;
    };
    EXPECT_FALSE(lIsRung());
    mpWarnings->test(7);
    waitUntil(lIsRung, "the bell");
    EXPECT_EQ(mpWarnings->takeTests().size(), 1U);
    EXPECT_FALSE(lIsRung()) << "a thread that polls it would spin";
}

TEST_F(Warnings, NewRulesTakeEffectAtOnceAndEndATestOfTheOldOnes) {
    start({rule("gap", "touch " + mDirectory.path("runs") + "\nsleep 1000")});
    mpWarnings->test(7);
    waitUntil([&] { return exists(mDirectory.path("runs")); }, "the slow hook");
    ZTSSettings lSettings;
    lSettings.mWarnings = {rule("disk-full", keep("warned"))};
    mpWarnings->setSettings(lSettings);
    mpWarnings->openHistory();
    mpWarnings->setLive(scDiskFull);
    std::vector<ZTSHookTest> lTests;
    waitUntil([&] { return !(lTests = mpWarnings->takeTests()).empty(); }, "the answer to the test");
    EXPECT_THAT(lTests.front().mAnswer, HasSubstr("error"));
    EXPECT_EQ(document("warned")["kind"], "disk-full");
}

TEST_F(Warnings, EndsAtOnceWhileAHookHangs) {
    start({rule("gap", "touch " + mDirectory.path("runs") + "\nsleep 1000")});
    mpWarnings->test(7);
    waitUntil([&] { return exists(mDirectory.path("runs")); }, "the hook");
    const ZTCDeadline lDeadline;
    mpWarnings.reset();
    EXPECT_FALSE(lDeadline.isOver());
}
