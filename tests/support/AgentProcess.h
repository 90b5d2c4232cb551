/// The real agent as a test drives it: own directories, own adapters' library, own process, and the sensor's ends of
/// its pipes. Everything waits for events with a deadline and throws std::runtime_error where that is over.
///
/// When the object goes, an agent that still runs is stopped with SIGTERM, and has to end in order with status 0;
/// whatever a sanitizer reported about any process that the object started fails the test.
#ifndef TESTS_SUPPORT_AGENTPROCESS_H
#define TESTS_SUPPORT_AGENTPROCESS_H

#include <gtest/gtest.h>
#include <sys/types.h>

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "tests/support/AgentLog.h"
#include "tests/support/Bytes.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/ScopeDataResponse.h"
#include "tests/support/ScriptedLibrary.h"
#include "tests/support/SensorPipes.h"
#include "tests/support/TemporaryDirectory.h"

/// How a run of the program ended.
struct ZTSRunResult {
    int mStatus = -1;  ///< exit status, or 1000 plus the number of the signal that killed it
    std::string mOutput;
    std::string mError;
};

/// Responses without data, as hex of their bodies.
inline constexpr const char* gcSuccessHex = "0000000000";
inline constexpr const char* gcInvalidHex = "010006";

/// Requests, as hex of their bodies. A collection period of 0 seconds is always refused and changes nothing.
inline constexpr const char* gcPingHex = "0500000000";
inline constexpr const char* gcStopScopeHex = "02";
inline constexpr const char* gcShutDownHex = "04";
std::string periodHex(std::uint32_t aSeconds);
inline constexpr const char* gcNotAllowedHex = "010009";

/// A remote port of the register-targets command.
struct ZTSTarget {
    ZTSWwn mNodeName;
    ZTSWwn mPortName;
    unsigned mFcId = 0;
};

class ZTCAgentProcess {
public:
    /// Makes the directories; nothing runs. The library has `aAdapters` adapters of the default names.
    explicit ZTCAgentProcess(unsigned aAdapters = 1);
    ~ZTCAgentProcess();
    ZTCAgentProcess(const ZTCAgentProcess&) = delete;
    ZTCAgentProcess& operator=(const ZTCAgentProcess&) = delete;

    // ---- before the start ----
    ZTCScriptedLibrary& library() { return mLibrary; }
    void setEnvironment(const std::string& acrName, const std::string& acrValue) { mEnvironment[acrName] = acrValue; }
    void unsetEnvironment(const std::string& acrName) { mEnvironment.erase(acrName); }
    void setStandardStreams(bool aHasThem) { mHasStandardStreams = aHasThem; }
    void setUmask(mode_t aMask) { mUmask = aMask; }

    // ---- places ----
    std::string sensorDirectory() const { return mDirectory.path("sensor"); }
    std::string workingDirectory() const { return mDirectory.path("work"); }
    std::string commandFifoPath() const { return sensorDirectory() + "/qrvtvkcmd.fifo"; }
    std::string responseFifoPath() const { return sensorDirectory() + "/qrvtvkout.fifo"; }
    std::string pidFilePath() const { return sensorDirectory() + "/qrv-tvk.pid"; }
    std::string sensorPidFilePath() const { return sensorDirectory() + "/qrv-sn.pid"; }
    std::string defaultLogPath() const { return workingDirectory() + "/qrv-tvk.log"; }
    std::string agentLogPath() const { return mDirectory.path("agent.log"); }
    static std::string programPath();

    // ---- running ----
    /// `-D false -d 255 -l agent.log`, the arguments of most tests; more may follow.
    std::vector<std::string> defaultArguments(const std::vector<std::string>& acrMore = {}) const;
    void start() { start(defaultArguments()); }
    void start(const std::vector<std::string>& acrArguments);
    /// Starts with the default arguments and these, connects the sensor's pipes and waits until commands are served.
    void startAndConnect(const std::vector<std::string>& acrMore = {});
    /// The same with another log code, for tests whose subject is not the log. Its first command is answered on return.
    void startAndConnectQuietly(unsigned aLogCode = 1, const std::vector<std::string>& acrMore = {});
    /// Runs the program with these arguments, beside an agent that may be running, until it has ended.
    ZTSRunResult run(const std::vector<std::string>& acrArguments);
    /// Starts it so, and leaves it running. The caller waits for it.
    std::unique_ptr<ZTCChildProcess> launch(const std::vector<std::string>& acrArguments);

    ZTCChildProcess& process() { return *mProcess; }
    bool isStarted() const { return mProcess != nullptr; }
    /// Waits for the end of the agent that start() started and returns its exit status.
    int waitForExit(const ZTCDeadline& acrDeadline = ZTCDeadline());
    /// SIGTERM, then waitForExit().
    int stop();
    /// Kills the agent with SIGKILL.
    void kill();
    /// Hands a daemon over to this object as the process to watch and to end.
    void adopt(pid_t aPid);

    /// The log that -l names in the default arguments.
    const ZTCAgentLog& log() const { return mLog; }
    /// The log in the working directory.
    ZTCAgentLog defaultLog() const { return ZTCAgentLog(defaultLogPath()); }

    // ---- talking ----
    ZTCSensorPipes& pipes() { return mPipes; }
    /// One request and its response, as hex of the bodies.
    std::string request(std::string_view aBodyHex);
    /// Asks for what changes nothing, and holds where the agent answers as it should.
    testing::AssertionResult ping();
    /// Start command with this limit of event data per record; fails the test where it is not answered with success.
    void startScope(unsigned aMaxEventDataSize = 4096);
    void registerTargets(const std::vector<ZTSTarget>& acrTargets);
    ZTSScopeDataResponse retrieve();
    /// Waits until the command thread has done with its commands and waits for the next one.
    void waitForIdleCommandThread() const;
    /// Waits until the heartbeat thread waits for its first period to end. One that an exit meets before that has
    /// nothing to leave, and says nothing.
    void waitForIdleHeartbeatThread() const;

    static ZTCBytes startScopeRequest(unsigned aMaxEventDataSize);
    static ZTCBytes registerTargetsRequest(const std::vector<ZTSTarget>& acrTargets);

private:
    ZTSChildProcessSetup setup(const std::vector<std::string>& acrArguments, const std::string& acrName) const;
    void reportSanitizers() const;

    ZTCTemporaryDirectory mDirectory;
    ZTCScriptedLibrary mLibrary;
    ZTCSensorPipes mPipes;
    ZTCAgentLog mLog;
    std::map<std::string, std::string> mEnvironment;
    mode_t mUmask = 022;
    bool mHasStandardStreams = true;
    unsigned mRuns = 0;
    std::unique_ptr<ZTCChildProcess> mProcess;
};

#endif
