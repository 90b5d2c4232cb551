#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstddef>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/support/ResourceLimit.h"
#include "tests/support/SmallFileSystem.h"

// Files and directories in trouble while the agent starts or runs: each outcome is one that docs/operations.md names.

static const char* const scLimitLine = "The limit set is 262144";

/// One command that is answered and logs one line, however the log fares.
static void sExpectServed(ZTCAgentProcess& arAgent) {
    ASSERT_EQ(arAgent.request(periodHex(7)), gcSuccessHex);
}

static std::string sStandardError(ZTCAgentProcess& arAgent) {
    return arAgent.process().standardError();
}

static std::size_t sCount(const std::vector<ZTSLogLine>& acrLines, const std::string& acrText) {
    std::size_t lCount = 0;
    for (const ZTSLogLine& lcrLine : acrLines) {
        lCount += lcrLine.mText == acrText ? 1 : 0;
    }
    return lCount;
}

static void sStart(ZTCAgentProcess& arAgent, const std::string& acrLog, unsigned aHeartbeat = 240) {
    writeFile(arAgent.sensorPidFilePath(), std::to_string(getpid()) + "\n");
    arAgent.start({"-D", "false", "-d", "127", "-l", acrLog, "-b", std::to_string(aHeartbeat)});
    arAgent.pipes().open();
    sExpectServed(arAgent);
}

/// Commands are served while the log takes no line; once it does again, the count of those that went to standard error
/// is in it, and no line is missing from both. `aError` is the reason that the count names.
template <typename Block, typename Free>
static void sExpectLinesOnStandardErrorAndCounted(ZTCAgentProcess& arAgent, const ZTCAgentLog& acrLog,
                                                  const std::string& acrReason, Block aBlock, Free aFree) {
    aBlock();
    // More than what is left of a page of the file.
    constexpr std::size_t lcCommands = 60;
    for (std::size_t i = 0; i < lcCommands; ++i) {
        sExpectServed(arAgent);
    }
    const std::size_t lLost = parseLogLines(sStandardError(arAgent)).size();
    EXPECT_GT(lLost, 0u);
    aFree();
    sExpectServed(arAgent);
    EXPECT_EQ(arAgent.stop(), 0);
    const std::vector<ZTSLogLine> lErrorLines = parseLogLines(sStandardError(arAgent));
    EXPECT_EQ(acrLog.count(scLimitLine) + sCount(lErrorLines, scLimitLine), lcCommands + 2);
    const auto lReports = acrLog.containing("log lines could not be written to '" + acrLog.path() + "'");
    ASSERT_EQ(lReports.size(), 1u);
    EXPECT_TRUE(lReports[0].mText.starts_with(std::to_string(lErrorLines.size()) + " ")) << lReports[0].mText;
    EXPECT_TRUE(lReports[0].mText.ends_with(acrReason)) << lReports[0].mText;
    EXPECT_TRUE(acrLog.has("Tavik System exiting", "-H-"));
}

static void sExpectEndedInOrder(ZTCAgentProcess& arAgent) {
    EXPECT_EQ(arAgent.waitForExit(), 0);
    EXPECT_TRUE(arAgent.log().has("Tavik System exiting", "-H-"));
}

static void sExpectNextStartServed(ZTCAgentProcess& arAgent) {
    arAgent.pipes().close();
    sStart(arAgent, arAgent.agentLogPath());
    EXPECT_EQ(arAgent.stop(), 0);
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_FALSE(exists(arAgent.responseFifoPath()));
}

// ---- The log ----

TEST(Trouble, ADeletedLogTakesLinesUntilAHangupMakesANewOne) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, lAgent.agentLogPath());
    std::filesystem::remove(lAgent.agentLogPath());
    sExpectServed(lAgent);
    EXPECT_FALSE(exists(lAgent.agentLogPath()));
    lAgent.process().sendSignal(SIGHUP);
    lAgent.log().waitFor("The log file was reopened");
    sExpectServed(lAgent);
    EXPECT_EQ(lAgent.log().count(scLimitLine), 1u);
    EXPECT_EQ(sStandardError(lAgent), "");
}

TEST(Trouble, ALogDirectoryThatIsGoneKeepsTheFormerFileUntilItIsBack) {
    ZTCAgentProcess lAgent;
    const std::string lDirectory = lAgent.workingDirectory() + "/logs";
    const ZTCAgentLog lLog(lDirectory + "/agent.log");
    std::filesystem::create_directory(lDirectory);
    sStart(lAgent, lLog.path());
    const std::string lAside = lAgent.workingDirectory() + "/former.log";
    std::filesystem::rename(lLog.path(), lAside);
    std::filesystem::remove(lDirectory);

    lAgent.process().sendSignal(SIGHUP);
    const ZTCAgentLog lFormer(lAside);
    lFormer.waitFor("The log file was reopened");
    EXPECT_EQ(lFormer.containing("Cannot open the log file '" + lLog.path() + "' anew").size(), 1u);
    sExpectServed(lAgent);
    EXPECT_EQ(lFormer.count(scLimitLine), 2u);

    std::filesystem::create_directory(lDirectory);
    waitUntil(
        [&] {
            sExpectServed(lAgent);
            return exists(lLog.path());
        },
        "the log in its directory");
    const std::string lContent = readFile(lAside);
    sExpectServed(lAgent);
    EXPECT_TRUE(lLog.has(scLimitLine));
    EXPECT_EQ(readFile(lAside), lContent);
    EXPECT_EQ(sStandardError(lAgent), "");
}

