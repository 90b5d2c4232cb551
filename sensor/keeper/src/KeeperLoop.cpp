#include "sensor/keeper/include/KeeperLoop.h"

#include <poll.h>
#include <sys/signalfd.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <ctime>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/keeper/include/Keeper.h"

/// Messages that are handled in a row, so that a collector that never stops sending keeps nothing else from its turn.
static constexpr int scMessagesInARow = 64;

ZTCFileDescriptor openSignals() {
    sigset_t lSignals;
    sigemptyset(&lSignals);
    for (const int lSignal : {SIGTERM, SIGINT, SIGHUP}) {
        sigaddset(&lSignals, lSignal);
    }
    sigprocmask(SIG_BLOCK, &lSignals, nullptr);
    ZTCFileDescriptor lDescriptor(signalfd(-1, &lSignals, SFD_CLOEXEC | SFD_NONBLOCK));
    if (!lDescriptor.isOpen()) {
        throw ZTCSystemCallEx("cannot wait for signals", errno);
    }
    return lDescriptor;
}

/// "1 key", "2 keys".
static std::string sCountText(std::size_t aCount, const char* apWhat) {
    return std::to_string(aCount) + " " + apWhat + (aCount == 1 ? "" : "s");
}

class ZTCKeeperLoop {
public:
    ZTCKeeperLoop(ZTCHostWorld& arWorld, const ZTCFileDescriptor& acrSignals)
        : mrWorld(arWorld),
          mcrSignals(acrSignals),
          mTimer(timerfd_create(CLOCK_MONOTONIC, TFD_CLOEXEC | TFD_NONBLOCK)),
          mKeeper(arWorld, heartbeatOf(arWorld.getSettings())) {
        if (!mTimer.isOpen()) {
            throw ZTCSystemCallEx("cannot make a timer", errno);
        }
    }

    int run() {
        mKeeper.start(ZTCKeeper::ZTCTime::clock::now());
        while (!mKeeper.isDone()) {
            setTimer();
            std::array<pollfd, 6> lFds{};
            const int lDescriptors[] = {mcrSignals.get(),
                                        mTimer.get(),
                                        mrWorld.getLink().getDescriptor(),
                                        mrWorld.getPidFd(ZTWP_Agent),
                                        mrWorld.getPidFd(ZTWP_Collector),
                                        mrWorld.getPidFd(ZTWP_Stranger)};
            for (std::size_t i = 0; i < lFds.size(); ++i) {
                lFds[i] = {.fd = lDescriptors[i], .events = POLLIN, .revents = 0};
            }
            if (poll(lFds.data(), lFds.size(), -1) < 0) {
                if (errno == EINTR) {
                    continue;
                }
                throw ZTCSystemCallEx("cannot wait", errno);
            }
            handle(lFds);
        }
        sayLine("has stopped" + std::string(mKeeper.getExitStatus() == 0 ? "" : ", not in order"));
        return mKeeper.getExitStatus();
    }

private:
    static std::chrono::seconds heartbeatOf(const ZTSSettings& acrSettings) {
        return std::chrono::duration_cast<std::chrono::seconds>(acrSettings.mAgentHeartbeat);
    }

    void setTimer() {
        const auto lNext = std::chrono::duration_cast<std::chrono::nanoseconds>(
            std::max(mKeeper.getNextTime().time_since_epoch(), ZTCKeeper::ZTCTime::duration(1)));
        itimerspec lTime{};
        lTime.it_value.tv_sec = lNext.count() / 1000000000;
        lTime.it_value.tv_nsec = lNext.count() % 1000000000;
        if (timerfd_settime(mTimer.get(), TFD_TIMER_ABSTIME, &lTime, nullptr) != 0) {
            throw ZTCSystemCallEx("cannot set the timer", errno);
        }
    }

