// What the commands show of ports, disks and counters over the real chain: agent on the simulated library, sensor,
// history, and a tree in the place of sysfs that the test changes.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "sensor/store/include/HistoryTime.h"
#include "sensor/views/include/TimeText.h"
#include "tests/sensor/SensorProcess.h"
#include "tests/support/SettableClock.h"
#include "tests/unit/topology/FakeSysfs.h"

using testing::HasSubstr;
using testing::Not;

/// How long a whole look at the host may be away: the sensor takes one each half minute.
static constexpr std::chrono::seconds scScanPatience = 3 * gcTestPatience;

static constexpr const char* scAdapters =
    "adapter hba7 wwpn=10:00:00:00:00:00:00:07 wwnn=20:00:00:00:00:00:00:07 fcid=0x010007\n"
    "port a0 wwpn=50:06:01:60:00:00:00:00 wwnn=50:06:01:60:f0:00:00:00 fcid=0x020000\n";

class NamesOverTheChain : public testing::Test {
protected:
    NamesOverTheChain() : mSensor("collect.period = 0.1\nepisode.gap = 600\n"), mClock(mSensor.path("clock")) {
        mTree.addHost(7);
        mTree.addRemotePort(7, 0, 0);
        mTree.addPath(7, 0, 3, "naa.60060160", "sdc");
        mSensor.setEnvironment("TAVIK_SYSFS_ROOT", mTree.roots().mSysfs);
        for (const auto& [lrName, lrValue] : mClock.getEnvironment()) {
            mSensor.setEnvironment(lrName, lrValue);
        }
        mSensor.setScenario(scAdapters);
    }

    struct ZTSShownRun {
        int mExit;
        std::string mOutput;
    };
    /// `tavik` as a person runs it, on the sensor's clock.
    ZTSShownRun tavik(const std::vector<std::string>& acrArguments) {
        ZTSChildProcessSetup lSetup;
        lSetup.mProgram = TAVIK_PROGRAM;
        lSetup.mArguments = {"--config", mSensor.configPath()};
        lSetup.mArguments.insert(lSetup.mArguments.end(), acrArguments.begin(), acrArguments.end());
        lSetup.mEnvironment = mClock.getEnvironment();
        lSetup.mEnvironment["COLUMNS"] = "400";
        lSetup.mWorkingDirectory = mSensor.path("");
        lSetup.mOutputPrefix = mSensor.path("tavik" + std::to_string(++mRuns));
        ZTCChildProcess lProcess(lSetup);
        const int lExit = lProcess.waitForExit();
        return {lExit, lProcess.standardOutput() + lProcess.standardError()};
    }
    nlohmann::json tavikJson(std::vector<std::string> aArguments) {
        aArguments.insert(aArguments.begin(), "--json");
        const ZTSShownRun lRun = tavik(aArguments);
        return lRun.mOutput.starts_with('{') ? nlohmann::json::parse(lRun.mOutput) : nlohmann::json();
    }
    std::string scanned() { return mSensor.status()["topology"].value("scanned", nlohmann::json()).dump(); }
    /// Until the sensor has looked at everything once more, soon: events of a link are a reason to.
    void waitForNextScan() {
        const std::string lBefore = scanned();
        mSensor.simulate("link board=hba7 times=2");
        waitUntil([&] { return scanned() != lBefore; }, "the next look at the host", ZTCDeadline(scScanPatience));
    }
    void start() {
        mSensor.start();
        waitUntil([this] { return scanned() != "null"; }, "the first look at the host", ZTCDeadline(scScanPatience));
    }
    void writeCounter(const std::string& acrName, const std::string& acrValue) {
        mTree.write("devices/pci0/host7/fc_host/host7/statistics/" + acrName, acrValue);
    }

    ZTCFakeSysfs mTree;
    ZTCSensorProcess mSensor;
    ZTCSettableClock mClock;
    unsigned mRuns = 0;
    const std::string mState = "devices/pci0/host7/rport-7:0-0/fc_remote_ports/rport-7:0-0/port_state";
};

