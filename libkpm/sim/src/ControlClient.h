/// The other end of a running library's socket.
#ifndef LIBKPM_SIM_SRC_CONTROLCLIENT_H
#define LIBKPM_SIM_SRC_CONTROLCLIENT_H

#include <chrono>
#include <optional>
#include <stdexcept>
#include <string>

#include "libkpm/common/include/Descriptor.h"

/// No library listens on the path, or it has gone.
class ZTCSimNobodyListens : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The library listens and has not answered before the deadline.
class ZTCSimNoAnswer : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

class ZTCSimControlClient {
public:
    using Deadline = std::optional<std::chrono::steady_clock::time_point>;

    /// Connects. Waits for the library no longer than until the deadline; without one, for ever. Throws
    /// ZTCSimNobodyListens with the path and the reason, ZTCSimNoAnswer, std::runtime_error for a path that cannot be
    /// one.
    explicit ZTCSimControlClient(const std::string& acrPath, Deadline aDeadline = std::nullopt);

    /// Sends a line, without its line break, and returns the answer, without its line break. Throws
    /// ZTCSimNobodyListens and, at the deadline, ZTCSimNoAnswer.
    std::string ask(const std::string& acrLine);

private:
    void connect();
    void waitFor(short aEvent) const;

    const std::string mPath;
    const Deadline mDeadline;
    ZTCLibraryDescriptor mSocket;
    std::string mIn;
};

#endif
