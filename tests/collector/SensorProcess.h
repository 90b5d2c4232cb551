/// The real sensor (keeper, collector, agent) over the simulated library, as a test drives it.
#ifndef TESTS_COLLECTOR_SENSORPROCESS_H
#define TESTS_COLLECTOR_SENSORPROCESS_H

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

class ZTCSensorProcess {
public:
    /// Writes the configuration, with these lines of TOML in it, and an empty scenario of two adapters.
    explicit ZTCSensorProcess(const std::string& acrSettings = "");
    ~ZTCSensorProcess();
    ZTCSensorProcess(const ZTCSensorProcess&) = delete;
    ZTCSensorProcess& operator=(const ZTCSensorProcess&) = delete;

    std::string stateDirectory() const { return mDirectory.path("state"); }
    std::string log() const;

    /// Returns when the agent has registered for all events.
    void start();
    /// SIGTERM. Returns the exit status.
    int stop();

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

private:
    pid_t findChild(const std::string& acrName) const;

    ZTCTemporaryDirectory mDirectory;
    std::unique_ptr<ZTCChildProcess> mProcess;
};

#endif
