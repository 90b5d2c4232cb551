// The tool kpm-sim as people run it.
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/wait.h>

#include <cstdio>
#include <memory>
#include <string>

#include "libkpm/sim/src/Control.h"
#include "libkpm/sim/src/ControlSocket.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/sim/Recorder.h"

struct ZTSToolResult {
    int mStatus = -1;
    std::string mOutput;  ///< standard output and standard error
};

/// Runs the tool with arguments as a shell splits them.
static ZTSToolResult sRun(const std::string& acrArguments) {
    const std::string lCommand = "unset KPM_SIM_SOCKET; '" TAVIK_SIM_TOOL "' " + acrArguments + " 2>&1";
    ZTSToolResult lResult;
    FILE* lpPipe = ::popen(lCommand.c_str(), "re");
    if (lpPipe == nullptr) {
        return lResult;
    }
    char lBytes[4096];
    std::size_t lCount = 0;
    while ((lCount = std::fread(lBytes, 1, sizeof lBytes, lpPipe)) > 0) {
        lResult.mOutput.append(lBytes, lCount);
    }
    const int lStatus = ::pclose(lpPipe);
    lResult.mStatus = WIFEXITED(lStatus) ? WEXITSTATUS(lStatus) : -1;
    return lResult;
}

class KpmSim : public testing::Test {
protected:
    KpmSim()
        : mEngine(readScenario(gcTwoAdapters)),
          mSocket(mDirectory.path("s"), [this](std::string_view aLine) { return answerSimLine(mEngine, aLine); }) {}

    ZTSToolResult runOnSocket(const std::string& acrArguments) {
        return sRun("--socket '" + mDirectory.path("s") + "' " + acrArguments);
    }

    ZTCTemporaryDirectory mDirectory;
    ZTCRecorder mRecorder;
    ZTCSimEngine mEngine;
    ZTCSimControlSocket mSocket;
};

TEST_F(KpmSim, InjectsTheLinesOfItsArguments) {
    mRecorder.registerKind(mEngine, 0, "queue-full");
    const ZTSToolResult lResult = runOnSocket("inject queue-full lun=3 times=2 'plogi board=1' queue-full");
    EXPECT_EQ(lResult.mOutput, "ok 2\nok 0\nok 1\n");
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(mRecorder.getCount(), 3u);
}

TEST_F(KpmSim, EndsWithOneForALineThatIsRefused) {
    const ZTSToolResult lResult = runOnSocket("inject queue-full lun=x plogi");
    EXPECT_EQ(lResult.mOutput, "error: lun= takes a number, not \"x\"\n");
    EXPECT_EQ(lResult.mStatus, 1);
}

TEST_F(KpmSim, RunsAFilesLines) {
    mRecorder.registerKind(mEngine, 0, "plogi");
    writeFile(mDirectory.path("f"), "# three\nplogi times=2\n\n  plogi # one more\n");
    const ZTSToolResult lResult = runOnSocket("run '" + mDirectory.path("f") + "'");
    EXPECT_EQ(lResult.mOutput, "ok 3\n");
    EXPECT_EQ(lResult.mStatus, 0);
}

TEST_F(KpmSim, NamesTheLineOfAFileThatIsRefused) {
    writeFile(mDirectory.path("f"), "plogi\n\ncount 2\n");
    const ZTSToolResult lResult = runOnSocket("run '" + mDirectory.path("f") + "'");
    EXPECT_EQ(lResult.mOutput,
              mDirectory.path("f") + ":3: \"count\" is neither an event kind nor storm, state or loss\n");
    EXPECT_EQ(lResult.mStatus, 1);
}

TEST_F(KpmSim, PrintsStatusAndCounts) {
    EXPECT_EQ(runOnSocket("status").mOutput,
              "ok delivered=0 dropped=0 pages=0 registered=0 adapters=2 schedule=waiting\n");
    EXPECT_NE(runOnSocket("counts").mOutput.find(" adapter-arrival=0\n"), std::string::npos);
}

TEST_F(KpmSim, WaitsUntilTheScheduleIsDone) {
    mRecorder.registerAll(mEngine, 1);
    const ZTSToolResult lResult = runOnSocket("wait --timeout 20");
    EXPECT_EQ(lResult.mOutput, "ok delivered=0 dropped=0 pages=0 registered=20 adapters=2 schedule=done\n");
    EXPECT_EQ(lResult.mStatus, 0);
    EXPECT_EQ(runOnSocket("wait --started").mStatus, 0);
}

