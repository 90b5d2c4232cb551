#include "tests/collector/CollectorStage.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <stdexcept>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/link/include/Inheritance.h"
#include "tests/sensor/UnixLine.h"
#include "tests/support/TestThreads.h"

static void sCheck(bool aIsGood, const std::string& acrWhat) {
    if (!aIsGood) {
        throw std::runtime_error(acrWhat + ": " + std::strerror(errno));
    }
}

ZTCCollectorStage::ZTCCollectorStage(const std::string& acrSettings)
    : mSensorDirectory(mDirectory.path("run")),
      mAgentDirectory(mDirectory.path("run/agent")),
      mStateDirectory(mDirectory.path("state")) {
    std::signal(SIGPIPE, SIG_IGN);
    std::filesystem::create_directories(mAgentDirectory);
    std::filesystem::create_directories(mStateDirectory);
    std::filesystem::create_directories(mDirectory.path("sys"));
    mEnvironment.emplace_back("TAVIK_SYSFS_ROOT", mDirectory.path("sys"));
    writeSettings(acrSettings);
    mControl = makeUnixSocket(SOCK_NONBLOCK);
    const sockaddr_un lAddress = makeUnixAddress(mDirectory.path("run/control"));
    sCheck(bind(mControl.get(), reinterpret_cast<const sockaddr*>(&lAddress), sizeof(lAddress)) == 0, "bind");
    sCheck(listen(mControl.get(), 8) == 0, "listen");
}

ZTCCollectorStage::~ZTCCollectorStage() {
    mCollector.reset();
    if (testing::Test::HasFailure()) {
        std::cerr << "---- the collectors' messages\n" << log() << "---- the spool\n";
        for (const std::string& lrFile : listSpool(mStateDirectory)) {
            std::cerr << lrFile << '\n';
        }
    }
}

void ZTCCollectorStage::setEnvironment(const std::string& acrName, const std::string& acrValue) {
    mEnvironment.emplace_back(acrName, acrValue);
}

void ZTCCollectorStage::writeSettings(const std::string& acrSettings) {
    writeFile(mDirectory.path("settings"), acrSettings);
}

std::string ZTCCollectorStage::log() const {
    return readFile(mDirectory.path("collector.err"));
}

// ---- agents ----

ZTSStagedStart& ZTCCollectorStage::announceStart(pid_t aPid) {
    auto lpStart = std::make_unique<ZTSStagedStart>();
    lpStart->mStart = mStarts.size() + 1;
    lpStart->mPid = aPid;
    lpStart->mPagePath = mAgentDirectory + "/page." + std::to_string(lpStart->mStart);
    const std::string lFifo = mAgentDirectory + gcResponseFifoName;
    unlink(lFifo.c_str());
    sCheck(mkfifo(lFifo.c_str(), 0600) == 0, "mkfifo");
    lpStart->mResponseFifo = ZTCFileDescriptor::open(lFifo.c_str(), O_RDONLY | O_NONBLOCK);
    lpStart->mBell = ZTCFileDescriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
    mStarts.push_back(std::move(lpStart));
    if (isRunning()) {
        tell(*mStarts.back());
    }
    return *mStarts.back();
}

void ZTCCollectorStage::announceEnd(int aWaitStatus) {
    mStarts.back()->mHasEnded = true;
    mStarts.back()->mWaitStatus = aWaitStatus;
    if (isRunning()) {
        tell(*mStarts.back());
    }
}

void ZTCCollectorStage::tell(const ZTSStagedStart& acrStart) {
    ZTSLinkMessage lMessage;
    lMessage.mType = acrStart.mHasEnded ? ZTLM_AgentEnded : ZTLM_AgentStarted;
    lMessage.mStart = acrStart.mStart;
    lMessage.mPid = acrStart.mPid;
    lMessage.mText = acrStart.mPagePath;
    lMessage.mWaitStatus = acrStart.mWaitStatus;
    if (!acrStart.mHasEnded) {
        lMessage.mResponseFifo = ZTCFileDescriptor(fcntl(acrStart.mResponseFifo.get(), F_DUPFD_CLOEXEC, 3));
        lMessage.mBell = ZTCFileDescriptor(fcntl(acrStart.mBell.get(), F_DUPFD_CLOEXEC, 3));
    }
    mLink.send(lMessage);
}

/// What a keeper tells a collector that it has just started.
void ZTCCollectorStage::tellAll() {
    for (const auto& lrpStart : mStarts) {
        if (mDrained.contains(lrpStart->mStart)) {
            continue;
        }
        const bool lHasEnded = std::exchange(lrpStart->mHasEnded, false);
        tell(*lrpStart);
        lrpStart->mHasEnded = lHasEnded;
        if (lHasEnded) {
            tell(*lrpStart);
        }
    }
    send(ZTLM_KeeperState);
}

