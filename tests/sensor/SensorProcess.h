/// tavik-sensor as a test runs it: own directories, the real collector, the real agent on the simulated library.
/// Everything waits for events with a deadline and throws std::runtime_error where that is over.
#ifndef TESTS_SENSOR_SENSORPROCESS_H
#define TESTS_SENSOR_SENSORPROCESS_H

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

class ZTCSensorProcess {
public:
    /// Makes the directories and a configuration file with these lines of TOML in it; nothing runs.
    explicit ZTCSensorProcess(const std::string& acrSettings = "");
    ~ZTCSensorProcess();
    ZTCSensorProcess(const ZTCSensorProcess&) = delete;
    ZTCSensorProcess& operator=(const ZTCSensorProcess&) = delete;

    // ---- before the start ----
    /// Writes the configuration file anew: sensor.*, agent.program, agent.log and agent.library, and these lines.
    void configure(const std::string& acrLines);
    void setLibrary(const std::string& acrPath);
    void setEnvironment(const std::string& acrName, const std::string& acrValue) { mEnvironment[acrName] = acrValue; }
    /// The simulated library plays this from the next start of an agent on.
    void setScenario(const std::string& acrText);

    // ---- places ----
    std::string path(const std::string& acrName) const { return mDirectory.path(acrName); }
    std::string configPath() const { return path("tavik.toml"); }
    std::string agentFolder() const { return path("run/agent"); }
    std::string stateDirectory() const { return path("state"); }
    std::string sysfs() const { return path("sysfs"); }

    // ---- running ----
    /// Starts the process, and waits for nothing.
    void launch();
    /// Starts it, and returns when the agent has registered for all events.
    void start();
    /// Until the agent that runs now has registered for all events.
    void waitUntilListening() const;
    /// SIGTERM. Returns the exit status.
    int stop();
    /// Runs another one with these arguments until it has ended.
    int run(const std::vector<std::string>& acrArguments, std::string* apError = nullptr);
    ZTCChildProcess& process() { return *mProcess; }
    int waitForExit(const ZTCDeadline& acrDeadline = ZTCDeadline()) { return mProcess->waitForExit(acrDeadline); }
    /// Of the sensor and its collector, since the last start.
    std::string standardError() const { return mProcess != nullptr ? mProcess->standardError() : ""; }
    void waitForMessage(const std::string& acrText, const ZTCDeadline& acrDeadline = ZTCDeadline()) const;

    // ---- what it shows and does ----
    /// The live state.
    nlohmann::json status() const;
    /// The collector that runs now; 0 where none does.
    pid_t findCollector() const { return findChild("tavik-collector"); }
    pid_t findAgent() const { return findChild("qrv-tvk"); }
    /// One line to the simulated library; its answer without the "ok ". Throws std::runtime_error where it refuses.
    std::string simulate(const std::string& acrLine) const;
    /// What the library has delivered: events of each kind; of RSCNs the pages.
    std::map<std::string, std::uint64_t> countDelivered() const;
    /// Until the agent holds nothing and the spool is empty.
    void waitUntilAllIsStored() const;

protected:
    void setProgram(const std::string& acrPath) { mProgram = acrPath; }

private:
    pid_t findChild(const std::string& acrName) const;
    ZTSChildProcessSetup makeSetup(const std::vector<std::string>& acrArguments, const std::string& acrOutput) const;

    ZTCTemporaryDirectory mDirectory;
    std::string mProgram;
    std::string mLibrary;
    std::string mSettings;
    std::map<std::string, std::string> mEnvironment;
    std::unique_ptr<ZTCChildProcess> mProcess;
    unsigned mRuns = 0;
};

/// Puts a shell script in the place of the file, whole: a process that runs the old one keeps it.
void writeScript(const std::string& acrPath, const std::string& acrScript);

/// Waits until a process is gone, or a zombie that somebody else has to reap.
void waitForEnd(pid_t aPid, const ZTCDeadline& acrDeadline = ZTCDeadline());

#endif