TEST(Trouble, ALimitOnFileSizesSendsLinesToStandardErrorAndTheyAreCounted) {
    ZTCAgentProcess lAgent;
    // The limit is on the file of standard error too, which starts with nothing.
    writeFile(lAgent.agentLogPath(), std::string(1u << 20, '-') + "\n");
    sStart(lAgent, lAgent.agentLogPath());
    const auto lLimitTo = [&lAgent](rlim_t aBytes) {
        const rlimit lLimit{aBytes, RLIM_INFINITY};
        ASSERT_EQ(prlimit(lAgent.process().getPid(), RLIMIT_FSIZE, &lLimit, nullptr), 0);
    };
    sExpectLinesOnStandardErrorAndCounted(
        lAgent, lAgent.log(), "File too large",
        // A part of the next line still fits: it is cut, and whole on standard error.
        [&] { lLimitTo(std::filesystem::file_size(lAgent.agentLogPath()) + 10); }, [&] { lLimitTo(RLIM_INFINITY); });
}

#ifndef __SANITIZE_THREAD__  // its runtime writes a file of its own, larger than any such limit, before main
TEST(Trouble, ALimitOnFileSizesThatTakesNoPidFileEndsTheStartInOrder) {
    ZTCAgentProcess lAgent;
    {
        const ZTCResourceLimit lNone(RLIMIT_FSIZE, 0);
        lAgent.start();
    }
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_TRUE(lAgent.library().calls().empty());
    EXPECT_FALSE(exists(lAgent.pidFilePath()));
    sExpectNextStartServed(lAgent);
}
#endif

TEST(Trouble, AFullFileSystemSendsLinesToStandardErrorAndTheyAreCounted) {
    ZTCAgentProcess lAgent;
    const std::string lDirectory = lAgent.workingDirectory() + "/full";
    std::filesystem::create_directory(lDirectory);
    ZTCSmallFileSystem lFileSystem(lDirectory, 256);
    if (lFileSystem.isMounted()) {
        const ZTCAgentLog lLog(lDirectory + "/agent.log");
        sStart(lAgent, lLog.path());
        sExpectLinesOnStandardErrorAndCounted(
            lAgent, lLog, "No space left on device", [&] { lFileSystem.fill(); }, [&] { lFileSystem.empty(); });
    } else {
        sStart(lAgent, "/dev/full");
        sExpectServed(lAgent);
        EXPECT_EQ(lAgent.stop(), 0);
        EXPECT_EQ(sCount(parseLogLines(sStandardError(lAgent)), scLimitLine), 2u);
    }
}

TEST(Trouble, ALogThatNeverTakesALineStopsNothing) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, "/dev/full");
    lAgent.startScope();
    lAgent.library().deliverAll(std::vector<ZTSLibraryEvent>(100, ZTSLibraryEvent::bare(0, 2, 1)));
    EXPECT_EQ(lAgent.retrieve().occurrences(2, 1), 100u);
    EXPECT_EQ(lAgent.stop(), 0);
    const std::vector<ZTSLogLine> lLines = parseLogLines(sStandardError(lAgent));
    EXPECT_EQ(sCount(lLines, "Processing Fabric BUSY event Cat=2 SubCat=1"), 100u);
    EXPECT_EQ(sCount(lLines, "Tavik System exiting"), 1u);
}

// ---- The sensor's directory ----

/// A start that fails says why at the default levels, and on standard error.
static void sExpectStartToFail(ZTCAgentProcess& arAgent, const std::vector<std::string>& acrParts) {
    arAgent.start({"-D", "false", "-l", arAgent.agentLogPath()});
    EXPECT_EQ(arAgent.waitForExit(), 0);
    std::vector<ZTSLogLine> lErrors = arAgent.log().lines();
    std::erase_if(lErrors, [](const ZTSLogLine& acrLine) { return acrLine.mMark != "-E-"; });
    ASSERT_EQ(lErrors.size(), 1u);
    for (const std::string& lcrPart : acrParts) {
        EXPECT_NE(lErrors[0].mText.find(lcrPart), std::string::npos) << lErrors[0].mText;
    }
    EXPECT_EQ(sStandardError(arAgent), lErrors[0].mText + "\n");
    EXPECT_TRUE(arAgent.library().calls().empty());
}

TEST(Trouble, AFullFileSystemUnderTheDirectoryIsAClearErrorAtTheStart) {
    ZTCAgentProcess lAgent;
    ZTCSmallFileSystem lFileSystem(lAgent.sensorDirectory(), 64);
    if (lFileSystem.isMounted()) {
        lFileSystem.fill();
        sExpectStartToFail(lAgent,
                           {"Writing the pid file '" + lAgent.pidFilePath() + "' failed", "No space left on device"});
        EXPECT_FALSE(exists(lAgent.pidFilePath()));
        lFileSystem.empty();
    }
    // Where nothing can be mounted, the limit on file sizes has shown the same failure: the pid file takes no byte.
    sExpectNextStartServed(lAgent);
}

