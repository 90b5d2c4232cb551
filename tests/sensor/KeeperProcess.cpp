#include "tests/sensor/KeeperProcess.h"

#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <sstream>

ZTCKeeperProcess::ZTCKeeperProcess() {
    // The sensor looks for the collector from where it is itself: a copy of it finds the fake one.
    std::filesystem::create_directories(path("sbin"));
    std::filesystem::create_directories(path("libexec/tavik"));
    std::filesystem::create_directories(path("collector"));
    std::filesystem::copy_file(TAVIK_SENSOR_PROGRAM, path("sbin/tavik-sensor"));
    std::filesystem::copy_file(TAVIK_FAKE_COLLECTOR, path("libexec/tavik/tavik-collector"));
    setProgram(path("sbin/tavik-sensor"));
    setScenario("adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80\n");
    setEnvironment("FAKE_COLLECTOR_DIR", path("collector"));
    configure("");
}

ZTCKeeperProcess::~ZTCKeeperProcess() {
    if (testing::Test::HasFailure()) {
        std::cerr << "---- messages of the collector\n" << readFile(path("collector/messages"));
    }
    for (const std::string& lcrLine : messages()) {
        const std::size_t lPid = lcrLine.find("pid=");
        const pid_t lProcess = lcrLine.starts_with("Collector ") ? std::atoi(lcrLine.c_str() + 10)
                               : lPid != std::string::npos       ? std::atoi(lcrLine.c_str() + lPid + 4)
                                                                 : 0;
        // Ours still: the pid of a process that has ended may have been given away, but not to one of this directory.
        const std::string lEnvironment = readFile("/proc/" + std::to_string(lProcess) + "/environ");
        if (lProcess > 0 && lEnvironment.find(path("collector")) != std::string::npos) {
            kill(lProcess, SIGKILL);
        }
    }
}

void ZTCKeeperProcess::configure(const std::string& acrLines) {
    ZTCSensorProcess::configure("agent.heartbeat = 1\n" + acrLines);
}

void ZTCKeeperProcess::startAndWait() {
    const std::size_t lBefore = count("StartAnswered ");
    launch();
    waitFor("StartAnswered ", lBefore + 1);
}

void ZTCKeeperProcess::removeFile(const std::string& acrName) const {
    std::filesystem::remove(path("collector/" + acrName));
}

std::vector<std::string> ZTCKeeperProcess::messages() const {
    std::vector<std::string> lLines;
    std::istringstream lText(readFile(path("collector/messages")));
    for (std::string lLine; std::getline(lText, lLine) && !lText.eof();) {
        lLines.push_back(lLine);
    }
    return lLines;
}

std::size_t ZTCKeeperProcess::count(const std::string& acrStart) const {
    const std::vector<std::string> lLines = messages();
    return static_cast<std::size_t>(std::count_if(
        lLines.begin(), lLines.end(), [&](const std::string& acrLine) { return acrLine.starts_with(acrStart); }));
}

std::string ZTCKeeperProcess::waitFor(const std::string& acrStart, std::size_t aCount,
                                      const ZTCDeadline& acrDeadline) const {
    waitUntil([&] { return count(acrStart) >= aCount; },
              std::to_string(aCount) + " messages \"" + acrStart + "\" to the collector", acrDeadline);
    std::string lFound;
    for (const std::string& lcrLine : messages()) {
        lFound = lcrLine.starts_with(acrStart) ? lcrLine : lFound;
    }
    return lFound;
}

pid_t ZTCKeeperProcess::collectorPid() const {
    return std::atoi(waitFor("Collector ").c_str() + 10);
}

pid_t ZTCKeeperProcess::agentPid() const {
    const std::string lLine = waitFor("AgentStarted ");
    return std::atoi(lLine.c_str() + lLine.find("pid=") + 4);
}
