/// The scripted library's end of the socket over which a test drives it. Each line is a request, answered by one line.
#ifndef TESTS_SUPPORT_SCRIPTEDCONNECTION_H
#define TESTS_SUPPORT_SCRIPTEDCONNECTION_H

#include <functional>
#include <string>
#include <thread>

/// Used by one thread at a time; the requests are handled on a thread of its own.
class ZTCScriptedConnection {
public:
    /// Returns the answer. What it throws is answered as an error.
    using Handle = std::function<std::string(const std::string& acrLine)>;
    /// Called with each line after its answer was sent.
    using Answered = std::function<void(const std::string& acrLine)>;

    ZTCScriptedConnection() = default;
    ~ZTCScriptedConnection() { close(); }
    ZTCScriptedConnection(const ZTCScriptedConnection&) = delete;
    ZTCScriptedConnection& operator=(const ZTCScriptedConnection&) = delete;

    /// Connects to the socket and serves its lines from then on. Does nothing where nobody listens.
    void open(const std::string& acrPath, Handle aHandle, Answered aAnswered);

    /// Ends the thread after the request that it is in, and joins it. No request comes any more. The socket stays
    /// open, so that the test does not take the library for closed yet.
    void stopServing();

    void close();

private:
    void serve();
    bool answer(const std::string& acrLine) const;

    int mSocket = -1;
    Handle mHandle;
    Answered mAnswered;
    std::thread mServer;
};

#endif
