#include "tests/sensor/SensorProcess.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <sstream>

#include "sensor/client/include/SensorPidFile.h"

ZTCSensorProcess::ZTCSensorProcess() : mLibrary(TAVIK_SIMULATED_LIBRARY) {
    // The sensor looks for the collector from where it is itself: a copy of it finds the fake one.
    std::filesystem::create_directories(path("sbin"));
    std::filesystem::create_directories(path("libexec/tavik"));
    std::filesystem::create_directories(path("collector"));
    std::filesystem::create_directories(sysfs() + "/class/fc_host");
    std::filesystem::copy_file(TAVIK_SENSOR_PROGRAM, path("sbin/tavik-sensor"));
    std::filesystem::copy_file(TAVIK_FAKE_COLLECTOR, path("libexec/tavik/tavik-collector"));
    setScenario("adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80\n");
    mEnvironment = {{"FAKE_COLLECTOR_DIR", path("collector")},
                    {"KPM_SIM_SCENARIO", path("scenario.kpm")},
                    {"TAVIK_SYSFS_ROOT", sysfs()},
                    {"PATH", "/usr/bin:/bin"}};
    writeConfiguration("");
}

ZTCSensorProcess::~ZTCSensorProcess() {
    if (mProcess) {
        mProcess->kill();
        if (testing::Test::HasFailure()) {
            std::cerr << "---- standard error of the sensor\n"
                      << mProcess->standardError() << "---- messages of the collector\n"
                      << readFile(path("collector/messages"));
        }
    }
    for (const std::string& lcrLine : messages()) {
        const std::size_t lPid = lcrLine.find("pid=");
        const pid_t lProcess = lcrLine.starts_with("Collector ") ? std::atoi(lcrLine.c_str() + 10)
                               : lPid != std::string::npos       ? std::atoi(lcrLine.c_str() + lPid + 4)
                                                                 : 0;
        // Ours still: the pid of a process that has ended may have been given away, but not to one of this directory.
        std::error_code lError;
        const std::string lEnvironment = readFile("/proc/" + std::to_string(lProcess) + "/environ");
        if (lProcess > 0 && lEnvironment.find(path("collector")) != std::string::npos) {
            kill(lProcess, SIGKILL);
        }
    }
}

void ZTCSensorProcess::writeConfiguration(const std::string& acrMore) const {
    writeFile(configPath(), "agent.program = \"" TAVIK_AGENT_PROGRAM "\"\nagent.library = \"" + mLibrary +
                                "\"\nagent.log = \"" + path("agent.log") + "\"\nagent.heartbeat = 1\n" +
                                "sensor.directory = \"" + path("run") + "\"\nsensor.state = \"" + path("state") +
                                "\"\n" + acrMore);
}

void ZTCSensorProcess::configure(const std::string& acrLines) const {
    writeConfiguration(acrLines);
}

void ZTCSensorProcess::setLibrary(const std::string& acrPath) {
    mLibrary = acrPath;
    writeConfiguration("");
}

void ZTCSensorProcess::start() {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = path("sbin/tavik-sensor");
    lSetup.mArguments = {"--config", configPath()};
    lSetup.mEnvironment = mEnvironment;
    lSetup.mWorkingDirectory = mDirectory.path();
    lSetup.mOutputPrefix = path("sensor" + std::to_string(++mRuns));
    mProcess = std::make_unique<ZTCChildProcess>(lSetup);
}

void ZTCSensorProcess::startAndWait() {
    const std::size_t lBefore = count("StartAnswered ");
    start();
    waitFor("StartAnswered ", lBefore + 1);
}

int ZTCSensorProcess::run(const std::vector<std::string>& acrArguments, std::string* apError) {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = path("sbin/tavik-sensor");
    lSetup.mArguments = acrArguments;
    lSetup.mEnvironment = mEnvironment;
    lSetup.mWorkingDirectory = mDirectory.path();
    lSetup.mOutputPrefix = path("other" + std::to_string(++mRuns));
    ZTCChildProcess lProcess(lSetup);
    const int lStatus = lProcess.waitForExit();
    if (apError != nullptr) {
        *apError = lProcess.standardError();
    }
    return lStatus;
}

void ZTCSensorProcess::waitForMessage(const std::string& acrText, const ZTCDeadline& acrDeadline) const {
    waitUntil([&] { return standardError().find(acrText) != std::string::npos; },
              "the sensor's message \"" + acrText + "\"", acrDeadline);
}

void ZTCSensorProcess::removeFile(const std::string& acrName) const {
    std::filesystem::remove(path("collector/" + acrName));
}

std::vector<std::string> ZTCSensorProcess::messages() const {
    std::vector<std::string> lLines;
    std::istringstream lText(readFile(path("collector/messages")));
    for (std::string lLine; std::getline(lText, lLine) && !lText.eof();) {
        lLines.push_back(lLine);
    }
    return lLines;
}

std::size_t ZTCSensorProcess::count(const std::string& acrStart) const {
    const std::vector<std::string> lLines = messages();
    return static_cast<std::size_t>(std::count_if(
        lLines.begin(), lLines.end(), [&](const std::string& acrLine) { return acrLine.starts_with(acrStart); }));
}

std::string ZTCSensorProcess::waitFor(const std::string& acrStart, std::size_t aCount,
                                      const ZTCDeadline& acrDeadline) const {
    waitUntil([&] { return count(acrStart) >= aCount; },
              std::to_string(aCount) + " messages \"" + acrStart + "\" to the collector", acrDeadline);
    std::string lFound;
    for (const std::string& lcrLine : messages()) {
        lFound = lcrLine.starts_with(acrStart) ? lcrLine : lFound;
    }
    return lFound;
}

pid_t ZTCSensorProcess::collectorPid() const {
    return std::atoi(waitFor("Collector ").c_str() + 10);
}

pid_t ZTCSensorProcess::agentPid() const {
    const std::string lLine = waitFor("AgentStarted ");
    return std::atoi(lLine.c_str() + lLine.find("pid=") + 4);
}

void waitForEnd(pid_t aPid, const ZTCDeadline& acrDeadline) {
    waitUntil([&] { return !isProcessAlive(aPid); }, "the end of process " + std::to_string(aPid), acrDeadline);
}
