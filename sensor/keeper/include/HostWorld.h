/// The keeper's world on a real host: processes, FIFOs, lock, pid file, control socket, service manager.
#ifndef SENSOR_KEEPER_INCLUDE_HOSTWORLD_H
#define SENSOR_KEEPER_INCLUDE_HOSTWORLD_H

#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "sensor/agentcommon/include/StatusPage.h"
#include "sensor/client/include/ClientLock.h"
#include "sensor/client/include/SensorPidFile.h"
#include "sensor/client/include/StatusPageReader.h"
#include "sensor/keeper/include/KeeperWorld.h"
#include "sensor/keeper/include/ServiceManager.h"
#include "sensor/keeper/include/Spawn.h"
#include "sensor/link/include/Link.h"
#include "sensor/settings/include/Settings.h"

/// One line on standard error.
void sayLine(std::string_view aText);

class ZTCHostWorld : public ZTCKeeperWorld {
public:
    /// Makes the directories, takes pid file and lock, opens the control socket. Waits up to 15 s for a client that is
    /// talking to an agent. Throws ZTCSensorBusyEx where another sensor has the directory, ZTCClientEx for the rest.
    /// @param acrReading       good settings
    /// @param aConfigOption  what --config named, or empty; for a reload
    ZTCHostWorld(const ZTSSettingsReading& acrReading, std::string aConfigOption);
    ~ZTCHostWorld() override;

    std::optional<ZTSLinkMessage> startAgent(std::uint64_t aStart) override;
    bool startCollector() override;
    void sendSignal(ZTEWatched aProcess, int aSignal) override;
    ZTEStrangerLook lookForStranger() override;
    ZTELinkResult send(const ZTSLinkMessage& acrMessage) override;
    bool isEmpty(const ZTCFileDescriptor& acrFifo) override;
    std::optional<std::int64_t> getAgentTouch() override;
    std::optional<std::uint32_t> countAdapters() override;
    std::set<std::string> getHostNames() override;
    void touchPidFile() override;
    std::int64_t getWallClock() override;
    void say(const std::string& acrText) override { sayLine(acrText); }
    void notify(const std::string& acrAssignment) override { mServiceManager.notify(acrAssignment); }

    const ZTSSettings& getSettings() const { return mReading.mSettings; }
    const std::string& getConfigOption() const { return mConfigOption; }
    /// For processes started from now on. sensor.directory and sensor.state stay. Returns the text for the collector.
    ZTCFileDescriptor setSettings(const ZTSSettingsReading& acrReading);

    /// To be polled: readable once the process has ended. -1 where there is none.
    int getPidFd(ZTEWatched aProcess) const { return mProcesses[aProcess].mPidFd.get(); }
    ZTCLink& getLink() { return mLink; }

    /// Reaps a process that has ended, and forgets it. Returns its wait status; 0 for a stranger's.
    int forget(ZTEWatched aProcess);
    /// How the agent that was started last ended, read from its page; "running" where the page has no end.
    ZTEStatusEnd readEndReason();

private:
    void takeLock();

    ZTSSettingsReading mReading;
    const std::string mConfigOption;
    const std::string mOwnFolder;
    const std::string mDirectory;  ///< the agent's
    const std::string mControlPath;
    const std::string mSensorDirectory;
    const std::string mSensorState;

    std::optional<ZTCSensorPidFile> mPidFile;
    ZTCClientLock mLock;
    ZTCFileDescriptor mControl;
    ZTCFileDescriptor mSettingsText;
    ZTCServiceManager mServiceManager;

    ZTSProcess mProcesses[3];  ///< by ZTEWatched
    ZTCLink mLink;
    std::string mPagePath;  ///< of the agent that was started last
    ZTCStatusPageReader mPage;
};

#endif
