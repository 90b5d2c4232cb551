/// The other end of a running library's socket.
#ifndef LIBKPM_SIM_SRC_CONTROLCLIENT_H
#define LIBKPM_SIM_SRC_CONTROLCLIENT_H

#include <stdexcept>
#include <string>

#include "libkpm/common/include/Descriptor.h"

/// No library listens on the path, or it has gone.
class ZTCSimNobodyListens : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

class ZTCSimControlClient {
public:
    /// Connects. Throws ZTCSimNobodyListens with the path and the reason, std::runtime_error for a path that cannot be
    /// one.
    explicit ZTCSimControlClient(const std::string& acrPath);

    /// Sends a line, without its line break, and returns the answer likewise. Throws ZTCSimNobodyListens.
    std::string ask(const std::string& acrLine);

private:
    const std::string mPath;
    ZTCLibraryDescriptor mSocket;
    std::string mIn;
};

#endif
