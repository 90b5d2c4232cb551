/// One question on a Unix stream socket: a line out, a line in.
#ifndef TESTS_SENSOR_UNIXLINE_H
#define TESTS_SENSOR_UNIXLINE_H

#include <sys/un.h>

#include <string>

#include "sensor/client/include/FileDescriptor.h"

/// Throws std::runtime_error where there is no socket.
ZTCFileDescriptor makeUnixSocket(int aFlags);
sockaddr_un makeUnixAddress(const std::string& acrPath);

/// The answer without its line break. Throws std::runtime_error where nobody listens; an answer that does not come is
/// empty.
std::string askLine(const std::string& acrPath, const std::string& acrLine);

#endif
