/// The keeper alone: tavik-sensor with the real agent, and a collector that the test watches (FakeCollector.cpp).
///
/// When the object goes, every process that it started is killed, by its pid.
#ifndef TESTS_SENSOR_KEEPERPROCESS_H
#define TESTS_SENSOR_KEEPERPROCESS_H

#include <string>
#include <vector>

#include "tests/sensor/SensorProcess.h"

class ZTCKeeperProcess : public ZTCSensorProcess {
public:
    /// One adapter; agent.heartbeat is 1.
    ZTCKeeperProcess();
    ~ZTCKeeperProcess();
    ZTCKeeperProcess(const ZTCKeeperProcess&) = delete;
    ZTCKeeperProcess& operator=(const ZTCKeeperProcess&) = delete;

    /// Adds these lines to the configuration.
    void configure(const std::string& acrLines);
    /// Starts it and waits until the agent has answered the start command.
    void startAndWait();

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
};

#endif
