#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"
#include "tests/system/AdapterEvents.h"

TEST(Log, EveryLineHasItsTimeMarkPlaceAndText) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        lAgent.library().deliver(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
    }
    lAgent.retrieve();
    EXPECT_EQ(lAgent.request(gcShutDownHex), gcSuccessHex);
    EXPECT_EQ(lAgent.waitForExit(), 0);
    const auto lRaw = lAgent.log().rawLines();
    EXPECT_GT(lRaw.size(), 500u);
    std::string lPrevious;
    for (const std::string& lcrLine : lRaw) {
        const auto lParsed = parseLogLine(lcrLine);
        ASSERT_TRUE(lParsed.has_value()) << lcrLine;
        EXPECT_NE(std::string("HACEWNIT").find(lParsed->mMark[1]), std::string::npos) << lcrLine;
        EXPECT_NE(lParsed->mLine, 0u) << lcrLine;
        EXPECT_FALSE(lParsed->mText.empty()) << lcrLine;
        EXPECT_EQ(lParsed->mLabel.find(".cpp"), std::string::npos) << lcrLine;
        EXPECT_FALSE(lParsed->mLabel.starts_with("/")) << lcrLine;
        EXPECT_FALSE(lParsed->mLabel.starts_with("tavik/src/")) << lcrLine;
    }
    EXPECT_TRUE(readFile(lAgent.agentLogPath()).ends_with("\n"));
}

TEST(Log, AnAssertionsLineBreakIsNotDoubled) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.pipes().sendRequest(bytesOf("06"));
    EXPECT_EQ(lAgent.waitForExit(), 1);
    const std::string lContent = readFile(lAgent.agentLogPath());
    EXPECT_EQ(lContent.find("\n\n"), std::string::npos);
    EXPECT_TRUE(lAgent.log().has("Assertion [ false ] failed", "-H-"));
}

TEST(Log, EveryTracedFunctionThatIsEnteredIsLeft) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.registerTargets({{makeWwn(gcRemoteNode), makeWwn(gcRemotePort), 1}});
    lAgent.startScope();
    for (const ZTSDataKind& lcrKind : dataKinds()) {
        lAgent.library().deliver(ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mData));
        lAgent.library().deliver(
            ZTSLibraryEvent::scope(0, lcrKind.mCategory, lcrKind.mSubcategory, lcrKind.mSameIdentity));
    }
    for (const ZTSBareKind& lcrKind : bareKinds()) {
        lAgent.library().deliver(lcrKind.mEvent);
    }
    lAgent.library().deliver(ZTSLibraryEvent::rscn(0, rscnPayload({1, 1, 0x01000002})));
    lAgent.library().deliver(ZTSLibraryEvent::scope(0, 1, 1, {}));
    lAgent.retrieve();
    lAgent.request(gcPingHex);
    lAgent.request(gcStopScopeHex);
    EXPECT_EQ(lAgent.stop(), 0);
    std::map<std::string, long> lBalance;
    long lEntered = 0;
    for (const ZTSLogLine& lcrLine : lAgent.log().lines()) {
        const std::string lFunction = lcrLine.mLabel + " " + lcrLine.mFunction;
        if (lcrLine.mText == "Entered") {
            ++lBalance[lFunction];
            ++lEntered;
        } else if (lcrLine.mText == "Left") {
            --lBalance[lFunction];
        }
    }
    EXPECT_GT(lEntered, 100);
    // Entered before the log level let it be seen.
    for (const char* lpEarly : {".//TavikMain main"}) {
        EXPECT_EQ(lBalance[lpEarly], -1) << lpEarly;
        lBalance.erase(lpEarly);
    }
    for (const auto& [lFunction, lCount] : lBalance) {
        EXPECT_EQ(lCount, 0) << lFunction;
    }
}

static mode_t sModeOf(const std::string& acrPath) {
    struct stat lStatus {};
    EXPECT_EQ(lstat(acrPath.c_str(), &lStatus), 0) << acrPath;
    return lStatus.st_mode & 07777;
}

