#include "tests/sensor/SensorProcess.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <sstream>
#include <stdexcept>

#include "sensor/client/include/SensorPidFile.h"
#include "tests/sensor/HistoryCheck.h"
#include "tests/sensor/UnixLine.h"

ZTCSensorProcess::ZTCSensorProcess(const std::string& acrSettings)
    : mProgram(TAVIK_SENSOR_PROGRAM),
      mLibrary(TAVIK_SIM_LIBRARY),
      mEnvironment{{"PATH", "/usr/bin:/bin"}, {"KPM_SIM_SOCKET", path("sim.sock")}, {"TAVIK_SYSFS_ROOT", sysfs()}} {
    std::filesystem::create_directories(sysfs() + "/class/fc_host");
    configure(acrSettings);
}

/// Where the test has not ended it: in order, after a failure by force.
ZTCSensorProcess::~ZTCSensorProcess() {
    try {
        if (mProcess != nullptr && !mProcess->hasEnded()) {
            mProcess->sendSignal(SIGTERM);
            EXPECT_LE(mProcess->waitForExit(ZTCDeadline(3 * gcTestPatience)), 1);
        }
    } catch (const std::exception& lrEx) {
        ADD_FAILURE() << "the sensor does not end: " << lrEx.what();
    }
    if (testing::Test::HasFailure()) {
        std::cerr << "---- the sensor's messages\n" << standardError();
    }
}

void ZTCSensorProcess::configure(const std::string& acrLines) {
    mSettings = acrLines;
    writeFile(configPath(), "agent.program = \"" TAVIK_AGENT_PROGRAM "\"\nagent.library = \"" + mLibrary +
                                "\"\nagent.log = \"" + path("agent.log") + "\"\nsensor.directory = \"" + path("run") +
                                "\"\nsensor.state = \"" + stateDirectory() + "\"\n" + mSettings);
}

void ZTCSensorProcess::setLibrary(const std::string& acrPath) {
    mLibrary = acrPath;
    configure(mSettings);
}

void ZTCSensorProcess::setScenario(const std::string& acrText) {
    writeFile(path("scenario.kpm"), acrText);
    setEnvironment("KPM_SIM_SCENARIO", path("scenario.kpm"));
}

ZTSChildProcessSetup ZTCSensorProcess::makeSetup(const std::vector<std::string>& acrArguments,
                                                 const std::string& acrOutput) const {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = mProgram;
    lSetup.mArguments = acrArguments;
    lSetup.mEnvironment = mEnvironment;
    lSetup.mWorkingDirectory = mDirectory.path();
    lSetup.mOutputPrefix = path(acrOutput);
    return lSetup;
}

void ZTCSensorProcess::launch() {
    mProcess =
        std::make_unique<ZTCChildProcess>(makeSetup({"--config", configPath()}, "sensor" + std::to_string(++mRuns)));
}

void ZTCSensorProcess::start() {
    launch();
    waitUntilListening();
}

void ZTCSensorProcess::waitUntilListening() const {
    waitUntil(
        [this] {
            try {
                return simulate("status").find("schedule=done") != std::string::npos;
            } catch (const std::runtime_error&) {
                return false;  // the library is not open yet
            }
        },
        "the library's schedule", ZTCDeadline(3 * gcTestPatience));
}

int ZTCSensorProcess::stop() {
    mProcess->sendSignal(SIGTERM);
    return mProcess->waitForExit(ZTCDeadline(3 * gcTestPatience));
}

int ZTCSensorProcess::run(const std::vector<std::string>& acrArguments, std::string* apError) {
    ZTCChildProcess lProcess(makeSetup(acrArguments, "other" + std::to_string(++mRuns)));
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

void writeScript(const std::string& acrPath, const std::string& acrScript) {
    const std::string lNew = acrPath + ".new";
    writeFile(lNew, "#!/bin/sh\n" + acrScript + "\n");
    std::filesystem::permissions(lNew, std::filesystem::perms::owner_all);
    std::filesystem::rename(lNew, acrPath);
}

void waitForEnd(pid_t aPid, const ZTCDeadline& acrDeadline) {
    waitUntil([&] { return !isProcessAlive(aPid); }, "the end of process " + std::to_string(aPid), acrDeadline);
}

nlohmann::json ZTCSensorProcess::status() const {
    return nlohmann::json::parse(askLine(path("run/control"), R"({"request":"status"})"));
}

pid_t ZTCSensorProcess::findChild(const std::string& acrName) const {
    const std::string lSensor = std::to_string(mProcess->getPid());
    std::ifstream lChildren("/proc/" + lSensor + "/task/" + lSensor + "/children");
    pid_t lPid = 0;
    while (lChildren >> lPid) {
        std::string lName;
        std::ifstream("/proc/" + std::to_string(lPid) + "/comm") >> lName;
        if (lName == acrName) {
            return lPid;
        }
    }
    return 0;
}

std::string ZTCSensorProcess::simulate(const std::string& acrLine) const {
    const std::string lAnswer = askLine(path("sim.sock"), acrLine);
    if (!lAnswer.starts_with("ok ")) {
        throw std::runtime_error("the simulated library: " + lAnswer);
    }
    return lAnswer.substr(3);
}

std::map<std::string, std::uint64_t> ZTCSensorProcess::countDelivered() const {
    std::map<std::string, std::uint64_t> lCounts;
    const auto lAdd = [&lCounts](const std::string& acrAnswer) {
        std::istringstream lWords(acrAnswer);
        std::string lWord;
        while (lWords >> lWord) {
            const std::size_t lEquals = lWord.find('=');
            lCounts[lWord.substr(0, lEquals)] = std::strtoull(lWord.c_str() + lEquals + 1, nullptr, 10);
        }
    };
    lAdd(simulate("counts"));
    const std::map<std::string, std::uint64_t> lKinds = lCounts;
    lAdd(simulate("status"));
    const std::uint64_t lPages = lCounts["pages"];
    lCounts = lKinds;
    lCounts["rscn"] = lPages;
    return lCounts;
}

void ZTCSensorProcess::waitUntilAllIsStored() const {
    waitUntil(
        [this] {
            try {
                const nlohmann::json lStatus = status();
                // A new agent is asked at once, even where it holds nothing: that answer is a file for a moment, too.
                return lStatus["agent"].value("retrievals", 0) != 0 && lStatus["agent"].value("heldRecords", 1) == 0 &&
                       lStatus["collector"]["waitingFrames"] == 0 && listSpool(stateDirectory()).empty();
            } catch (const std::exception&) {
                return false;  // a collector is just starting
            }
        },
        "an empty agent and an empty spool", ZTCDeadline(6 * gcTestPatience));
}