TEST_F(KpmSim, WaitsForSoManyEventsWhateverTheScheduleDoes) {
    mRecorder.registerKind(mEngine, 0, "plogi");
    ASSERT_EQ(runOnSocket("inject plogi times=3").mOutput, "ok 3\n");
    const ZTSToolResult lResult = runOnSocket("wait --timeout 20 --delivered 3");
    EXPECT_EQ(lResult.mOutput, "ok delivered=3 dropped=0 pages=0 registered=1 adapters=2 schedule=waiting\n");
    EXPECT_EQ(lResult.mStatus, 0);
}

TEST_F(KpmSim, EndsWithOneWhenItWaitsInVain) {
    const ZTSToolResult lResult = runOnSocket("wait --timeout 0 --delivered 1");
    EXPECT_EQ(lResult.mOutput,
              "not reached within 0 s: ok delivered=0 dropped=0 pages=0 registered=0 adapters=2 schedule=waiting\n");
    EXPECT_EQ(lResult.mStatus, 1);
}

TEST_F(KpmSim, EndsWithOneWhenTheLibraryListensAndDoesNotAnswer) {
    // The kernel connects clients to a socket that nobody accepts from.
    const std::string lPath = mDirectory.path("silent");
    const ZTCLibraryDescriptor lSilent(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const sockaddr_un lAddress = makeSimSocketAddress(lPath);
    ASSERT_EQ(::bind(lSilent.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof lAddress), 0);
    ASSERT_EQ(::listen(lSilent.get(), 0), 0);
    const ZTSToolResult lNoAnswer = sRun("--socket '" + lPath + "' wait --timeout 2");
    EXPECT_EQ(lNoAnswer.mOutput, "not reached within 2 s: " + lPath + ": the library does not answer\n");
    EXPECT_EQ(lNoAnswer.mStatus, 1);
    // The connection of the first one still takes the only place.
    const ZTSToolResult lNoPlace = sRun("--socket '" + lPath + "' wait --timeout 2");
    EXPECT_EQ(lNoPlace.mOutput, "not reached within 2 s: " + lPath + ": the library accepts no connection\n");
    EXPECT_EQ(lNoPlace.mStatus, 1);
}

TEST_F(KpmSim, EndsWithTwoForWrongUse) {
    for (const char* lpArguments : {"", "dance", "inject", "status --loud", "status"}) {
        EXPECT_EQ(sRun(lpArguments).mStatus, 2) << lpArguments;
    }
}

TEST_F(KpmSim, EndsWithThreeWhereNobodyListens) {
    const std::string lSocket = "--socket '" + mDirectory.path("none") + "' ";
    for (const char* lpArguments : {"status", "inject plogi", "wait --timeout 0"}) {
        const ZTSToolResult lResult = sRun(lSocket + lpArguments);
        EXPECT_EQ(lResult.mStatus, 3) << lpArguments;
        EXPECT_EQ(lResult.mOutput,
                  "kpm-sim: " + mDirectory.path("none") + ": no library listens: No such file or directory\n");
    }
}

TEST_F(KpmSim, ChecksAScenario) {
    writeFile(mDirectory.path("f"), std::string(gcTwoAdapters) + "plogi\nstorm count=9\n");
    const ZTSToolResult lGood = sRun("check '" + mDirectory.path("f") + "'");
    EXPECT_EQ(lGood.mStatus, 0);
    EXPECT_NE(lGood.mOutput.find("adapters: 2 hba0 hba1\n"), std::string::npos);
    EXPECT_NE(lGood.mOutput.find("storms: 1 with 9 events\nstates: 0\nlosses: 0\n"), std::string::npos);
    writeFile(mDirectory.path("f"), "\nplogi\n");
    const ZTSToolResult lBad = sRun("check '" + mDirectory.path("f") + "'");
    EXPECT_EQ(lBad.mStatus, 1);
    EXPECT_EQ(lBad.mOutput,
              mDirectory.path("f") + ":2: board= names the board 0, but the lines above have 0 adapters\n");
}

TEST_F(KpmSim, ListsEveryKindAndField) {
    const std::string lOutput = sRun("kinds").mOutput;
    for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
        EXPECT_NE(lOutput.find(std::string(getSimKind(lKind).mpName) + "  (category "), std::string::npos);
    }
    EXPECT_NE(lOutput.find("    explanation=  LS_RJT reason code explanation\n"), std::string::npos);
}

TEST_F(KpmSim, HelpIsNoWrongUse) {
    EXPECT_EQ(sRun("--help").mStatus, 0);
}
