#include "tests/unit/commands/TavikProgram.h"

#include <sys/stat.h>

#include <algorithm>

TavikProgram::TavikProgram() {
    mkdir(mDirectory.path("run").c_str(), 0755);
    mkdir(statePath().c_str(), 0755);
    writeFile(mDirectory.path("tavik.toml"), "[sensor]\ndirectory = \"" + mDirectory.path("run") + "\"\nstate = \"" +
                                                 statePath() +
                                                 "\"\n[names]\n\"50:06:01:60:3b:a0:12:34\" = \"ctrl-A\"\n");
}

ZTSChildProcessSetup TavikProgram::setup(const std::vector<std::string>& acrArguments) {
    return {.mProgram = TAVIK_PROGRAM,
            .mArguments = acrArguments,
            .mEnvironment = {{"TAVIK_CONFIG", mDirectory.path("tavik.toml")}, {"TZ", "UTC"}},
            .mWorkingDirectory = mDirectory.path(),
            .mOutputPrefix = mDirectory.path("run" + std::to_string(++mRuns))};
}

TavikProgram::ZTSFinishedRun TavikProgram::run(const std::vector<std::string>& acrArguments) {
    ZTCChildProcess lProcess(setup(acrArguments));
    const int lStatus = lProcess.waitForExit();
    return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
}

TavikProgram::ZTSFinishedRun TavikProgram::runShell(const std::string& acrScript) {
    ZTSChildProcessSetup lSetup = setup({"-c", acrScript, TAVIK_PROGRAM});
    lSetup.mProgram = "/bin/sh";
    lSetup.mEnvironment["PATH"] = "/usr/bin:/bin";
    ZTCChildProcess lProcess(lSetup);
    const int lStatus = lProcess.waitForExit();
    return {lStatus, lProcess.standardOutput(), lProcess.standardError()};
}

nlohmann::json TavikProgram::runJson(std::vector<std::string> aArguments) {
    aArguments.insert(aArguments.begin(), "--json");
    const ZTSFinishedRun lRun = run(aArguments);
    EXPECT_EQ(lRun.mStatus, 0) << lRun.mErrors;
    EXPECT_EQ(lRun.mErrors, "");
    return nlohmann::json::parse(lRun.mOutput, nullptr, false);
}

ZTCStore& TavikProgram::store() {
    if (mpStore == nullptr) {
        mpStore = std::make_unique<ZTCStore>(statePath(), ZTSStoreLimits(), [](const std::string&) {});
    }
    return *mpStore;
}

void TavikProgram::takeIn(const std::vector<ZTSTestRecord>& acrRecords, std::uint64_t aLocalPort) {
    ZTCStoreTransaction lTransaction = store().begin();
    store().takeIn(++mFrames, "a1", makeBody(acrRecords, aLocalPort), false, fromMicroseconds(gcBase));
    lTransaction.commit();
}

void TavikProgram::fill() {
    ZTCStoreTransaction lTransaction = store().begin();
    store().noteInitiator({makeName(gcLocalPort), makeName(gcLocalNode), "host7"});
    store().noteInitiator({makeName(gcOtherLocalPort), std::nullopt, "host8"});
    lTransaction.commit();
    takeIn({makeQueueFull(gcPortA, gcBase, gcBase + gcSecond, 3, 3),
            makeQueueFull(gcPortA, gcBase + 2 * gcSecond, gcBase + 2 * gcSecond, 2, 4),
            {.mKind = gcLogo,
             .mData = makeTwoNamesData(gcPortA, gcPortA),
             .mBegin = gcBase + gcMinute,
             .mEnd = gcBase + gcMinute,
             .mOccurrences = 1,
             .mPortName = std::nullopt}});
    takeIn({makeQueueFull(gcPortB, gcBase + 2 * gcMinute, gcBase + 2 * gcMinute, 7, 9)}, gcOtherLocalPort);
}

void TavikProgram::expectOneLine(const ZTSFinishedRun& acrRun) {
    EXPECT_TRUE(acrRun.mErrors.starts_with("tavik: ")) << acrRun.mErrors;
    EXPECT_EQ(std::count(acrRun.mErrors.begin(), acrRun.mErrors.end(), '\n'), 1) << acrRun.mErrors;
}