TEST(Trouble, ADirectoryThatTakesNoFileIsAClearErrorAtTheStart) {
    ZTCAgentProcess lAgent;
    ZTCSmallFileSystem lFileSystem(lAgent.sensorDirectory(), 64);
    std::string lPidFile = lAgent.pidFilePath();
    if (lFileSystem.isMounted()) {
        lFileSystem.makeReadOnly();
    } else {
        // Nobody makes files here, whatever his rights.
        lAgent.setEnvironment("ZT_QRV_SENSOR_DIR", "/sys");
        lPidFile = "/sys/qrv-tvk.pid";
    }
    sExpectStartToFail(lAgent, {lPidFile});
}

TEST(Trouble, ADirectoryThatIsMissingIsAClearErrorAtTheStart) {
    ZTCAgentProcess lAgent;
    std::filesystem::remove(lAgent.sensorDirectory());
    sExpectStartToFail(lAgent, {lAgent.pidFilePath(), "No such file or directory"});
}

TEST(Trouble, ADirectoryThatBecomesReadOnlyEndsTheAgentAtItsNextHeartbeat) {
    ZTCAgentProcess lAgent;
    ZTCSmallFileSystem lFileSystem(lAgent.sensorDirectory(), 64);
    sStart(lAgent, lAgent.agentLogPath(), 1);
    if (lFileSystem.isMounted()) {
        lFileSystem.makeReadOnly();
    } else {
        // The nearest thing without a mount: the agent cannot touch its own file.
        std::filesystem::remove(lAgent.pidFilePath());
    }
    EXPECT_EQ(lAgent.waitForExit(), 0);
    EXPECT_EQ(lAgent.log().count("Failed in updating the status", "-H-"), 1u);
    if (lFileSystem.isMounted()) {
        EXPECT_EQ(lAgent.log().containing("Read-only file system, exiting abruptly").size(), 1u);
        EXPECT_TRUE(isFifo(lAgent.commandFifoPath()));
        lFileSystem.makeWritable();
    }
    sExpectNextStartServed(lAgent);
}

TEST(Trouble, ADirectoryThatIsGoneEndsTheAgentAtItsNextHeartbeat) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, lAgent.agentLogPath(), 1);
    const std::string lAside = lAgent.sensorDirectory() + ".aside";
    std::filesystem::rename(lAgent.sensorDirectory(), lAside);
    sExpectEndedInOrder(lAgent);
    EXPECT_EQ(lAgent.log().count("Failed in updating the status", "-H-"), 1u);
    // What lies elsewhere now is nobody's: the next start there takes it over.
    EXPECT_TRUE(isFifo(lAside + "/qrvtvkcmd.fifo"));
    std::filesystem::rename(lAside, lAgent.sensorDirectory());
    sExpectNextStartServed(lAgent);
}

TEST(Trouble, DeletedFifosServeTheSensorThatHasThemOpenUntilTheAgentIsStartedAnew) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, lAgent.agentLogPath());
    std::filesystem::remove(lAgent.commandFifoPath());
    std::filesystem::remove(lAgent.responseFifoPath());
    sExpectServed(lAgent);
    EXPECT_EQ(lAgent.run({"-s"}).mStatus, 0);
    sExpectEndedInOrder(lAgent);
    sExpectNextStartServed(lAgent);
}

TEST(Trouble, AFileInAFifosPlaceIsLeftWhereItIs) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, lAgent.agentLogPath());
    std::filesystem::remove(lAgent.commandFifoPath());
    writeFile(lAgent.commandFifoPath(), "somebody else's");
    sExpectServed(lAgent);
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.log().has("Tavik System exiting", "-H-"));
    EXPECT_EQ(readFile(lAgent.commandFifoPath()), "somebody else's");
    EXPECT_EQ(lAgent.log().containing("'" + lAgent.commandFifoPath() + "' is a regular file now").size(), 1u);
    EXPECT_FALSE(exists(lAgent.responseFifoPath()));
}

TEST(Trouble, APidFileThatIsAnothersIsTouchedAndLeft) {
    ZTCAgentProcess lAgent;
    sStart(lAgent, lAgent.agentLogPath(), 1);
    const std::string lOther = lAgent.pidFilePath() + ".other";
    writeFile(lOther, "4711\n");
    const timespec lTimes[2] = {{1000000, 0}, {1000000, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, lOther.c_str(), lTimes, 0), 0);
    std::filesystem::rename(lOther, lAgent.pidFilePath());
    waitUntil(
        [&] {
            struct stat lStatus {};
            return stat(lAgent.pidFilePath().c_str(), &lStatus) == 0 && lStatus.st_mtim.tv_sec > 1000000;
        },
        "a heartbeat");
    sExpectServed(lAgent);
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_EQ(readFile(lAgent.pidFilePath()), "4711\n");
    EXPECT_EQ(lAgent.log().containing("is gone or another's").size(), 1u);
}
