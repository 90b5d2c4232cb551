#include "sensor/keeper/include/HostWorld.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <random>

#include "sensor/agentcommon/include/SensorAgentProtocol.h"
#include "sensor/client/include/AgentState.h"
#include "sensor/client/include/ClientErrors.h"
#include "sensor/keeper/include/Environment.h"
#include "sensor/keeper/include/KeeperPlaces.h"
#include "sensor/link/include/Inheritance.h"

/// A client holds the lock as long as it talks: its default time limit and some more.
static constexpr int scLockTries = 300;
static constexpr int scLockPauseMilliseconds = 50;

void sayLine(std::string_view aText) {
    // Without an allocation: what it says may be that memory is short.
    char lLine[PIPE_BUF];
    const int lLength = std::snprintf(lLine, sizeof(lLine), "tavik-sensor: %.*s\n",
                                      static_cast<int>(std::min(aText.size(), sizeof(lLine) - 32)), aText.data());
    // In one piece, so that lines of several processes do not mix. One that cannot be written is lost.
    [[maybe_unused]] const ssize_t lWritten = write(STDERR_FILENO, lLine, static_cast<std::size_t>(lLength));
}

ZTCHostWorld::ZTCHostWorld(const ZTSSettingsReading& acrReading, std::string aConfigOption)
    : mReading(acrReading),
      mConfigOption(std::move(aConfigOption)),
      mOwnFolder(ownFolder()),
      mDirectory(acrReading.mSettings.agentDirectory()),
      mControlPath(acrReading.mSettings.controlPath()),
      mSensorDirectory(acrReading.mSettings.mSensorDirectory),
      mSensorState(acrReading.mSettings.mSensorState),
      mLock(mDirectory) {
    makeDirectories(mReading.mSettings);
    mPidFile.emplace(mDirectory);
    takeLock();
    mControl = openControlSocket(mControlPath);
    mSettingsText = makeTextFile(mReading.mContent);
}

ZTCHostWorld::~ZTCHostWorld() {
    if (mControl.isOpen()) {
        unlink(mControlPath.c_str());
    }
}

void ZTCHostWorld::takeLock() {
    for (int i = 0; !mLock.tryAcquire(); ++i) {
        if (mLock.getNamedHolder() != 0 || i == scLockTries) {
            throw ZTCSensorBusyEx(mLock.describeHolder());
        }
        poll(nullptr, 0, scLockPauseMilliseconds);
    }
    mLock.nameHolder();
}

std::optional<ZTSLinkMessage> ZTCHostWorld::startAgent(std::uint64_t aStart) {
    const ZTSSettings& lcrSettings = mReading.mSettings;
    ZTSLinkMessage lStarted;
    lStarted.mType = ZTLM_AgentStarted;
    lStarted.mStart = aStart;
    try {
        char lRandom[16];
        std::snprintf(lRandom, sizeof(lRandom), "%08x", static_cast<unsigned>(std::random_device()()));
        mPage.close();
        mPagePath = mDirectory + "/page." + std::to_string(getpid()) + "-" + std::to_string(aStart) + "-" + lRandom;
        lStarted.mText = mPagePath;
        lStarted.mBell = ZTCFileDescriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
        if (!lStarted.mBell.isOpen()) {
            throw ZTCSystemCallEx("cannot make a bell for the agent", errno);
        }
        ZTSSpawn lSpawn;
        lSpawn.mProgram = findAgentProgram(lcrSettings.mAgentProgram, mOwnFolder);
        lStarted.mResponseFifo = makeResponseFifo(mDirectory + gcResponseFifoName);
        const auto lHeartbeat = std::chrono::duration_cast<std::chrono::seconds>(lcrSettings.mAgentHeartbeat);
        lSpawn.mArguments = {"-D", "false",
                             "-l", lcrSettings.mAgentLog,
                             "-d", std::to_string(lcrSettings.mAgentLogLevel),
                             "-b", std::to_string(lHeartbeat.count())};
        std::map<std::string, std::string> lVariables{{gcSensorDirVariable, mDirectory},
                                                      {gcStatusPageVariable, mPagePath},
                                                      {gcBellVariable, std::to_string(lStarted.mBell.get())}};
        if (!lcrSettings.mAgentLibrary.empty()) {
            lVariables["ZT_LIBKPM_PATH"] = lcrSettings.mAgentLibrary;
        }
        lSpawn.mEnvironment = makeChildEnvironment(lVariables);
        lSpawn.mDescriptors = {lStarted.mBell.get()};
        lSpawn.mPrivilege = ZTPV_PassOn;
        mProcesses[ZTWP_Agent] = spawn(lSpawn);
        lStarted.mPid = mProcesses[ZTWP_Agent].mPid;
        say("agent: " + lSpawn.mProgram + " runs as process " + std::to_string(lStarted.mPid));
        return lStarted;
    } catch (const ZTCClientEx& lcrEx) {
        say(std::string("agent: ") + lcrEx.what());
        return {};
    }
}