void ZTCCollectorStage::send(ZTELinkMessageType aType) {
    ZTSLinkMessage lMessage;
    lMessage.mType = aType;
    lMessage.mStart = mStarts.empty() ? 0 : mStarts.back()->mStart;
    lMessage.mState = ZTKS_Running;
    if (aType == ZTLM_Reload) {
        lMessage.mSettings = ZTCFileDescriptor::open(mDirectory.path("settings").c_str(), O_RDONLY);
    }
    mLink.send(lMessage);
}

// ---- the collector ----

/// Runs between fork and exec, in a process whose other threads are gone.
void ZTCCollectorStage::execute(const ZTCLink& acrLink) const {
    const auto lPass = [](const char* apVariable, int aDescriptor) {
        setenv(apVariable, std::to_string(dup(aDescriptor)).c_str(), 1);  // the duplicate outlives exec
    };
    const ZTCFileDescriptor lSettings = ZTCFileDescriptor::open(mDirectory.path("settings").c_str(), O_RDONLY);
    lPass(gcLinkVariable, acrLink.getDescriptor());
    lPass(gcControlVariable, mControl.get());
    lPass(gcSettingsVariable, lSettings.get());
    setenv(gcDirectoryVariable, mSensorDirectory.c_str(), 1);
    setenv(gcStateVariable, mStateDirectory.c_str(), 1);
    for (const auto& [lrName, lrValue] : mEnvironment) {
        setenv(lrName.c_str(), lrValue.c_str(), 1);
    }
    const int lLog = open(mDirectory.path("collector.err").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    dup2(lLog, 2);
    execl(TAVIK_COLLECTOR_PROGRAM, TAVIK_COLLECTOR_PROGRAM, static_cast<char*>(nullptr));
    _exit(127);
}

void ZTCCollectorStage::startCollector() {
    auto [lOwn, lTheirs] = ZTCLink::makePair();
    mLink = std::move(lOwn);
    const pid_t lPid = fork();
    sCheck(lPid >= 0, "fork");
    if (lPid == 0) {
        execute(lTheirs);
    }
    mCollector = std::make_unique<ZTCChildProcess>(lPid);
    lTheirs.close();
    tellAll();
}

void ZTCCollectorStage::killCollector() {
    mCollector->kill();
    pump();
}

ZTSKilledRun ZTCCollectorStage::runAndKillCollector(unsigned aStop, const std::function<bool()>& acrIsDone) {
    auto [lOwn, lTheirs] = ZTCLink::makePair();
    mLink = std::move(lOwn);
    tellAll();
    ZTCTestThread lKeeper([&](const std::stop_token& acrStop) {
        EXPECT_NO_THROW(waitUntil([&] { return acrStop.stop_requested() || acrIsDone(); },
                                  "the end of the collector or of its work", ZTCDeadline(6 * gcTestPatience)));
        pump();
        mLink.close();
    });
    const ZTCLink& lrTheirs = lTheirs;
    const ZTSKilledRun lRun = killAtSystemCall(aStop, [&]() -> int { execute(lrTheirs); });
    lKeeper.stop();
    return lRun;
}

int ZTCCollectorStage::finish() {
    send(ZTLM_Finish);
    waitFor([this] { return mCollector->hasEnded(); }, "the collector's end");
    return mCollector->waitForExit();
}

void ZTCCollectorStage::pump() {
    ZTSLinkMessage lMessage;
    while (mLink.isOpen() && mLink.receive(lMessage) == ZTLR_Done) {
        mLooks += lMessage.mType == ZTLM_Look ? 1 : 0;
        mStartsAnswered += lMessage.mType == ZTLM_StartAnswered ? 1 : 0;
        if (lMessage.mType == ZTLM_Drained) {
            mDrained.insert(lMessage.mStart);
        }
    }
}

void ZTCCollectorStage::waitFor(const std::function<bool()>& acrCondition, const std::string& acrWhat) {
    waitUntil(
        [&] {
            pump();
            return acrCondition();
        },
        acrWhat, ZTCDeadline(3 * gcTestPatience));
}

void ZTCCollectorStage::waitForLooks(std::uint64_t aCount) {
    const std::uint64_t lBefore = mLooks;
    waitFor([&] { return mLooks >= lBefore + aCount; }, "looks");
}

void ZTCCollectorStage::makeRemotePort(const std::string& acrName, unsigned aFcId) const {
    const std::string lPath = mDirectory.path("sys/class/fc_remote_ports/" + acrName);
    std::filesystem::create_directories(lPath);
    writeFile(lPath + "/port_name", "0x100000000000000" + std::to_string(aFcId) + "\n");
    writeFile(lPath + "/node_name", "0x200000000000000" + std::to_string(aFcId) + "\n");
    writeFile(lPath + "/port_id", "0x00000" + std::to_string(aFcId) + "\n");
    writeFile(lPath + "/port_state", "Online\n");
}

// ---- what it shows ----

nlohmann::json ZTCCollectorStage::ask(const std::string& acrRequest) const {
    return nlohmann::json::parse(askLine(mDirectory.path("run/control"), acrRequest));
}
