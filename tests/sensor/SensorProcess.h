/// tavik-sensor as a test runs it: own directories, the real agent on the simulated library, and a collector that the
/// test watches (FakeCollector.cpp). Everything waits for events with a deadline and throws std::runtime_error where
/// that is over.
///
/// When the object goes, every process that it started is killed, by its pid.
#ifndef TESTS_SENSOR_SENSORPROCESS_H
#define TESTS_SENSOR_SENSORPROCESS_H

#include <sys/types.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

class ZTCSensorProcess {
public:
    /// Makes the directories and a configuration file; nothing runs.
    ZTCSensorProcess();
    ~ZTCSensorProcess();
    ZTCSensorProcess(const ZTCSensorProcess&) = delete;
    ZTCSensorProcess& operator=(const ZTCSensorProcess&) = delete;

    // ---- before the start ----
    /// Adds lines to the configuration file, which already has sensor.*, agent.log, agent.library and
    /// agent.heartbeat=1.
    void configure(const std::string& acrLines) const;
    void setLibrary(const std::string& acrPath);
    void setEnvironment(const std::string& acrName, const std::string& acrValue) { mEnvironment[acrName] = acrValue; }
    /// The simulated library plays this from the next start of an agent on.
    void setScenario(const std::string& acrText) const { writeFile(mDirectory.path("scenario.kpm"), acrText); }

    // ---- places ----
    std::string path(const std::string& acrName) const { return mDirectory.path(acrName); }
    std::string configPath() const { return path("tavik.toml"); }
    std::string agentFolder() const { return path("run/agent"); }
    std::string sysfs() const { return path("sysfs"); }

    // ---- running ----
    void start();
    /// Starts it and waits until the agent has answered the start command.
    void startAndWait();
    /// Runs another one with these arguments until it has ended.
    int run(const std::vector<std::string>& acrArguments, std::string* apError = nullptr);
    ZTCChildProcess& process() { return *mProcess; }
    int waitForExit(const ZTCDeadline& acrDeadline = ZTCDeadline()) { return mProcess->waitForExit(acrDeadline); }
    std::string standardError() const { return mProcess->standardError(); }
    void waitForMessage(const std::string& acrText, const ZTCDeadline& acrDeadline = ZTCDeadline()) const;

    // ---- the collector ----
    void putFile(const std::string& acrName) const { writeFile(path("collector/" + acrName), ""); }
    void removeFile(const std::string& acrName) const;
    /// The lines that the collectors have written, in order.
    std::vector<std::string> messages() const;
    std::size_t count(const std::string& acrStart) const;
    /// Waits until so many lines begin like that, and returns the last of them.
    std::string waitFor(const std::string& acrStart, std::size_t aCount = 1,
                        const ZTCDeadline& acrDeadline = ZTCDeadline()) const;
    pid_t collectorPid() const;
    pid_t agentPid() const;

private:
    void writeConfiguration(const std::string& acrMore) const;

    ZTCTemporaryDirectory mDirectory;
    std::string mLibrary;
    std::map<std::string, std::string> mEnvironment;
    std::unique_ptr<ZTCChildProcess> mProcess;
    unsigned mRuns = 0;
};

/// Waits until a process is gone, or a zombie that somebody else has to reap.
void waitForEnd(pid_t aPid, const ZTCDeadline& acrDeadline = ZTCDeadline());

#endif
