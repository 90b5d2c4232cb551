#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/support/AgentProcess.h"

static const char* const scNoLibrary = "No Libkpm Found or Disabled.. Tavik would exit";

/// Runs an agent that is bound to refuse, and checks what every refusal has in common.
static void sExpectRefusal(ZTCAgentProcess& arAgent, const char* apNotice) {
    arAgent.start();
    EXPECT_EQ(arAgent.waitForExit(), 0);
    EXPECT_EQ(arAgent.log().count(apNotice, "-N-"), 1u);
    EXPECT_EQ(arAgent.log().count("Exit condition", "-I-"), 1u);
    EXPECT_FALSE(arAgent.log().has("Tavik System exiting"));
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_FALSE(exists(arAgent.responseFifoPath()));
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
}

static void sExpectFailure(ZTCAgentProcess& arAgent, const std::vector<std::string>& acrParts) {
    arAgent.start();
    EXPECT_EQ(arAgent.waitForExit(), 0);
    const auto lLines = arAgent.log().containing("Failed with error - ");
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-I-");
    EXPECT_TRUE(lLines[0].mText.ends_with(", exiting abruptly")) << lLines[0].mText;
    for (const std::string& lcrPart : acrParts) {
        EXPECT_NE(lLines[0].mText.find(lcrPart), std::string::npos) << lLines[0].mText;
    }
    EXPECT_FALSE(exists(arAgent.commandFifoPath()));
    EXPECT_FALSE(exists(arAgent.pidFilePath()));
}

TEST(AdaptersLibrary, AMissingLibraryIsAnExitCondition) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_LIBKPM_PATH", lAgent.workingDirectory() + "/no-such-library.so");
    sExpectRefusal(lAgent, scNoLibrary);
    EXPECT_FALSE(lAgent.log().containing("no-such-library.so").empty()) << "the loader's reason is missing";
}

TEST(AdaptersLibrary, AFileThatIsNoLibraryIsAnExitCondition) {
    ZTCAgentProcess lAgent;
    const std::string lPath = lAgent.workingDirectory() + "/text.so";
    writeFile(lPath, "this is no shared object");
    lAgent.setEnvironment("ZT_LIBKPM_PATH", lPath);
    sExpectRefusal(lAgent, scNoLibrary);
    EXPECT_FALSE(lAgent.log().containing("text.so").empty());
}

TEST(AdaptersLibrary, AnEmptyPathDisablesTheLibrary) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_LIBKPM_PATH", "");
    sExpectRefusal(lAgent, scNoLibrary);
    EXPECT_TRUE(lAgent.library().calls().empty());
}

TEST(AdaptersLibrary, WithoutAPathTheLoaderSearchesForTheUsualName) {
    ZTCAgentProcess lAgent;
    lAgent.unsetEnvironment("ZT_LIBKPM_PATH");
    lAgent.setEnvironment("LD_LIBRARY_PATH", lAgent.workingDirectory());
    sExpectRefusal(lAgent, scNoLibrary);
    EXPECT_FALSE(lAgent.log().containing("libkpm.so.1").empty());
}

TEST(AdaptersLibrary, WithoutAPathTheLibraryIsFoundByTheLoader) {
    ZTCAgentProcess lAgent;
    lAgent.unsetEnvironment("ZT_LIBKPM_PATH");
    const std::string lLink = lAgent.workingDirectory() + "/libkpm.so.1";
    std::filesystem::create_symlink(ZTCScriptedLibrary::modulePath(), lLink);
    lAgent.setEnvironment("LD_LIBRARY_PATH", lAgent.workingDirectory());
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
}

TEST(AdaptersLibrary, ALibraryWithoutTheSymbolIsAnExitCondition) {
    ZTCAgentProcess lAgent;
    lAgent.setEnvironment("ZT_LIBKPM_PATH", "libm.so.6");
    sExpectRefusal(lAgent, scNoLibrary);
    EXPECT_FALSE(lAgent.log().containing("KPM_GetFunctionList").empty());
}

TEST(AdaptersLibrary, ALibraryOfAnotherVersionIsAnExitCondition) {
    for (const char* lpLine : {"function-list-status 1", "version 2", "version 0", "size 79", "size 0"}) {
        SCOPED_TRACE(lpLine);
        ZTCAgentProcess lAgent;
        lAgent.library().configure(lpLine);
        sExpectRefusal(lAgent, scNoLibrary);
        const auto lCalls = lAgent.library().calls();
        ASSERT_FALSE(lCalls.empty());
        EXPECT_EQ(lCalls[0], "KPM_GetFunctionList version=1");
        EXPECT_TRUE(lAgent.library().callsOf("Init").empty());
        EXPECT_TRUE(lAgent.library().callsOf("Close").empty());
    }
}

