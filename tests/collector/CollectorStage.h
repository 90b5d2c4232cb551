/// The real collector as a test drives it, with the test in the keeper's place: directories, link, control socket,
/// response FIFOs. Agents are the test's own.
#ifndef TESTS_COLLECTOR_COLLECTORSTAGE_H
#define TESTS_COLLECTOR_COLLECTORSTAGE_H

#include <sys/types.h>

#include <functional>
#include <memory>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/link/include/Link.h"
#include "sensor/store/include/History.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/SystemCallKiller.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

/// One start of an agent, as a keeper prepares it.
struct ZTSStagedStart {
    std::uint64_t mStart = 0;
    pid_t mPid = 0;
    std::string mPagePath;
    ZTCFileDescriptor mResponseFifo;
    ZTCFileDescriptor mBell;
    bool mHasEnded = false;
    int mWaitStatus = 0;
};

class ZTCCollectorStage {
public:
    /// @param acrSettings  TOML; looks come ten times a second unless it says otherwise
    explicit ZTCCollectorStage(const std::string& acrSettings = "collect.period = 0.1\n");
    ~ZTCCollectorStage();
    ZTCCollectorStage(const ZTCCollectorStage&) = delete;
    ZTCCollectorStage& operator=(const ZTCCollectorStage&) = delete;

    const std::string& agentDirectory() const { return mAgentDirectory; }
    const std::string& stateDirectory() const { return mStateDirectory; }
    std::string path(const std::string& acrName) const { return mDirectory.path(acrName); }
    void setEnvironment(const std::string& acrName, const std::string& acrValue);
    void writeSettings(const std::string& acrSettings);

    // ---- agents ----
    /// Makes a FIFO, a bell and a page's path, and tells a collector that runs. The agent comes behind it.
    ZTSStagedStart& announceStart(pid_t aPid);
    /// Of the newest start.
    void announceEnd(int aWaitStatus);
    /// As if another keeper began: it knows of no start.
    void forgetStarts() { mStarts.clear(); }
    /// A remote port in the tree that stands for sysfs.
    void makeRemotePort(const std::string& acrName, unsigned aFcId) const;

    // ---- the collector ----
    void startCollector();
    bool isRunning() { return mCollector != nullptr && !mCollector->hasEnded(); }
    pid_t getPid() const { return mCollector->getPid(); }
    void killCollector();
    /// A collector that is killed at that stop (see killAtSystemCall). Where it comes to the end of its work first, as
    /// the condition says on another thread, the keeper vanishes and the collector ends. Returns when it is dead.
    ZTSKilledRun runAndKillCollector(unsigned aStop, const std::function<bool()>& acrIsDone);
    void send(ZTELinkMessageType aType);
    /// Finish: in order to its end. Returns the exit status.
    int finish();
    int waitForExit() { return mCollector->waitForExit(); }
    /// The keeper vanishes.
    void closeLink() { mLink.close(); }
    /// Everything that the collector has sent so far is noted.
    void pump();
    void waitFor(const std::function<bool()>& acrCondition, const std::string& acrWhat);
    /// So many more.
    void waitForLooks(std::uint64_t aCount);
    bool isDrained(std::uint64_t aStart) const { return mDrained.contains(aStart); }
    std::uint64_t countLooks() const { return mLooks; }
    std::uint64_t countStartsAnswered() const { return mStartsAnswered; }
    std::string log() const;

    // ---- what it shows ----
    /// One request on the control socket.
    nlohmann::json ask(const std::string& acrRequest) const;
    nlohmann::json status() const { return ask(R"({"request":"status"})"); }
    std::unique_ptr<ZTCHistory> history() const { return std::make_unique<ZTCHistory>(mStateDirectory); }
    std::vector<std::string> spoolFiles() const { return listSpool(mStateDirectory); }
    std::uint64_t countStored() const { return ::countStored(mStateDirectory); }
    void expectSound() const { expectSoundHistory(mStateDirectory); }

private:
    void tellAll();
    void tell(const ZTSStagedStart& acrStart);
    [[noreturn]] void execute(const ZTCLink& acrLink) const;

    ZTCTemporaryDirectory mDirectory;
    const std::string mSensorDirectory;
    const std::string mAgentDirectory;
    const std::string mStateDirectory;
    std::vector<std::pair<std::string, std::string>> mEnvironment;
    ZTCFileDescriptor mControl;
    ZTCLink mLink;
    std::vector<std::unique_ptr<ZTSStagedStart>> mStarts;
    std::unique_ptr<ZTCChildProcess> mCollector;
    std::set<std::uint64_t> mDrained;
    std::uint64_t mLooks = 0;
    std::uint64_t mStartsAnswered = 0;
};

#endif
