#include "tests/faults/FaultStage.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "libkpm/common/include/Descriptor.h"

/// One of them is the last word of an agent that ends in order.
static const char* const scLastWords[] = {
    "Exit condition",
    "Failed with error - ",
    "Tavik System exiting",
};

ZTCFaultStage::ZTCFaultStage(ZTEFaultLibrary aLibrary) : mFaults(mAgent) {
    mAgent.pipes().giveUpWhen([this] { return !isRunning(); });
    if (aLibrary == ZTEFaultLibrary::Kernel) {
        mpKernel = std::make_unique<ZTCFakeKernel>();
        mpKernel->addHost(0);
        const std::string lInstance = mpKernel->tracefs() + "/instances/prepared";
        mpKernel->make(lInstance);
        mAgent.setEnvironment("ZT_LIBKPM_PATH", TAVIK_LINUX_LIBRARY);
        mAgent.setEnvironment("KPM_LINUX_SYSFS", mpKernel->sysfs());
        mAgent.setEnvironment("KPM_LINUX_TRACEFS", mpKernel->tracefs());
        mAgent.setEnvironment("KPM_LINUX_INSTANCE", lInstance);
    }
}

void ZTCFaultStage::plan(const ZTSFaultPlan& acrPlan) {
    mPlan = acrPlan;
    mPlan.mIsOfLibrary = mpKernel != nullptr;
}

void ZTCFaultStage::endFailure() {
    if (mPlan.mSpan != 0 && mFaults.hasFired()) {
        const ZTCDeadline lEnd(std::chrono::milliseconds(mPlan.mSpan));
        waitUntil([&] { return lEnd.isOver(); }, "the end of the span");
    }
    disarm();
}

std::vector<std::string> ZTCFaultStage::arguments(const std::vector<std::string>& acrMore) const {
    std::vector<std::string> lArguments{"-D", "false", "-d", "127", "-l", mAgent.agentLogPath()};
    if (std::count(acrMore.begin(), acrMore.end(), "-b") == 0) {
        // There is no sensor: an agent that serves a long phase would end at its default period.
        lArguments.insert(lArguments.end(), {"-b", "86400"});
    }
    lArguments.insert(lArguments.end(), acrMore.begin(), acrMore.end());
    return lArguments;
}

void ZTCFaultStage::launch(const std::vector<std::string>& acrArguments) {
    for (const std::string& lcrPath : {mAgent.agentLogPath(), mAgent.agentLogPath() + ".1", mAgent.defaultLogPath()}) {
        std::filesystem::remove(lcrPath);
    }
    mIsDaemon = std::count(acrArguments.begin(), acrArguments.end(), "true") != 0;
    mIsAdopted = false;
    mHasStandardError = !mIsDaemon && mHasStandardStreams;
    mAgent.start(acrArguments);
}

/// False where the agent has ended first.
bool ZTCFaultStage::connect() {
    if (!mAgent.pipes().openUnless([this] { return !isRunning(); }, ZTCDeadline())) {
        return false;
    }
    if (mIsDaemon) {
        waitUntil([this] { return !isRunning() || mIsAdopted; }, "the end of the daemon's first process");
    }
    if (mpKernel == nullptr) {
        mAgent.library().waitUntilOpen();  // with that, those that ended have left its queue
    }
    probe();
    return true;
}

bool ZTCFaultStage::start(const std::vector<std::string>& acrArguments) {
    mAgent.pipes().close();
    launch(acrArguments);
    return connect();
}

void ZTCFaultStage::startUndisturbed(const std::vector<std::string>& acrMore) {
    disarm();
    mAgent.pipes().close();
    // With a reader there already, the agent need not wait for one.
    if (!exists(mAgent.responseFifoPath())) {
        mkfifo(mAgent.responseFifoPath().c_str(), 0600);
    }
    mAgent.pipes().openResponse();
    launch(arguments(acrMore));
    if (!connect()) {
        throw ZTCFinding("an agent that nothing disturbs does not start: " + logText());
    }
    mDescriptorsAtFirst = openDescriptors();
}

/// A daemon's first process has ended when this comes to be asked: the daemon is this process's child then.
static pid_t sAdoptableChild() {
    std::ifstream lFile("/proc/self/task/" + std::to_string(gettid()) + "/children");
    pid_t lPid = 0;
    return lFile >> lPid ? lPid : 0;
}

void ZTCFaultStage::setStandardStreams(bool aHasThem) {
    mHasStandardStreams = aHasThem;
    mAgent.setStandardStreams(aHasThem);
}

bool ZTCFaultStage::isRunning() {
    if (!mAgent.isStarted()) {
        return false;
    }
    if (!mAgent.process().hasEnded()) {
        return true;
    }
    const pid_t lDaemon = sAdoptableChild();
    if (lDaemon > 0) {
        mAgent.adopt(lDaemon);
        mIsAdopted = true;
    }
    return lDaemon > 0;
}

