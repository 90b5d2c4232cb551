#include <gtest/gtest.h>

#include <filesystem>
#include <iostream>
#include <string>

#include "common/include/Exception.h"
#include "system/include/SystemGlobals.h"
#include "tests/unit/os/LogCapture.h"
#include "tests/unit/system/ForkedProcess.h"
#include "tests/unit/system/TestSystem.h"

TEST(SystemOptions, AnErrorOfTheCommandLineIsOneLineOnStandardErrorAndInTheLog) {
    ZTCLogCapture lLog(63);
    ZTCTestSystem lSystem;
    lSystem.setCmdLineArgDescs();
    testing::internal::CaptureStderr();
    EXPECT_THROW(lSystem.readLine({"-b", "77", "-d", "%s256"}), ZTCInvalidEx);
    const std::string lSaid = testing::internal::GetCapturedStderr();
    const auto lLines = lLog.file().lines();
    ASSERT_EQ(lLines.size(), 1u);
    EXPECT_EQ(lLines[0].mMark, "-E-");
    EXPECT_EQ(lLines[0].mText + "\n", lSaid);
    EXPECT_NE(lSaid.find("'%s256'"), std::string::npos) << lSaid;
    unsigned lTimeout = 0;
    getHbTimeout(lTimeout);
    EXPECT_EQ(lTimeout, 240u) << "a part of the line was applied";
}

TEST(SystemOptions, OptionsTakeEffectWhenTheyAreAppliedAndNotBefore) {
    ZTCLogCapture lLog(63);
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("own.log");
    ZTCTestSystem lSystem;
    lSystem.setCmdLineArgDescs();
    lSystem.readLine({"-l", lPath, "-d", "0x21", "-b", "7", "-S", "-D", "false"});
    unsigned lCode = 0;
    unsigned lTimeout = 0;
    getLogCode(lCode);
    getHbTimeout(lTimeout);
    EXPECT_EQ(lCode, 63u);
    EXPECT_EQ(lTimeout, 240u);
    EXPECT_FALSE(ZTCProtocolHelper::isSnifferModeOn());

    lSystem.processCommandLineArguments();
    getLogCode(lCode);
    getHbTimeout(lTimeout);
    setHbTimeout(240);
    EXPECT_EQ(lCode, 0x21u);
    EXPECT_EQ(lTimeout, 7u);
    EXPECT_TRUE(ZTCProtocolHelper::isSnifferModeOn());
    EXPECT_FALSE(lSystem.isToRunAsDaemon());
    ZT_LOG_NOTICE("%s", "in the new file");
    EXPECT_EQ(ZTCAgentLog(lPath).count("in the new file"), 1u);
}

TEST(SystemOptions, TheLogOptionsAreAppliedBeforeTheConfigurationFileIsRefused) {
    ZTCLogCapture lLog(63);
    ZTCTemporaryDirectory lDirectory;
    const std::string lPath = lDirectory.path("own.log");
    ZTCTestSystem lSystem;
    lSystem.setCmdLineArgDescs();
    EXPECT_THROW(lSystem.applyLine({"-c", "file", "-l", lPath, "-d", "127", "-b", "9"}), ZTCNotImplementedEx);
    unsigned lCode = 0;
    unsigned lTimeout = 0;
    getLogCode(lCode);
    getHbTimeout(lTimeout);
    EXPECT_EQ(lCode, 127u);
    EXPECT_EQ(lTimeout, 240u) << "no other option is applied";
    ZT_LOG_INFO("%s", "in the new file");
    EXPECT_EQ(ZTCAgentLog(lPath).count("in the new file"), 1u);
}

TEST(SystemOptions, HelpVersionConfigurationAndStopWinInThisOrder) {
    ZTCTemporaryDirectory lDirectory;
    const std::string lPidFile = lDirectory.path("a.pid");
    const struct {
        std::vector<std::string> mLine;
        int mStatus;
        std::string mOutput;
    } lcRows[] = {
        {{"-s", "-c", "f", "-v", "-h", "-d", "1"}, 0, "the help\n"},
        {{"-s", "-c", "f", "-v"}, 0, "test-system v3.0.1.2\n"},
        {{"-s", "-c", "f"}, 13, ""},
        {{"-b", "9", "-s"}, 0, "No running instance is named by '" + lPidFile + "'\n"},
        {{"-b", "9"}, 50, ""},
    };
    for (const auto& lcrRow : lcRows) {
        ZTCForkedProcess lChild(
            [&](ZTCForkedProcess&) {
                ZTCTestSystem lSystem(lPidFile);
                lSystem.setCmdLineArgDescs();
                try {
                    lSystem.applyLine(lcrRow.mLine);
                } catch (const ZTCNotImplementedEx& acrException) {
                    return std::string(acrException.what()) == "Not Implemented"
                               ? static_cast<int>(acrException.getError())
                               : 97;
                }
                return 50;
            },
            lDirectory.path("child"));
        EXPECT_EQ(lChild.waitForExit(), lcrRow.mStatus);
        EXPECT_EQ(readFile(lDirectory.path("child.out")), lcrRow.mOutput);
        EXPECT_EQ(readFile(lDirectory.path("child.err")), "");
    }
}

TEST(SystemOptions, ABareSystemKnowsNoOptionAndNoConfigurationAndHasNoHelp) {
    ZTCSystem lSystem(ZTCString("bare"));
    lSystem.setCmdLineArgDescs();
    char lProgram[] = "program";
    char lHelp[] = "-h";
    char* lArguments[] = {lProgram, lHelp, nullptr};
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    EXPECT_NO_THROW(lSystem.processCommandLine(1, lArguments));
    EXPECT_THROW(lSystem.processCommandLine(2, lArguments), ZTCInvalidEx);
    EXPECT_THROW(lSystem.processConfigFile(ZTCString("file")), ZTCNotImplementedEx);
    lSystem.displayHelp();
    lSystem.createStartUpEvent();
    lSystem.createShutDownEvent();
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_NE(testing::internal::GetCapturedStderr().find("-h"), std::string::npos);
}

TEST(SystemOptions, ADaemonLeadsASessionInTheDirectoryThatItIsGiven) {
    const ZTCTemporaryDirectory lDirectory;
    const std::string lOutput = lDirectory.path("output");
    writeFile(lOutput, "");
    ZTCForkedProcess lChild([&](ZTCForkedProcess&) {
        ZTCTestSystem lSystem;
        lSystem.systemDaemonize(ZTCString(lDirectory.path().c_str()), ZTCString("/dev/null"),
                                ZTCString(lOutput.c_str()), ZTCString("/dev/null"));
        std::cout << (getsid(0) == getpid()) << ' ' << std::filesystem::current_path().string() << std::endl;
        return 7;
    });
    EXPECT_EQ(lChild.waitForExit(), 0) << "the calling process ends silently";
    const std::string lWanted = "1 " + lDirectory.path() + "\n";
    waitUntil([&] { return readFile(lOutput).size() >= lWanted.size(); }, "the daemon's words");
    EXPECT_EQ(readFile(lOutput), lWanted);
}
