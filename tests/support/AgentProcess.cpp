#include "tests/support/AgentProcess.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <exception>
#include <filesystem>
#include <iostream>

/// The command thread logs this when it begins to wait for a command.
static const char* const scRunningText = "Waiting for control availability...";

/// A directory that its owner alone may write in, whatever the umask is.
static std::string sMadeDirectory(const std::string& acrPath) {
    std::filesystem::create_directory(acrPath);
    std::filesystem::permissions(acrPath, std::filesystem::perms::owner_all);
    return acrPath;
}

static std::map<std::string, std::string> sInheritedEnvironment() {
    std::map<std::string, std::string> lVariables;
    for (char** lppEntry = environ; *lppEntry != nullptr; ++lppEntry) {
        const std::string lEntry = *lppEntry;
        const std::size_t lEquals = lEntry.find('=');
        if (lEquals != std::string::npos && !lEntry.starts_with("ZT_")) {
            lVariables[lEntry.substr(0, lEquals)] = lEntry.substr(lEquals + 1);
        }
    }
    return lVariables;
}

ZTCAgentProcess::ZTCAgentProcess(unsigned aAdapters)
    : mLibrary(sMadeDirectory(mDirectory.path("library"))),
      mPipes(sMadeDirectory(sensorDirectory())),
      mLog(mDirectory.path("agent.log")),
      mEnvironment(sInheritedEnvironment()) {
    std::filesystem::create_directory(workingDirectory());
    mLibrary.addAdapters(aAdapters);
    mEnvironment["ZT_QRV_SENSOR_DIR"] = sensorDirectory();
    mEnvironment["ZT_LIBKPM_PATH"] = ZTCScriptedLibrary::modulePath();
    mEnvironment["ZT_SCRIPTED_KPM_DIR"] = mLibrary.directory();
    for (const char* lpVariable : {"ASAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"}) {
        std::string& lrOptions = mEnvironment[lpVariable];
        lrOptions += (lrOptions.empty() ? "log_path=" : ":log_path=") + mDirectory.path("sanitizer");
    }
}

ZTCAgentProcess::~ZTCAgentProcess() {
    try {
        if (mProcess != nullptr && !mProcess->hasEnded()) {
            EXPECT_EQ(stop(), 0) << "the agent does not end in order";
        }
    } catch (const std::exception& lcrError) {
        ADD_FAILURE() << "the agent does not end on SIGTERM: " << lcrError.what();
        kill();
    }
    reportSanitizers();
    if (testing::Test::HasFailure()) {
        for (const char* lpName : {"agent.log", "work/qrv-tvk.log", "run1.err"}) {
            const std::string lContent = readFile(mDirectory.path(lpName));
            std::cerr << "---- last of " << lpName << '\n'
                      << (lContent.size() > 6000 ? lContent.substr(lContent.size() - 6000) : lContent) << '\n';
        }
        std::cerr << "---- calls of the adapters' library: " << mLibrary.calls().size() << '\n';
    }
}

void ZTCAgentProcess::reportSanitizers() const {
    for (const auto& lcrEntry : std::filesystem::directory_iterator(mDirectory.path())) {
        if (lcrEntry.path().filename().string().starts_with("sanitizer")) {
            ADD_FAILURE() << readFile(lcrEntry.path().string());
        }
    }
}

std::string ZTCAgentProcess::programPath() {
    return TAVIK_AGENT_PROGRAM;
}

std::vector<std::string> ZTCAgentProcess::defaultArguments(const std::vector<std::string>& acrMore) const {
    std::vector<std::string> lArguments{"-D", "false", "-d", "255", "-l", mLog.path()};
    lArguments.insert(lArguments.end(), acrMore.begin(), acrMore.end());
    return lArguments;
}

ZTSChildProcessSetup ZTCAgentProcess::setup(const std::vector<std::string>& acrArguments,
                                            const std::string& acrName) const {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = programPath();
    lSetup.mArguments = acrArguments;
    lSetup.mEnvironment = mEnvironment;
    lSetup.mWorkingDirectory = workingDirectory();
    lSetup.mOutputPrefix = mDirectory.path(acrName);
    lSetup.mUmask = mUmask;
    lSetup.mHasStandardStreams = mHasStandardStreams;
    return lSetup;
}

void ZTCAgentProcess::start(const std::vector<std::string>& acrArguments) {
    mLibrary.isOpen();
    mProcess = launch(acrArguments);
}

