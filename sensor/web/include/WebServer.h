/// A small HTTP server: GET and HEAD, one thread for all connections, everything bounded.
///
/// It answers what a handler answers, and streams lines to those who ask for the stream. libmicrohttpd speaks HTTP; the
/// listening socket is our own.
///
/// A page of another site must not read what is served here through a visitor's browser: the Host header has to be one
/// of those that belong to this server. On a Unix socket any Host is accepted: no browser reaches it.
#ifndef SENSOR_WEB_INCLUDE_WEBSERVER_H
#define SENSOR_WEB_INCLUDE_WEBSERVER_H

#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

struct ZTSWebRequest {
    std::string mPath;                                             ///< decoded, begins with "/"
    std::vector<std::pair<std::string, std::string>> mParameters;  ///< decoded, in order, repeated ones too

    /// The values of one parameter, in order.
    std::vector<std::string> getAll(const std::string& acrName) const;
    /// The last value of one parameter; empty: not given.
    std::string get(const std::string& acrName) const;
};

struct ZTSWebResponse {
    unsigned mStatus = 200;
    std::string mType = "text/plain; charset=utf-8";
    std::string mBody;
    std::string mCacheControl = "no-store";
    bool mIsStream = false;  ///< server-sent events: the body comes first, then every line of publish()
};

struct ZTSWebLimits {
    std::size_t mConnections = 128;
    std::size_t mStreams = 8;                        ///< one more gets 503
    std::size_t mRequestBytes = 16384;               ///< request line and headers
    std::size_t mStreamBytes = 262144;               ///< waiting for a reader that does not read; then it is dropped
    std::chrono::milliseconds mRequestTime{10000};   ///< from the connection, or the last answer, to a whole request
    std::chrono::milliseconds mResponseTime{30000};  ///< to take an answer
};

struct ZTSWebOptions {
    std::string mListen;              ///< "ADDRESS:PORT", "[ADDRESS]:PORT", "localhost:PORT", "unix:PATH"; port 0: any
    std::vector<std::string> mHosts;  ///< Host names accepted beside localhost, 127.0.0.1 and [::1]
    ZTSWebLimits mLimits{};
};

class ZTCWebServer {
public:
    /// Called on the server's thread, for GET and HEAD of any path. An exception becomes status 500.
    using Handler = std::function<ZTSWebResponse(const ZTSWebRequest&)>;

    /// Listens and starts the thread. Throws ZTCSystemCallEx or ZTCBadInputEx, naming the address.
    ZTCWebServer(const ZTSWebOptions& acrOptions, Handler aHandler);
    /// Ends all connections and the thread.
    ~ZTCWebServer();
    ZTCWebServer(const ZTCWebServer&) = delete;
    ZTCWebServer& operator=(const ZTCWebServer&) = delete;

    /// Sends one server-sent event to every stream. Any thread; never waits for a reader. @param acrData  one line
    void publish(const std::string& acrEvent, const std::string& acrData);
    bool hasStreams() const;

    /// The port that was bound; 0 for a Unix socket.
    unsigned getPort() const;

private:
    class ZTCImplementation;
    std::unique_ptr<ZTCImplementation> mpImplementation;
};

#endif
