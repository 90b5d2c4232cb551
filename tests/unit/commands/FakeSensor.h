/// The sensor's end of the control socket, played by a thread of the test.
#ifndef TESTS_UNIT_COMMANDS_FAKESENSOR_H
#define TESTS_UNIT_COMMANDS_FAKESENSOR_H

#include <functional>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>

#include "sensor/client/include/FileDescriptor.h"
#include "tests/support/TestThreads.h"

class ZTCFakeSensor {
public:
    /// Gives the bytes that answer a request; none: the connection stays open without an answer.
    using ZTCAnswer = std::function<std::string(const nlohmann::json& acrRequest)>;

    ZTCFakeSensor(const std::string& acrSocketPath, ZTCAnswer aAnswer);
    ~ZTCFakeSensor();
    ZTCFakeSensor(const ZTCFakeSensor&) = delete;
    ZTCFakeSensor& operator=(const ZTCFakeSensor&) = delete;

    /// Answers `status` with this document, and everything else with an error.
    static ZTCAnswer withState(const nlohmann::json& acrLive);

private:
    void serve();
    void serveClient(int aClient);

    const ZTCAnswer mAnswer;
    ZTCFileDescriptor mListener;
    ZTCFileDescriptor mStop;
    std::optional<ZTCTestThread> mThread;
};

/// What a sensor that collects from one adapter says.
nlohmann::json makeLiveState();

#endif