ZTEFaultEnd ZTCFaultStage::waitForEnd() {
    try {
        waitUntil([this] { return !isRunning(); }, "the end of the agent", ZTCDeadline());
    } catch (const std::runtime_error&) {
        const std::string lText = logText();
        kill();
        throw ZTCFinding("it hangs: " + lText);
    }
    const int lStatus = mAgent.waitForExit();
    const std::string lText = logText();
    mAgent.pipes().close();
    if (lStatus == 1 && lText.find("Assertion [ ") != std::string::npos) {
        return ZTEFaultEnd::Assertion;
    }
    if (lStatus != 0) {
        throw ZTCFinding("it ended with " + std::to_string(lStatus) + ": " + lText);
    }
    // Before the log code of the command line is in force, the last word is not written; and who cannot write the log
    // may have no standard error.
    const bool lCannotWrite = mFaults.isArmed() && mFaults.hasFired() && mPlan.mIsLasting && mPlan.mCall == "write";
    bool lHasLastWord = !mHasStandardError || lCannotWrite || !exists(mAgent.agentLogPath());
    for (const char* lpWord : scLastWords) {
        lHasLastWord = lHasLastWord || lText.find(lpWord) != std::string::npos;
    }
    if (!lHasLastWord) {
        throw ZTCFinding("it ended without a last word: " + lText);
    }
    return ZTEFaultEnd::InOrder;
}

void ZTCFaultStage::stop() {
    disarm();
    mAgent.process().sendSignal(SIGTERM);
    if (waitForEnd() != ZTEFaultEnd::InOrder) {
        throw ZTCFinding("an agent that is stopped ends by an assertion: " + logText());
    }
}

void ZTCFaultStage::kill() {
    mAgent.kill();
    mAgent.pipes().close();
}

void ZTCFaultStage::checkNextStart() {
    startUndisturbed();
    stop();
    for (const std::string& lcrPath : {mAgent.commandFifoPath(), mAgent.responseFifoPath(), mAgent.pidFilePath()}) {
        if (exists(lcrPath)) {
            throw ZTCFinding("the next agent left " + lcrPath);
        }
    }
}

void ZTCFaultStage::probe() {
    if (!mAgent.ping()) {
        throw ZTCFinding("a command got a wrong answer");
    }
}

std::size_t ZTCFaultStage::openDescriptors() {
    const std::filesystem::directory_iterator lAll("/proc/" + std::to_string(mAgent.process().getPid()) + "/fd");
    return static_cast<std::size_t>(std::distance(begin(lAll), end(lAll)));
}

/// What was written to a file: without its holes, which are most of a log that was made long to be rotated.
static std::string sReadWritten(const std::string& acrPath) {
    const ZTCLibraryDescriptor lFile(::open(acrPath.c_str(), O_RDONLY | O_CLOEXEC));
    std::string lText;
    off_t lPlace = lFile.isOpen() ? ::lseek(lFile.get(), 0, SEEK_DATA) : -1;
    while (lPlace >= 0) {
        const off_t lEnd = ::lseek(lFile.get(), lPlace, SEEK_HOLE);
        std::string lPart(lEnd > lPlace ? static_cast<std::size_t>(lEnd - lPlace) : 0, '\0');
        const ssize_t lRead = ::pread(lFile.get(), lPart.data(), lPart.size(), lPlace);
        if (lRead <= 0) {
            break;
        }
        lText.append(lPart, 0, static_cast<std::size_t>(lRead));
        lPlace = ::lseek(lFile.get(), lPlace + lRead, SEEK_DATA);
    }
    return lText;
}

std::string ZTCFaultStage::logText() {
    return sReadWritten(mAgent.defaultLogPath()) + sReadWritten(mAgent.agentLogPath() + ".1") +
           sReadWritten(mAgent.agentLogPath()) + mAgent.process().standardError();
}

std::size_t ZTCFaultStage::countInLog(const std::string& acrText) {
    const std::string lText = logText();
    std::size_t lCount = 0;
    for (std::size_t lAt = lText.find(acrText); lAt != std::string::npos; lAt = lText.find(acrText, lAt + 1)) {
        ++lCount;
    }
    return lCount;
}

std::vector<std::string> ZTCFaultStage::retrieve() {
    const ZTSScopeDataResponse lResponse = mAgent.retrieve();
    std::vector<std::string> lTexts;
    for (std::size_t lList = 0; lList < lResponse.mLists.size(); ++lList) {
        for (const std::string& lcrText : lResponse.texts(lList)) {
            lTexts.push_back(std::to_string(lList) + ": " + lcrText);
        }
    }
    return lTexts;
}
