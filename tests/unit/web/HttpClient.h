/// A client that sends and reads bytes as a test wants them, right or wrong.
#ifndef TESTS_UNIT_WEB_HTTPCLIENT_H
#define TESTS_UNIT_WEB_HTTPCLIENT_H

#include <string>

#include "sensor/client/include/FileDescriptor.h"
#include "tests/support/Waiting.h"

class ZTCHttpClient {
public:
    /// Connects to a port of 127.0.0.1. Throws std::runtime_error.
    explicit ZTCHttpClient(unsigned aPort);
    /// Connects to a Unix socket.
    explicit ZTCHttpClient(const std::string& acrPath);

    /// Sends all of it; false where the server has closed the connection.
    bool send(const std::string& acrBytes);
    /// Whether the server has closed the connection, whatever it has sent before.
    bool isHungUpOn() const;
    /// Everything up to the end of the connection.
    std::string readToEnd();
    /// Everything up to a text, that text included.
    std::string readUntil(const std::string& acrText);

    /// The whole answer to a GET on a connection of its own.
    static std::string get(unsigned aPort, const std::string& acrTarget, const std::string& acrHost = "localhost");
    /// The same over a Unix socket.
    static std::string get(const std::string& acrPath, const std::string& acrTarget);
    /// The same with every byte of the request as given.
    static std::string ask(unsigned aPort, const std::string& acrRequest);

private:
    bool readSome(const ZTCDeadline& acrDeadline);

    ZTCFileDescriptor mSocket;
    std::string mReceived;
};

#endif
