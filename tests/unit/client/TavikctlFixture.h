/// Runs of the tool tavikctl against a fake agent, for its tests.
#ifndef TESTS_UNIT_CLIENT_TAVIKCTLFIXTURE_H
#define TESTS_UNIT_CLIENT_TAVIKCTLFIXTURE_H

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/unit/client/FakeAgent.h"
#include "tests/unit/client/WireSamples.h"

inline const ZTCWireBytes gcSuccess{0, 0, 0, 0, 0};
inline const ZTCWireBytes gcInvalid{1, 0, 6};
inline const char* const gcTarget = "50:06:01:60:bb:a0:12:34,50:06:01:60:3b:a0:12:34,0x010203";

/// One run of the tool in a directory of its own.
class ZTCTavikctlFixture : public testing::Test {
protected:
    struct ZTSFinishedRun {
        int mStatus;
        std::string mOutput;
        std::string mErrors;
    };

    std::string dir() const { return mDirectory.path(); }

    ZTSChildProcessSetup setup(const std::vector<std::string>& acrArguments) {
        return {.mProgram = TAVIKCTL_PROGRAM,
                .mArguments = acrArguments,
                .mEnvironment = {{"ZT_QRV_SENSOR_DIR", dir()}},
                .mWorkingDirectory = mOther.path(),
                .mOutputPrefix = mOther.path("run" + std::to_string(++mRuns))};
    }

    ZTSFinishedRun run(const std::vector<std::string>& acrArguments) {
        ZTCChildProcess lProcess(setup(acrArguments));
        const int lStatus = lProcess.waitForExit();
        return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
    }

    /// The tool behind a shell, for what only a shell can do to its standard streams.
    ZTSFinishedRun runShell(const std::string& acrScript) {
        ZTSChildProcessSetup lSetup = setup({"-c", acrScript, TAVIKCTL_PROGRAM});
        lSetup.mProgram = "/bin/sh";
        lSetup.mEnvironment["PATH"] = "/usr/bin:/bin";
        ZTCChildProcess lProcess(lSetup);
        const int lStatus = lProcess.waitForExit();
        return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
    }

    /// A step of the agent: each retrieval gets so many records that their text does not fit into a pipe.
    static ZTCFakeAgent::ZTCStep servingMoreThanAPipeTakes() {
        return
            [lMany = makeSampleResponse(
                 1,
                 {makeSampleList("k", std::vector<ZTCBytes>(2000, makeSampleRecord(8, 0x02, bytesOf("01000000"))))})](
                ZTCFakeAgent& arAgent, const ZTCWireBytes& acrRequest) {
                arAgent.sendFrame(acrRequest[0] == 1 ? lMany : gcSuccess);
            };
    }

    /// The tool with these arguments and a pipe as its output. The pipe is open for reading, and nobody reads.
    ZTSChildProcessSetup setupUnread(const std::string& acrArguments) {
        const std::string lPipe = mOther.path("output");
        EXPECT_EQ(mkfifo(lPipe.c_str(), 0600), 0);
        mUnread = ZTCFileDescriptor::open(lPipe.c_str(), O_RDONLY | O_NONBLOCK);
        ZTSChildProcessSetup lSetup = setup({"-c", "exec \"$0\" " + acrArguments + " >" + lPipe, TAVIKCTL_PROGRAM});
        lSetup.mProgram = "/bin/sh";
        return lSetup;
    }

    static void expectOneLine(const std::string& acrErrors) {
        EXPECT_THAT(acrErrors, testing::StartsWith("tavikctl: "));
        EXPECT_EQ(std::count(acrErrors.begin(), acrErrors.end(), '\n'), 1) << acrErrors;
    }

    const ZTCTemporaryDirectory mDirectory;
    const ZTCTemporaryDirectory mOther;
    int mRuns = 0;
    ZTCFileDescriptor mUnread;
};

inline nlohmann::json parseJson(const std::string& acrText) {
    return nlohmann::json::parse(acrText);
}

#endif
