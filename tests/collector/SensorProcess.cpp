#include "tests/collector/SensorProcess.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <iostream>
#include <sstream>
#include <stdexcept>

#include "tests/collector/HistoryCheck.h"
#include "tests/collector/UnixLine.h"

ZTCSensorProcess::ZTCSensorProcess(const std::string& acrSettings) {
    for (const char* lpName : {"run", "state", "sys"}) {
        std::filesystem::create_directory(mDirectory.path(lpName));
    }
    writeFile(mDirectory.path("tavik.toml"),
              acrSettings + "\nagent.library = \"" TAVIK_SIM_LIBRARY "\"\nagent.log_level = 1\nagent.log = \"" +
                  mDirectory.path("agent.log") + "\"\nsensor.directory = \"" + mDirectory.path("run") +
                  "\"\nsensor.state = \"" + mDirectory.path("state") + "\"\n");
}

ZTCSensorProcess::~ZTCSensorProcess() {
    try {
        if (mProcess != nullptr && !mProcess->hasEnded()) {
            EXPECT_EQ(stop(), 0);
        }
    } catch (const std::exception& lrEx) {
        ADD_FAILURE() << "the sensor does not end: " << lrEx.what();
    }
    if (testing::Test::HasFailure()) {
        std::cerr << "---- the sensor's messages\n" << log();
    }
}

std::string ZTCSensorProcess::log() const {
    return readFile(mDirectory.path("sensor.err"));
}

void ZTCSensorProcess::start() {
    ZTSChildProcessSetup lSetup;
    lSetup.mProgram = TAVIK_SENSOR_PROGRAM;
    lSetup.mArguments = {"--config", mDirectory.path("tavik.toml")};
    lSetup.mEnvironment = {{"PATH", "/usr/bin:/bin"},
                           {"KPM_SIM_SOCKET", mDirectory.path("sim.sock")},
                           {"TAVIK_SYSFS_ROOT", mDirectory.path("sys")}};
    lSetup.mWorkingDirectory = mDirectory.path();
    lSetup.mOutputPrefix = mDirectory.path("sensor");
    mProcess = std::make_unique<ZTCChildProcess>(lSetup);
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

nlohmann::json ZTCSensorProcess::status() const {
    return nlohmann::json::parse(askLine(mDirectory.path("run/control"), R"({"request":"status"})"));
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
    const std::string lAnswer = askLine(mDirectory.path("sim.sock"), acrLine);
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
                return lStatus["agent"].value("heldRecords", 1) == 0 && lStatus["collector"]["waitingFrames"] == 0 &&
                       listSpool(stateDirectory()).empty();
            } catch (const std::exception&) {
                return false;  // a collector is just starting
            }
        },
        "an empty agent and an empty spool", ZTCDeadline(6 * gcTestPatience));
}