bool ZTCHostWorld::startCollector() {
    try {
        auto [lKeeper, lCollector] = ZTCLink::makePair();
        ZTSSpawn lSpawn;
        lSpawn.mProgram = findCollectorProgram(mOwnFolder);
        lSpawn.mEnvironment = makeChildEnvironment({{gcLinkVariable, std::to_string(lCollector.getDescriptor())},
                                                    {gcControlVariable, std::to_string(mControl.get())},
                                                    {gcSettingsVariable, std::to_string(mSettingsText.get())},
                                                    {gcDirectoryVariable, mSensorDirectory},
                                                    {gcStateVariable, mSensorState}});
        lSpawn.mDescriptors = {lCollector.getDescriptor(), mControl.get(), mSettingsText.get()};
        lSpawn.mHasOutput = true;
        mProcesses[ZTWP_Collector] = spawn(lSpawn);
        mLink = std::move(lKeeper);
        say("collector: " + lSpawn.mProgram + " runs as process " + std::to_string(mProcesses[ZTWP_Collector].mPid));
        return true;
    } catch (const ZTCClientEx& lcrEx) {
        say(std::string("collector: ") + lcrEx.what());
        return false;
    }
}

void ZTCHostWorld::sendSignal(ZTEWatched aProcess, int aSignal) {
    ::sendSignal(mProcesses[aProcess].mPidFd, aSignal);
}

ZTEStrangerLook ZTCHostWorld::lookForStranger() {
    try {
        const ZTSAgentState lState = lookAtAgent(mDirectory);
        if (lState.mPresence != ZTAP_Running) {
            return lState.mPresence == ZTAP_Starting ? ZTSL_Unknown : ZTSL_None;
        }
        ZTSProcess lProcess;
        lProcess.mPid = static_cast<pid_t>(lState.mPid);
        lProcess.mPidFd = openPidFd(lProcess.mPid);
        // The pid may have been another process's by the time it was opened.
        if (!lProcess.isThere() || lookAtAgent(mDirectory).mPid != lState.mPid) {
            return ZTSL_Unknown;
        }
        mProcesses[ZTWP_Stranger] = std::move(lProcess);
        return ZTSL_Watched;
    } catch (const ZTCClientEx& lcrEx) {
        say(std::string("agent: ") + lcrEx.what());
        return ZTSL_None;
    }
}

ZTELinkResult ZTCHostWorld::send(const ZTSLinkMessage& acrMessage) {
    try {
        const ZTELinkResult lResult = mLink.isOpen() ? mLink.send(acrMessage) : ZTLR_PeerGone;
        if (lResult == ZTLR_NotNow && errno != EAGAIN) {
            say(std::string("collector: a message cannot be sent: ") + std::strerror(errno));
        }
        return lResult;
    } catch (const ZTCClientEx& lcrEx) {
        say(std::string("collector: ") + lcrEx.what());
        return ZTLR_PeerGone;
    }
}

bool ZTCHostWorld::isEmpty(const ZTCFileDescriptor& acrFifo) {
    int lBytes = 0;
    return ioctl(acrFifo.get(), FIONREAD, &lBytes) == 0 && lBytes == 0;
}

std::optional<std::int64_t> ZTCHostWorld::getAgentTouch() {
    struct stat lStatus {};
    if (stat((mDirectory + gcAgentPidFileName).c_str(), &lStatus) != 0) {
        return {};
    }
    return lStatus.st_mtim.tv_sec * 1000000000LL + lStatus.st_mtim.tv_nsec;
}

std::optional<std::uint32_t> ZTCHostWorld::countAdapters() {
    ZTSStatusSnapshot lSnapshot;
    if ((!mPage.isOpen() && !mPage.open(mPagePath)) || !mPage.read(lSnapshot)) {
        return {};
    }
    return lSnapshot.mAdaptersNow;
}

ZTEStatusEnd ZTCHostWorld::readEndReason() {
    ZTSStatusSnapshot lSnapshot;
    const bool lIsRead = (mPage.isOpen() || mPage.open(mPagePath)) && mPage.read(lSnapshot);
    mPage.close();
    return lIsRead ? lSnapshot.mEndReason : ZTSE_Running;
}

std::set<std::string> ZTCHostWorld::getHostNames() {
    return listHostNames();
}

void ZTCHostWorld::touchPidFile() {
    try {
        mPidFile->touch();
    } catch (const ZTCClientEx& lcrEx) {
        say(std::string(lcrEx.what()) + "; the agent may take this sensor for hung");
    }
}

std::int64_t ZTCHostWorld::getWallClock() {
    return std::time(nullptr);
}

ZTCFileDescriptor ZTCHostWorld::setSettings(const ZTSSettingsReading& acrReading) {
    mReading = acrReading;
    mSettingsText = makeTextFile(mReading.mContent);
    return ZTCFileDescriptor(fcntl(mSettingsText.get(), F_DUPFD_CLOEXEC, 3));
}

int ZTCHostWorld::forget(ZTEWatched aProcess) {
    const int lStatus = aProcess == ZTWP_Stranger ? 0 : reap(mProcesses[aProcess]);
    mProcesses[aProcess] = ZTSProcess();
    return lStatus;
}