    /// Messages first: what a process said before its end comes before its end.
    void handle(const std::array<pollfd, 6>& acrFds) {
        const auto lNow = ZTCKeeper::ZTCTime::clock::now();
        if (acrFds[2].revents != 0 || acrFds[4].revents != 0) {
            handleMessages(lNow);
        }
        if (acrFds[3].revents != 0) {
            const int lStatus = mrWorld.forget(ZTWP_Agent);
            mKeeper.handleAgentEnd(lNow, lStatus, mrWorld.readEndReason());
        }
        if (acrFds[4].revents != 0) {
            const int lStatus = mrWorld.forget(ZTWP_Collector);
            mrWorld.getLink().close();
            mKeeper.handleCollectorEnd(lNow, lStatus);
        }
        if (acrFds[5].revents != 0) {
            mrWorld.forget(ZTWP_Stranger);
            mKeeper.handleStrangerEnd(lNow);
        }
        if (acrFds[0].revents != 0) {
            handleSignals(lNow);
        }
        if (acrFds[1].revents != 0) {
            std::uint64_t lTimes = 0;
            [[maybe_unused]] const ssize_t lRead = read(mTimer.get(), &lTimes, sizeof(lTimes));
            mKeeper.handleTime(lNow);
        }
    }

    void handleMessages(ZTCKeeper::ZTCTime aNow) {
        for (int i = 0; i < scMessagesInARow && mrWorld.getLink().isOpen(); ++i) {
            try {
                ZTSLinkMessage lMessage;
                const ZTELinkResult lResult = mrWorld.getLink().receive(lMessage);
                if (lResult == ZTLR_NotNow) {
                    return;
                }
                if (lResult == ZTLR_PeerGone) {
                    mrWorld.getLink().close();  // its end follows; where it does not, it completes no look any more
                    return;
                }
                mKeeper.handleMessage(aNow, lMessage);
            } catch (const ZTCClientEx& lcrEx) {
                mrWorld.getLink().close();  // a collector whose keeper is gone ends by itself
                mKeeper.handleBrokenLink(aNow, lcrEx.what());
                return;
            }
        }
    }

    void handleSignals(ZTCKeeper::ZTCTime aNow) {
        signalfd_siginfo lInfo{};
        while (read(mcrSignals.get(), &lInfo, sizeof(lInfo)) == sizeof(lInfo)) {
            if (lInfo.ssi_signo == SIGHUP) {
                reload(aNow);
            } else {
                mKeeper.handleStop(aNow);
            }
        }
    }

    void reload(ZTCKeeper::ZTCTime aNow) {
        timespec lTime{};
        clock_gettime(CLOCK_MONOTONIC, &lTime);
        mrWorld.notify("RELOADING=1\nMONOTONIC_USEC=" +
                       std::to_string(lTime.tv_sec * 1000000LL + lTime.tv_nsec / 1000));
        const ZTSSettingsReading lReading = readSettings(mrWorld.getConfigOption());
        for (const ZTSSettingsProblem& lcrError : lReading.mErrors) {
            sayLine(lcrError.toText());
        }
        if (lReading.isGood()) {
            apply(aNow, lReading);
        } else {
            sayLine("the settings stay as they were: " + lReading.mFile + " has " +
                    sCountText(lReading.mErrors.size(), "error"));
        }
        mrWorld.notify("READY=1");
    }

    void apply(ZTCKeeper::ZTCTime aNow, const ZTSSettingsReading& acrReading) {
        const std::vector<std::string> lChanged = changedKeys(mrWorld.getSettings(), acrReading.mSettings);
        for (const std::string& lcrKey : lChanged) {
            sayLine("settings: " + lcrKey + " has changed" +
                    (lcrKey.starts_with("agent.")    ? "; it takes effect at the agent's next start"
                     : lcrKey.starts_with("sensor.") ? "; it takes effect at the sensor's next start"
                                                     : ""));
        }
        sayLine("settings: " + acrReading.mFile + " was read again; " + sCountText(lChanged.size(), "key") +
                (lChanged.size() == 1 ? " has" : " have") + " changed");
        try {
            mKeeper.handleReload(aNow, heartbeatOf(acrReading.mSettings), mrWorld.setSettings(acrReading));
        } catch (const ZTCClientEx& lcrEx) {
            sayLine(std::string("settings: ") + lcrEx.what() + "; the collector keeps the old ones");
        }
    }

    ZTCHostWorld& mrWorld;
    const ZTCFileDescriptor& mcrSignals;
    ZTCFileDescriptor mTimer;
    ZTCKeeper mKeeper;
};

int runKeeper(ZTCHostWorld& arWorld, const ZTCFileDescriptor& acrSignals) {
    return ZTCKeeperLoop(arWorld, acrSignals).run();
}
