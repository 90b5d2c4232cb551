/// Answers on the control socket: one line of JSON in, one line of JSON out, any number of times on a connection.
///
/// Nothing here waits. Clients, their lines and their time are bounded: a client that is slow, silent or greedy is
/// disconnected, and costs the collector nothing. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_CONTROLSERVER_H
#define SENSOR_COLLECTOR_INCLUDE_CONTROLSERVER_H

#include <poll.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <list>
#include <optional>
#include <string>
#include <vector>

#include "sensor/client/include/FileDescriptor.h"

/// More clients wait in the socket's queue.
inline constexpr std::size_t gcMaxControlClients = 16;
/// Longest request, without its line break.
inline constexpr std::size_t gcMaxControlRequest = 4096;
/// For a request to come whole, to be answered, and for its answer to be taken: each.
inline constexpr std::chrono::seconds gcControlPatience{10};

class ZTCControlServer {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;
    /// Serves one request. Returns the answer without a line break, or nothing where answer() is called later with the
    /// ticket. Must not throw.
    using Handler = std::function<std::optional<std::string>(std::uint64_t aTicket, const std::string& acrRequest)>;

    /// @param aSocket  listening and non-blocking
    ZTCControlServer(ZTCFileDescriptor aSocket, Handler aHandler);
    ~ZTCControlServer();

    /// Adds what is to be polled.
    void addTo(std::vector<pollfd>& arFds) const;
    /// Accepts, reads, answers, writes and disconnects whatever is due. To be called after each poll().
    void serve(ZTCTime aNow);
    /// When serve() is to be called at the latest; empty: no client is there, and none is kept waiting.
    std::optional<ZTCTime> getNextDeadline() const;
    /// A request that is put off takes so long at most, instead of gcControlPatience. To be called by the handler.
    void allow(std::uint64_t aTicket, std::chrono::milliseconds aTime);
    /// Answers a request that was put off. Does nothing where its client has gone.
    void answer(std::uint64_t aTicket, const std::string& acrAnswer);

    std::size_t countClients() const { return mClients.size(); }

private:
    struct ZTSClient;

    void accept(ZTCTime aNow);
    bool serveClient(ZTSClient& arClient, ZTCTime aNow);
    bool readFrom(ZTSClient& arClient, bool& arIsAtEnd);
    bool writeTo(ZTSClient& arClient);

    ZTCFileDescriptor mSocket;
    const Handler mHandler;
    std::list<ZTSClient> mClients;
    std::optional<ZTCTime> mAcceptAgain;  ///< accepting has failed: not before this time again
    std::uint64_t mNextTicket = 1;
    std::uint64_t mAllowedTicket = 0;  ///< of the last allow()
    std::chrono::milliseconds mAllowedTime{};
};

#endif