TEST(AdaptersLibrary, ATableWithANullEntryIsAnExitCondition) {
    for (unsigned lEntry = 0; lEntry < 9; ++lEntry) {
        SCOPED_TRACE(lEntry);
        ZTCAgentProcess lAgent;
        lAgent.library().configure("null-entry " + std::to_string(lEntry));
        sExpectRefusal(lAgent, scNoLibrary);
        EXPECT_TRUE(lAgent.library().callsOf("Init").empty());
    }
}

TEST(AdaptersLibrary, ALargerTableIsAccepted) {
    ZTCAgentProcess lAgent;
    lAgent.library().configure("size 4096");
    lAgent.startAndConnect();
    EXPECT_TRUE(lAgent.ping());
}

TEST(AdaptersLibrary, AFailedInitEndsTheStartWithItsStatusAndWithoutAClose) {
    ZTCAgentProcess lAgent;
    lAgent.library().configure("init-status 4711");
    sExpectFailure(lAgent, {"Init", "4711"});
    EXPECT_TRUE(lAgent.library().callsOf("Close").empty());
    EXPECT_TRUE(lAgent.library().callsOf("GetNumberOfAdapters").empty());
}

TEST(AdaptersLibrary, AFailedAdapterInfoEndsTheStartWithItsStatus) {
    ZTCAgentProcess lAgent(2);
    lAgent.library().configure("info-status 1 815");
    sExpectFailure(lAgent, {"GetAdapterInfo", "815"});
    EXPECT_EQ(lAgent.log().containing("Discovered QRV initiator").size(), 1u);
}

TEST(AdaptersLibrary, WithoutAdaptersTheAgentClosesTheLibraryAndExits) {
    ZTCAgentProcess lAgent(0);
    sExpectRefusal(lAgent, "No QRV Adapters found.. Tavik would exit");
    EXPECT_EQ(lAgent.library().callsOf("Close").size(), 1u);
    EXPECT_EQ(lAgent.library().callsOf("Unloaded").size(), 1u);
    EXPECT_TRUE(lAgent.log().containing("Discovered").empty());
}

TEST(AdaptersLibrary, WithoutAdaptersAndWithAnOldDriverTheAdaptersAreWhatIsReported) {
    ZTCAgentProcess lAgent(0);
    lAgent.library().configure("ztapi-supported 0");
    sExpectRefusal(lAgent, "No QRV Adapters found.. Tavik would exit");
    EXPECT_TRUE(lAgent.library().callsOf("IsZtapiSupported").empty());
}

TEST(AdaptersLibrary, AnOldDriverIsAnExitConditionAndTheLibraryIsClosed) {
    ZTCAgentProcess lAgent(2);
    lAgent.library().configure("ztapi-supported 0");
    sExpectRefusal(lAgent, "Old incompatible driver found.. Tavik would exit");
    EXPECT_EQ(lAgent.library().callsOf("Close").size(), 1u);
    EXPECT_TRUE(lAgent.library().callsOf("GetAdapterInfo").empty());
}

TEST(AdaptersLibrary, EveryAdapterIsReportedWithItsNamesInOrder) {
    ZTCAgentProcess lAgent(3);
    lAgent.startAndConnect();
    const auto lLines = lAgent.log().containing("Discovered QRV initiator");
    ASSERT_EQ(lLines.size(), 3u);
    for (unsigned i = 0; i < 3; ++i) {
        EXPECT_EQ(lLines[i].mMark, "-N-");
        EXPECT_EQ(lLines[i].mText, "Discovered QRV initiator <" + wwnText(ZTCScriptedLibrary::nodeName(i)) + ", " +
                                       wwnText(ZTCScriptedLibrary::portName(i)) + ">");
    }
}

TEST(AdaptersLibrary, ItIsOpenedInTheDocumentedOrderWithTheStopSignalsBlocked) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    EXPECT_EQ(
        lAgent.library().calls(),
        (std::vector<std::string>{"KPM_GetFunctionList version=1", "Init blocked: TERM INT HUP -> 0",
                                  "GetNumberOfAdapters -> 1", "IsZtapiSupported -> 1", "GetAdapterInfo index=0 -> 0"}));
}

TEST(AdaptersLibrary, AStopSignalLeavesItOpen) {
    ZTCAgentProcess lAgent;
    lAgent.startAndConnect();
    lAgent.startScope();
    EXPECT_EQ(lAgent.stop(), 0);
    EXPECT_TRUE(lAgent.library().callsOf("Close").empty());
    EXPECT_TRUE(lAgent.library().callsOf("Unloaded").empty());
}
