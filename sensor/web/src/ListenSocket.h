/// The listening socket of the web server.
#ifndef SENSOR_WEB_SRC_LISTENSOCKET_H
#define SENSOR_WEB_SRC_LISTENSOCKET_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"

struct ZTSListenSocket {
    ZTCFileDescriptor mSocket;
    unsigned mPort = 0;     ///< 0: a Unix socket
    std::string mUnixPath;  ///< to be removed at the end; empty: an address
};

/// Binds "ADDRESS:PORT", "[ADDRESS]:PORT", "localhost:PORT" or "unix:PATH" and listens, without blocking. A Unix socket
/// is 0660; one that was left behind, and that nobody listens on, is replaced. Throws ZTCBadInputEx for a text that is
/// no such address, ZTCSystemCallEx where the system refuses it.
ZTSListenSocket openListenSocket(const std::string& acrListen);

#endif