TEST_F(NamesOverTheChain, CountersThatRiseStandBesideTheEpisodesOfTheSamePortAndMinute) {
    const std::string lPortCounter = "devices/pci0/host7/rport-7:0-0/fc_remote_ports/rport-7:0-0/statistics/fpin_cn";
    writeCounter("invalid_crc_count", "0x10");
    writeCounter("loss_of_sync_count", "0xffffffffffffffff");  // not supported
    writeCounter("link_failure_count", "0xfffffffffffffff0");  // about to wrap around
    writeCounter("error_frames", "0x20");                      // about to be reset
    mTree.write(lPortCounter, "0x1");
    start();
    mSensor.simulate("queue-full board=hba7 port=a0 lun=3 times=4");
    waitForNextScan();  // the counters are read behind a look: the first values are known now

    const auto lShown = [this](const char* apKind) {
        const nlohmann::json lEpisodes = tavikJson({"events", "--kind", apKind})["episodes"];
        return lEpisodes.empty() ? nlohmann::json::array() : lEpisodes[0]["counters"];
    };
    const auto lCounter = [](const char* apOf, const char* apName, int aDifference) {
        return nlohmann::json{{"of", apOf}, {"counter", apName}, {"difference", aDifference}};
    };
    writeCounter("invalid_crc_count", "0x15");
    writeCounter("loss_of_sync_count", "0xffffffffffffffff");
    writeCounter("link_failure_count", "0x2");
    writeCounter("error_frames", "0x3");
    mTree.write(lPortCounter, "0x4");
    mClock.setAhead(std::chrono::seconds(61));
    mSensor.simulate("queue-full board=hba7 port=a0 lun=3 times=4");
    waitForNextScan();
    waitUntil([&] { return !lShown("queue-full").empty(); }, "counters in the history", ZTCDeadline(scScanPatience));
    EXPECT_EQ(lShown("queue-full"), nlohmann::json::array({lCounter("initiator", "invalid_crc_count", 5),
                                                           lCounter("remotePort", "fpin_cn", 3)}))
        << "what fell has no difference, and what is not supported is no number";
    EXPECT_EQ(lShown("link"), nlohmann::json::array({lCounter("initiator", "invalid_crc_count", 5)}))
        << "an event of the link has no remote port";

    // What wrapped around, or was reset, counts from there on.
    writeCounter("link_failure_count", "0x5");
    writeCounter("error_frames", "0x7");
    mClock.setAhead(std::chrono::seconds(122));
    mSensor.simulate("queue-full board=hba7 port=a0 lun=3 times=4");
    waitForNextScan();
    waitUntil([&] { return lShown("queue-full").size() == 4; }, "more counters", ZTCDeadline(scScanPatience));
    EXPECT_EQ(
        lShown("queue-full"),
        nlohmann::json::array({lCounter("initiator", "error_frames", 4), lCounter("initiator", "invalid_crc_count", 5),
                               lCounter("initiator", "link_failure_count", 3), lCounter("remotePort", "fpin_cn", 3)}));

    EXPECT_THAT(tavik({"events", "--kind", "queue-full"}).mOutput,
                HasSubstr("error_frames +4, invalid_crc_count +5, link_failure_count +3, port's fpin_cn +3"));
    EXPECT_THAT(tavik({"ports"}).mOutput, HasSubstr("queue-full 12; port's fpin_cn +3"));
    EXPECT_EQ(tavikJson({"ports"})["ports"][0]["counters"],
              nlohmann::json::array({lCounter("remotePort", "fpin_cn", 3)}));
    const auto lEpisode = tavikJson({"events", "--kind", "link"})["episodes"][0]["episode"].get<std::uint64_t>();
    EXPECT_THAT(tavik({"explain", std::to_string(lEpisode)}).mOutput,
                HasSubstr("Counters that rose in the same minutes: error_frames +4, invalid_crc_count +5"));
    const std::string lExplained = tavik({"explain"}).mOutput;
    EXPECT_THAT(lExplained, HasSubstr("Error counters rose around that time: "));
    EXPECT_THAT(lExplained, HasSubstr("invalid_crc_count +5"));
    EXPECT_THAT(lExplained, Not(HasSubstr("loss_of_sync_count")));
}

