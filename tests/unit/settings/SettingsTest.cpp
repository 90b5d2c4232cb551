#include "sensor/settings/include/Settings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "sensor/settings/include/SettingsList.h"
#include "tests/support/TemporaryDirectory.h"

using std::chrono::milliseconds;
using testing::ElementsAre;
using testing::IsEmpty;

static ZTSSettings sRead(const std::string& acrText) {
    const ZTSSettingsReading lReading = parseSettings(acrText, "t.toml");
    for (const ZTSSettingsProblem& lcrError : lReading.mErrors) {
        ADD_FAILURE() << lcrError.toText();
    }
    return lReading.mSettings;
}

TEST(Settings, WithoutAFileTheDefaultsHold) {
    const ZTSSettings lSettings = sRead("");
    EXPECT_EQ(lSettings.mAgentProgram, "qrv-tvk");
    EXPECT_EQ(lSettings.mAgentLibrary, "");
    EXPECT_EQ(lSettings.mAgentLog, "/var/log/tavik/qrv-tvk.log");
    EXPECT_EQ(lSettings.mAgentLogLevel, 31U);
    EXPECT_EQ(lSettings.mAgentHeartbeat, milliseconds(60000));
    EXPECT_EQ(lSettings.mSensorDirectory, "/run/tavik");
    EXPECT_EQ(lSettings.mSensorState, "/var/lib/tavik");
    EXPECT_EQ(lSettings.mCollectPeriod, milliseconds(5000));
    EXPECT_EQ(lSettings.mCollectRecordLimit, 900U);
    EXPECT_TRUE(lSettings.mTargetsSysfs);
    EXPECT_EQ(lSettings.mTargetsFile, "");
    EXPECT_THAT(lSettings.mNames, IsEmpty());
    EXPECT_EQ(lSettings.mHistoryDays, 90U);
    EXPECT_EQ(lSettings.mHistorySize, 2147483648U);
    EXPECT_EQ(lSettings.mHistoryRecords, 100U);
    EXPECT_EQ(lSettings.mEpisodeGap, milliseconds(60000));
    EXPECT_EQ(lSettings.mHttpListen, "127.0.0.1:9632");
    EXPECT_FALSE(lSettings.mHttpPublic);
    EXPECT_THAT(lSettings.mHttpHosts, IsEmpty());
    EXPECT_EQ(lSettings.mMetricsTextfile, "");
    EXPECT_EQ(lSettings.mMetricsRemotePorts, 500U);
    EXPECT_EQ(lSettings.mNdjsonPath, "");
    EXPECT_EQ(lSettings.mNdjsonSize, 67108864U);
    EXPECT_EQ(lSettings.mNdjsonKeep, 5U);
    EXPECT_FALSE(lSettings.mJournalEnabled);
    EXPECT_THAT(lSettings.mWarnings, IsEmpty());
    EXPECT_EQ(lSettings, defaultSettings());
}

TEST(Settings, EveryKeyOfTheFileIsTaken) {
    const ZTSSettings lSettings = sRead(R"(
agent = {program = "/opt/qrv-tvk", library = "libx.so", log = "/l", log_level = 255, heartbeat = "2m"}
[sensor]
directory = "/d//"
state = "/s/"
[collect]
period = 0.1
record_limit = 4294967295
[targets]
sysfs = false
file = "/t"
[names]
"50:06:01:60:3B:A0:12:34" = "array7 ctrl-A"
500601683ba01234 = "Größe"
[history]
days = 1
size = "1GiB"
records = 0
[episode]
gap = "1h"
[http]
listen = "0.0.0.0:80"
public = true
hosts = ["db07.example", "[::2]"]
[metrics]
textfile = "/m.prom"
remote_ports = 3
[ndjson]
path = "-"
size = 1048576
keep = 9
[journal]
enabled = true
[[warn]]
kind = "queue-full"
run = ["/bin/tell"]
[[warn]]
kind = "deaf"
count = 7
within = "5m"
per = "host"
run = ["tell", "-u", ""]
timeout = 10
)");
    EXPECT_EQ(lSettings.mAgentProgram, "/opt/qrv-tvk");
    EXPECT_EQ(lSettings.mAgentLibrary, "libx.so");
    EXPECT_EQ(lSettings.mAgentLog, "/l");
    EXPECT_EQ(lSettings.mAgentLogLevel, 255U);
    EXPECT_EQ(lSettings.mAgentHeartbeat, milliseconds(120000));
    EXPECT_EQ(lSettings.mSensorDirectory, "/d");
    EXPECT_EQ(lSettings.mSensorState, "/s");
    EXPECT_EQ(lSettings.agentDirectory(), "/d/agent");
    EXPECT_EQ(lSettings.controlPath(), "/d/control");
    EXPECT_EQ(lSettings.databasePath(), "/s/history.db");
    EXPECT_EQ(lSettings.spoolDirectory(), "/s/spool");
    EXPECT_EQ(lSettings.mCollectPeriod, milliseconds(100));
    EXPECT_EQ(lSettings.mCollectRecordLimit, 4294967295U);
    EXPECT_FALSE(lSettings.mTargetsSysfs);
    EXPECT_EQ(lSettings.mTargetsFile, "/t");
    EXPECT_THAT(lSettings.mNames, ElementsAre(testing::Pair("50:06:01:60:3b:a0:12:34", "array7 ctrl-A"),
                                              testing::Pair("50:06:01:68:3b:a0:12:34", "Größe")));
    EXPECT_EQ(lSettings.mHistoryDays, 1U);
    EXPECT_EQ(lSettings.mHistorySize, 1073741824U);
    EXPECT_EQ(lSettings.mHistoryRecords, 0U);
    EXPECT_EQ(lSettings.mEpisodeGap, milliseconds(3600000));
    EXPECT_EQ(lSettings.mHttpListen, "0.0.0.0:80");
    EXPECT_TRUE(lSettings.mHttpPublic);
    EXPECT_THAT(lSettings.mHttpHosts, ElementsAre("db07.example", "[::2]"));
    EXPECT_EQ(lSettings.mMetricsTextfile, "/m.prom");
    EXPECT_EQ(lSettings.mMetricsRemotePorts, 3U);
    EXPECT_EQ(lSettings.mNdjsonPath, "-");
    EXPECT_EQ(lSettings.mNdjsonSize, 1048576U);
    EXPECT_EQ(lSettings.mNdjsonKeep, 9U);
    EXPECT_TRUE(lSettings.mJournalEnabled);
    ASSERT_EQ(lSettings.mWarnings.size(), 2U);
    EXPECT_EQ(lSettings.mWarnings[0], (ZTSWarnRule{"queue-full", 1, milliseconds(60000), "port", {"/bin/tell"}}));
    EXPECT_EQ(lSettings.mWarnings[1],
              (ZTSWarnRule{"deaf", 7, milliseconds(300000), "host", {"tell", "-u", ""}, milliseconds(10000)}));
}