void ZTCAgentProcess::startAndConnect(const std::vector<std::string>& acrMore) {
    const std::size_t lBefore = mLog.count(scRunningText);
    start(defaultArguments(acrMore));
    mPipes.open();
    mLog.waitFor(scRunningText, lBefore + 1);
}

void ZTCAgentProcess::startAndConnectQuietly(unsigned aLogCode, const std::vector<std::string>& acrMore) {
    std::vector<std::string> lArguments{"-D", "false", "-d", std::to_string(aLogCode), "-l", mLog.path()};
    lArguments.insert(lArguments.end(), acrMore.begin(), acrMore.end());
    start(lArguments);
    mPipes.open();
    EXPECT_TRUE(ping());
}

testing::AssertionResult ZTCAgentProcess::ping() {
    const std::string lAnswer = request(gcPingHex);
    if (lAnswer != gcInvalidHex) {
        return testing::AssertionFailure() << "the agent answers a ping with " << lAnswer << ", not " << gcInvalidHex;
    }
    return testing::AssertionSuccess();
}

std::string periodHex(std::uint32_t aSeconds) {
    return ZTCByteWriter().u8(5).u32(aSeconds).hex();
}

std::unique_ptr<ZTCChildProcess> ZTCAgentProcess::launch(const std::vector<std::string>& acrArguments) {
    return std::make_unique<ZTCChildProcess>(setup(acrArguments, "run" + std::to_string(++mRuns)));
}

ZTSRunResult ZTCAgentProcess::run(const std::vector<std::string>& acrArguments) {
    const std::unique_ptr<ZTCChildProcess> lpProcess = launch(acrArguments);
    ZTSRunResult lResult;
    lResult.mStatus = lpProcess->waitForExit();
    lResult.mOutput = lpProcess->standardOutput();
    lResult.mError = lpProcess->standardError();
    return lResult;
}

int ZTCAgentProcess::waitForExit(const ZTCDeadline& acrDeadline) {
    return mProcess->waitForExit(acrDeadline);
}

int ZTCAgentProcess::stop() {
    mProcess->sendSignal(SIGTERM);
    return waitForExit();
}

void ZTCAgentProcess::kill() {
    mProcess->kill();
}

void ZTCAgentProcess::adopt(pid_t aPid) {
    mProcess = std::make_unique<ZTCChildProcess>(aPid);
}

std::string ZTCAgentProcess::request(std::string_view aBodyHex) {
    return hexOf(mPipes.request(bytesOf(aBodyHex)));
}

ZTCBytes ZTCAgentProcess::startScopeRequest(unsigned aMaxEventDataSize) {
    return ZTCByteWriter().u8(0).u32(aMaxEventDataSize).bytes();
}

void ZTCAgentProcess::startScope(unsigned aMaxEventDataSize) {
    EXPECT_EQ(hexOf(mPipes.request(startScopeRequest(aMaxEventDataSize))), gcSuccessHex);
}

void ZTCAgentProcess::waitForIdleCommandThread() const {
    waitUntil(
        [&] {
            const std::vector<ZTSLogLine> lLines = mLog.lines();
            const auto lLast = std::find_if(lLines.rbegin(), lLines.rend(), [](const ZTSLogLine& lcrLine) {
                return lcrLine.mLabel == ".//TavikCommandHandler";
            });
            return lLast != lLines.rend() && lLast->mText == scRunningText;
        },
        "an idle command thread");
}

void ZTCAgentProcess::waitForIdleHeartbeatThread() const {
    waitUntil([&] { return !mLog.containing("Going to wait for ").empty(); }, "an idle heartbeat thread");
}

ZTCBytes ZTCAgentProcess::registerTargetsRequest(const std::vector<ZTSTarget>& acrTargets) {
    ZTCByteWriter lRequest;
    lRequest.u8(3).u32(acrTargets.size());
    for (const ZTSTarget& lcrTarget : acrTargets) {
        lRequest.wwn(lcrTarget.mNodeName).wwn(lcrTarget.mPortName).u32(lcrTarget.mFcId);
    }
    return lRequest.bytes();
}

void ZTCAgentProcess::registerTargets(const std::vector<ZTSTarget>& acrTargets) {
    EXPECT_EQ(hexOf(mPipes.request(registerTargetsRequest(acrTargets))), gcSuccessHex);
}

ZTSScopeDataResponse ZTCAgentProcess::retrieve() {
    return ZTSScopeDataResponse::decode(mPipes.request(ZTCByteWriter().u8(1).bytes()));
}
