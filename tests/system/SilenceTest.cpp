#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

// With a log code of 0 the agent does what it does otherwise, troubles included, and says nothing.

namespace {

std::vector<std::string> sArguments(const ZTCAgentProcess& acrAgent, const std::vector<std::string>& acrMore = {}) {
    std::vector<std::string> lArguments{"-D", "false", "-d", "0", "-l", acrAgent.agentLogPath()};
    lArguments.insert(lArguments.end(), acrMore.begin(), acrMore.end());
    return lArguments;
}

/// What is said before the options are known.
const std::set<std::string>& sTextsBeforeTheOptions() {
    static const auto& srTexts = *[] {
        auto* const lpTexts = new std::set<std::string>;
        ZTCAgentProcess lAgent;
        lAgent.startAndConnectQuietly(0);
        EXPECT_EQ(0, lAgent.stop());
        for (const ZTSLogLine& lcrLine : lAgent.log().lines()) {
            EXPECT_TRUE(lcrLine.mText == "Starting the Tavik" || lcrLine.mText.ends_with("... continuing"))
                << lcrLine.mText;
            lpTexts->insert(lcrLine.mText);
        }
        return lpTexts;
    }();
    return srTexts;
}

void sExpectSilence(const ZTCAgentProcess& acrAgent) {
    for (const std::string& lcrLine : acrAgent.log().rawLines()) {
        const std::optional<ZTSLogLine> lParsed = parseLogLine(lcrLine);
        EXPECT_TRUE(lParsed && sTextsBeforeTheOptions().count(lParsed->mText) != 0) << lcrLine;
    }
}

/// Prepares a start that ends by itself with this status.
void sExpectSilentEnd(int aStatus, const std::function<void(ZTCAgentProcess&)>& acrPrepare) {
    ZTCAgentProcess lAgent;
    acrPrepare(lAgent);
    EXPECT_EQ(aStatus, lAgent.run(sArguments(lAgent)).mStatus);
    sExpectSilence(lAgent);
}

}  // namespace

TEST(Silence, EventsOfEverySortAreHandledWithoutAWord) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(0);
    lAgent.startScope();
    unsigned lRecords = 0;
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        const ZTCBytes lShort(lcrKind.mMinimumLength - 1, 0);
        lAgent.library().deliverAll(
            {ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData),
             ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lShort),
             ZTSLibraryEvent::scope(7, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData)});
        ++lRecords;
    }
    for (const unsigned lCategory : {1u, 2u, 4u, 8u, 16u, 32u}) {
        lAgent.library().deliver(ZTSLibraryEvent::bare(0, lCategory, 0x80));
    }
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, ZTCBytes(7, 0)));
    EXPECT_EQ(lRecords, lAgent.retrieve().texts().size());
    EXPECT_EQ(0, lAgent.stop());
    sExpectSilence(lAgent);
}

TEST(Silence, CommandsAndWhatTheLibraryRefusesAreAnsweredWithoutAWord) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnectQuietly(0);
    for (const char* lpLevel : {"1", "2", "3", "4"}) {
        lAgent.library().configure(std::string("log ") + lpLevel + " a line of the library's own");
    }
    lAgent.library().configure("register-status 1 1 1 3");
    EXPECT_EQ(gcNotAllowedHex, lAgent.request("0000001000"));
    lAgent.library().configure("register-status 1 1 1 0");
    lAgent.library().configure("register-handle 0 0 32 0");
    lAgent.startScope();
    lAgent.startScope();
    EXPECT_EQ(gcInvalidHex, lAgent.request("0300000000"));
    lAgent.pipes().sendRaw(bytesOf("00000000"));
    lAgent.pipes().waitUntilTaken();
    EXPECT_TRUE(lAgent.ping());
    lAgent.library().configure("adapters 1");
    lAgent.retrieve();
    lAgent.library().configure("adapters 3");
    lAgent.retrieve();
    EXPECT_EQ(gcSuccessHex, lAgent.request(gcStopScopeHex));
    EXPECT_EQ(gcSuccessHex, lAgent.request(gcShutDownHex));
    EXPECT_EQ(0, lAgent.waitForExit());
    sExpectSilence(lAgent);
}

TEST(Silence, AnUnknownCommandEndsTheAgentWithoutAWord) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(0);
    lAgent.pipes().sendRequest({6});
    EXPECT_EQ(1, lAgent.waitForExit());
    sExpectSilence(lAgent);
}

TEST(Silence, AStartWithoutAUsableLibraryOrWithASecondOneRunningEndsWithoutAWordInItsLog) {
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", ""); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.setEnvironment("ZT_LIBKPM_PATH", "/no/libkpm.so"); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("version 2"); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("adapters 0"); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("ztapi-supported 0"); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { arAgent.library().configure("init-status 5"); });
    sExpectSilentEnd(0, [](ZTCAgentProcess& arAgent) { std::filesystem::create_directory(arAgent.pidFilePath()); });

    ZTCAgentProcess lAgent;
    lAgent.startAndConnectQuietly(0);
    const ZTSRunResult lSecond = lAgent.run(sArguments(lAgent));
    EXPECT_EQ(0, lSecond.mStatus);
    EXPECT_NE(std::string::npos, lSecond.mError.find("runs already")) << lSecond.mError;
    EXPECT_EQ(0, lAgent.stop());
    sExpectSilence(lAgent);
}

TEST(Silence, SharedPlacesReplacedFilesAndAReopenedLogAreBorneWithoutAWord) {
    ZTCAgentProcess lAgent;
    std::filesystem::permissions(lAgent.sensorDirectory(), std::filesystem::perms::all);
    ASSERT_EQ(0, mkfifo(lAgent.commandFifoPath().c_str(), 0600));
    std::filesystem::permissions(lAgent.commandFifoPath(), std::filesystem::perms::all);
    lAgent.startAndConnectQuietly(0);
    const std::string lMoved = lAgent.workingDirectory() + "/moved.log";
    std::filesystem::rename(lAgent.agentLogPath(), lMoved);
    lAgent.process().sendSignal(SIGHUP);
    for (const std::string& lcrPath : {lAgent.commandFifoPath(), lAgent.pidFilePath()}) {
        std::filesystem::remove(lcrPath);
        writeFile(lcrPath, "somebody else's\n");
    }
    EXPECT_EQ(0, lAgent.stop());
    EXPECT_EQ("somebody else's\n", readFile(lAgent.pidFilePath()));
    EXPECT_EQ("somebody else's\n", readFile(lAgent.commandFifoPath()));
    sExpectSilence(lAgent);
}

TEST(Silence, ADeadSensorAndALostPidFileEndTheAgentWithoutAWord) {
    ZTCAgentProcess lWithoutSensor;
    ZTCAgentProcess lWithoutFile;
    writeFile(lWithoutFile.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    lWithoutSensor.startAndConnectQuietly(0, {"-b", "1"});
    lWithoutFile.startAndConnectQuietly(0, {"-b", "1"});
    std::filesystem::remove(lWithoutFile.pidFilePath());
    for (ZTCAgentProcess* lpAgent : {&lWithoutFile, &lWithoutSensor}) {
        EXPECT_EQ(0, lpAgent->waitForExit());
        sExpectSilence(*lpAgent);
    }
}