TEST(Log, TheFileIsMadeForItsUserAndGroupLessTheUmask) {
    for (const auto& [lMask, lMode] : {std::pair<mode_t, mode_t>{0, 0640}, {022, 0640}, {077, 0600}}) {
        ZTCAgentProcess lAgent;
        lAgent.setUmask(lMask);
        EXPECT_EQ(lAgent.run({"-v"}).mStatus, 0);
        EXPECT_EQ(sModeOf(lAgent.defaultLogPath()), lMode);
    }
}

TEST(Log, LinesGoToTheDefaultFileUntilTheCommandLineNamesAnother) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_TRUE(lAgent.defaultLog().has("Starting the Tavik"));
    EXPECT_FALSE(lAgent.defaultLog().has("Stopping Scope Data Collection."));
    EXPECT_FALSE(lAgent.log().has("Starting the Tavik"));
    EXPECT_TRUE(lAgent.log().has("Stopping Scope Data Collection."));
}

TEST(Log, ARelativeNameIsTakenFromTheDirectoryOfTheStart) {
    ZTCAgentProcess lAgent;
    lAgent.start({"-D", "false", "-l", "here.log"});
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_TRUE(ZTCAgentLog(lAgent.workingDirectory() + "/here.log").has("Stopping Scope Data Collection."));
}

TEST(Log, LinesAreAppendedToAFileThatExists) {
    ZTCAgentProcess lAgent;
    writeFile(lAgent.agentLogPath(), "an older line\n");
    lAgent.startAndConnect();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_TRUE(readFile(lAgent.agentLogPath()).starts_with("an older line\n"));
}

TEST(Log, ALineIsInTheFileWhenItsResponseIsThere) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    for (std::size_t i = 1; i <= 20; ++i) {
        EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
        EXPECT_EQ(lAgent.log().count("Stopping Scope Data Collection."), i);
    }
    lAgent.kill();
    EXPECT_EQ(lAgent.log().count("Stopping Scope Data Collection."), 20u);
}

TEST(Log, ASymbolicLinkIsNeverFollowed) {
    ZTCAgentProcess lAgent;
    const std::string lVictim = lAgent.workingDirectory() + "/victim";
    writeFile(lVictim, "untouched");
    std::filesystem::create_symlink(lVictim, lAgent.agentLogPath());
    lAgent.start();
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_EQ(readFile(lVictim), "untouched");
    EXPECT_NE(lAgent.process().standardError().find("Stopping Scope Data Collection."), std::string::npos);
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(std::filesystem::is_symlink(lAgent.agentLogPath()));
    EXPECT_EQ(readFile(lVictim), "untouched");
}

TEST(Log, LinesThatCannotBeWrittenGoToStandardErrorAndAreCounted) {
    ZTCAgentProcess lAgent;
    const std::string lDirectory = lAgent.workingDirectory() + "/later";
    const ZTCAgentLog lLater(lDirectory + "/agent.log");
    lAgent.start({"-D", "false", "-d", "63", "-l", lLater.path()});
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_NE(lAgent.process().standardError().find("Stopping Scope Data Collection."), std::string::npos);
    // Only the lines of the log count, not what is said about the file on standard error.
    const long lLost = static_cast<long>(parseLogLines(lAgent.process().standardError()).size());

    std::filesystem::create_directory(lDirectory);
    lAgent.process().sendSignal(SIGHUP);
    waitUntil([&] { return exists(lLater.path()); }, "the log to be made");
    EXPECT_EQ(lAgent.request(periodHex(1)), gcSuccessHex);
    EXPECT_TRUE(lLater.has("The limit set is 262144"));
    bool lIsReported = false;
    for (const std::string& lcrLine : lLater.rawLines()) {
        std::string lWords = " " + lcrLine + " ";
        std::replace_if(
            lWords.begin(), lWords.end(), [](char c) { return c < '0' || c > '9'; }, ' ');
        lIsReported = lIsReported || lWords.find(" " + std::to_string(lLost) + " ") != std::string::npos;
    }
    EXPECT_TRUE(lIsReported) << "no line reports that " << lLost << " lines are lost:\n" << readFile(lLater.path());
}

static const std::uintmax_t scLimit = 64ull * 1024 * 1024;