TEST_F(NamesOverTheChain, AnAttributeThatBlocksMakesNamesStaleInWordsAndCollectingGoesOn) {
    const std::string lBlocking = mTree.path(mState);
    ASSERT_EQ(unlink(lBlocking.c_str()), 0);
    ASSERT_EQ(mkfifo(lBlocking.c_str(), 0600), 0);  // opening it for reading waits for a writer
    start();
    mSensor.simulate("queue-full board=hba7 port=a0 lun=3 times=4");
    mSensor.waitUntilAllIsStored();
    const ZTSShownRun lRun = tavik({"status"});
    EXPECT_EQ(lRun.mExit, 0) << lRun.mOutput;
    EXPECT_THAT(lRun.mOutput, HasSubstr("COLLECTING"));
    EXPECT_THAT(lRun.mOutput, HasSubstr("names and states of ports and disks are stale since "));
    EXPECT_THAT(lRun.mOutput, HasSubstr("rport-7:0-0/port_state"));
    const nlohmann::json lTopology = tavikJson({"status"})["topology"];
    EXPECT_EQ(lTopology["stale"], true);
    EXPECT_TRUE(lTopology["since"].is_string());
    EXPECT_EQ(lTopology["action"], "journalctl -k -n 50");
    EXPECT_THAT(lTopology["text"].get<std::string>(),
                testing::AllOf(HasSubstr("rport-7:0-0/port_state does not answer; events are collected all the same"),
                               HasSubstr("the kernel's log: journalctl -k -n 50")));
    EXPECT_THAT(lTopology["blocked"].dump(), HasSubstr("rport-7:0-0/port_state"));
    EXPECT_EQ(tavikJson({"events", "--kind", "queue-full"})["episodes"][0]["count"], 4) << "nothing waited for it";
}

TEST_F(NamesOverTheChain, AMarkOfATimeThatIsPastServesADiff) {
    start();
    const auto lState = [this] {
        const nlohmann::json lPaths = tavikJson({"paths"});
        return lPaths.is_null() || lPaths["luns"].empty() ? ""
                                                          : lPaths["luns"][0]["paths"][0]["remotePortState"].dump();
    };
    waitUntil([&] { return lState() == "\"Online\""; }, "the paths", ZTCDeadline(scScanPatience));
    const std::string lBefore = toRfc3339(getHistoryTime());
    mTree.write(mState, "Blocked");
    waitForNextScan();
    waitUntil([&] { return lState() == "\"Blocked\""; }, "the port's new state", ZTCDeadline(scScanPatience));
    const ZTSShownRun lMark = tavik({"mark", "before", "--at", lBefore});
    EXPECT_EQ(lMark.mExit, 0) << lMark.mOutput;
    EXPECT_THAT(lMark.mOutput, HasSubstr("mark \"before\" set at "));
    const ZTSShownRun lDiff = tavik({"diff", "before"});
    EXPECT_EQ(lDiff.mExit, 1) << lDiff.mOutput;
    const nlohmann::json lChanges = tavikJson({"diff", "before"});
    EXPECT_EQ(lChanges["from"]["mark"], "before");
    ASSERT_EQ(lChanges["changes"].size(), 1U) << lChanges.dump(1);
    EXPECT_EQ(lChanges["changes"][0]["what"], "remotePort");
    EXPECT_EQ(lChanges["changes"][0]["before"], "Online");
    EXPECT_EQ(lChanges["changes"][0]["after"], "Blocked");

    // The trouble's words lead to the episode of that moment.
    const nlohmann::json lTroubles = tavikJson({"status"})["san"];
    ASSERT_FALSE(lTroubles.empty());
    const auto lEpisode = tavikJson({"events", "--kind", "link"})["episodes"][0]["episode"].get<std::uint64_t>();
    for (const nlohmann::json& lrTrouble : lTroubles) {
        EXPECT_EQ(lrTrouble["see"], "tavik explain " + std::to_string(lEpisode)) << lrTrouble.dump(1);
    }
}