TEST(Settings, ListenAddressesOfThisHostNeedNoPermission) {
    for (const char* lpListen : {"", "127.0.0.1:1", "127.9.9.9:65535", "[::1]:80", "localhost:80", "unix:/run/x"}) {
        EXPECT_EQ(sRead("http.listen = \"" + std::string(lpListen) + "\"").mHttpListen, lpListen);
    }
}

TEST(Settings, ChangedKeysAreNamedInTheOrderOfTheTable) {
    ZTSSettings lSettings = defaultSettings();
    EXPECT_THAT(changedKeys(lSettings, defaultSettings()), IsEmpty());
    lSettings.mSensorState = "/x";
    lSettings.mAgentLogLevel = 1;
    lSettings.mNames["50:06:01:60:3b:a0:12:34"] = "a";
    lSettings.mHttpHosts.emplace_back("h");
    lSettings.mWarnings.emplace_back();
    EXPECT_THAT(changedKeys(lSettings, defaultSettings()),
                ElementsAre("agent.log_level", "sensor.state", "http.hosts", "names", "warn"));
}

TEST(DefaultSettingsFile, IsTheInstalledOne) {
    EXPECT_EQ(readFile(TAVIK_DEFAULT_SETTINGS), defaultSettingsFile())
        << "deploy/tavik.toml must be what defaultSettingsFile() yields";
}

TEST(DefaultSettingsFile, ChangesNothingAsItStandsAndWithEveryCommentTakenAway) {
    const std::string lText = defaultSettingsFile();
    EXPECT_EQ(sRead(lText), defaultSettings());
    std::string lUncommented;
    unsigned lKeys = 0;
    for (std::size_t lStart = 0; lStart < lText.size();) {
        const std::size_t lEnd = lText.find('\n', lStart);
        std::string lLine = lText.substr(lStart, lEnd - lStart);
        if (lLine.starts_with("#") && !lLine.starts_with("# ")) {
            lLine.erase(0, 1);
            ++lKeys;
        }
        EXPECT_LE(lLine.size(), 120U) << lLine;
        lUncommented += lLine + "\n";
        lStart = lEnd + 1;
    }
    EXPECT_EQ(lKeys, 24U);
    EXPECT_EQ(sRead(lUncommented), defaultSettings());
}

TEST(DefaultSettingsFile, ItsExamplesAreGoodSettings) {
    const std::string lText = defaultSettingsFile();
    const std::size_t lNames = lText.find("# \"50:06");
    const std::size_t lWarn = lText.find("# [[warn]]");
    ASSERT_NE(lNames, std::string::npos);
    ASSERT_NE(lWarn, std::string::npos);
    std::string lExamples = "[names]\n" + lText.substr(lNames + 2, lText.find('\n', lNames) - lNames);
    for (std::size_t lStart = lWarn; lStart < lText.size(); lStart = lText.find('\n', lStart) + 1) {
        lExamples += lText.substr(lStart + 2, lText.find('\n', lStart) - lStart - 1);
    }
    const ZTSSettings lSettings = sRead(lExamples);
    EXPECT_EQ(lSettings.mNames.size(), 1U);
    ASSERT_EQ(lSettings.mWarnings.size(), 1U);
    EXPECT_EQ(lSettings.mWarnings[0].mCount, 100U);
}

TEST(SettingsSecrets, ThatHoldAnotherOneComeBeforeIt) {
    ZTSSettings lSettings;
    lSettings.mWarnings.emplace_back().mRun = {"/usr/bin/hook", "t0k3n", "abc"};
    lSettings.mWarnings.emplace_back().mRun = {"/usr/bin/hook", "--auth=t0k3n-of-db07"};
    EXPECT_THAT(listSecrets(lSettings), ElementsAre("--auth=t0k3n-of-db07", "t0k3n"));
}