/// A log file, sparse, of this size.
static void sMakeLarge(const std::string& acrPath, std::uintmax_t aSize) {
    writeFile(acrPath, "the old log\n");
    std::filesystem::resize_file(acrPath, aSize);
}

TEST(Log, AFullFileIsRenamedAndBegunAnew) {
    ZTCAgentProcess lAgent;
    sMakeLarge(lAgent.agentLogPath(), scLimit);
    writeFile(lAgent.agentLogPath() + ".1", "the one before");
    lAgent.start();
    lAgent.pipes().open();
    EXPECT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    EXPECT_TRUE(lAgent.log().has("Stopping Scope Data Collection."));
    EXPECT_LT(std::filesystem::file_size(lAgent.agentLogPath()), scLimit);
    EXPECT_LE(std::filesystem::file_size(lAgent.agentLogPath() + ".1"), scLimit + 65536);
    EXPECT_GE(std::filesystem::file_size(lAgent.agentLogPath() + ".1"), scLimit);
    EXPECT_FALSE(exists(lAgent.agentLogPath() + ".2"));
}

TEST(Log, AFileThatFillsUpWhileTheAgentRunsIsRenamedThen) {
    ZTCAgentProcess lAgent;
    sMakeLarge(lAgent.agentLogPath(), scLimit - 65536);
    lAgent.start();
    lAgent.pipes().open();
    for (int i = 0; i < 3000 && !exists(lAgent.agentLogPath() + ".1"); ++i) {
        ASSERT_EQ(lAgent.request(gcStopScopeHex), gcSuccessHex);
    }
    EXPECT_TRUE(exists(lAgent.agentLogPath() + ".1"));
    EXPECT_LE(std::filesystem::file_size(lAgent.agentLogPath() + ".1"), scLimit + 65536);
    EXPECT_LT(std::filesystem::file_size(lAgent.agentLogPath()), 65536u);
    EXPECT_EQ(lAgent.request(periodHex(7)), gcSuccessHex);
    EXPECT_TRUE(lAgent.log().has("The limit set is 262144"));
}

TEST(Log, OnlyTheRunningAgentRenamesAFullFile) {
    ZTCAgentProcess lAgent;
    sMakeLarge(lAgent.defaultLogPath(), scLimit);
    EXPECT_EQ(lAgent.run({"-h"}).mStatus, 0);
    EXPECT_EQ(lAgent.run({"-x"}).mStatus, 0);
    EXPECT_FALSE(exists(lAgent.defaultLogPath() + ".1"));
}

TEST(Log, ControlCharactersAreEscaped) {
    ZTCAgentProcess lAgent;
    EXPECT_EQ(lAgent.run({"-\x01\n\x1b[31mx\r\x7f"}).mStatus, 0);
    const std::string lContent = readFile(lAgent.defaultLogPath());
    for (char lChar : lContent) {
        EXPECT_TRUE(lChar == '\n' || (lChar >= 0x20 && lChar != 0x7f)) << static_cast<int>(lChar);
    }
    std::size_t lErrors = 0;
    for (const std::string& lcrLine : lAgent.defaultLog().rawLines()) {
        const auto lParsed = parseLogLine(lcrLine);
        ASSERT_TRUE(lParsed.has_value()) << lcrLine;
        lErrors += lParsed->mMark == "-E-" ? 1 : 0;
    }
    EXPECT_EQ(lErrors, 1u);
}

TEST(Log, LinesOfManyThreadsNeverMix) {
    ZTCAgentProcess lAgent(2);
    lAgent.startAndConnect();
    lAgent.startScope();
    lAgent.library().startStorm(8, 100, {ZTSLibraryEvent::bare(0, 2, 1), ZTSLibraryEvent::temperature(1)});
    EXPECT_EQ(lAgent.library().waitForStorm(), 1600u);
    for (const std::string& lcrLine : lAgent.log().rawLines()) {
        ASSERT_TRUE(parseLogLine(lcrLine).has_value()) << lcrLine;
    }
    EXPECT_EQ(lAgent.log().count("Processing Fabric BUSY event Cat=2 SubCat=1"), 800u);
    EXPECT_EQ(lAgent.log().count("Invoking TEMPERATURE callback with boardId: 1"), 800u);
}
