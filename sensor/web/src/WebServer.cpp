#include "sensor/web/include/WebServer.h"

#include <microhttpd.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <condition_variable>
#include <cstring>
#include <list>
#include <mutex>
#include <thread>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/web/src/HostCheck.h"
#include "sensor/web/src/ListenSocket.h"

using ZTCClock = std::chrono::steady_clock;

/// A stream that nothing is sent on gets a comment this often, so that a reader that has gone is noticed.
static constexpr std::chrono::seconds scStreamBeat{15};

/// How often deadlines are checked while there are connections.
static constexpr std::chrono::milliseconds scWatchPeriod{250};

/// Headers of every answer. Scripts, styles and requests come from this server alone, and nobody frames its pages.
static constexpr std::array<std::pair<const char*, const char*>, 4> scSecurityHeaders{{
    {"Content-Security-Policy",
     "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self' data:; connect-src 'self'; "
     "base-uri 'none'; form-action 'none'; frame-ancestors 'none'"},
    {"X-Content-Type-Options", "nosniff"},
    {"Referrer-Policy", "no-referrer"},
    {"Cross-Origin-Resource-Policy", "same-origin"},
}};

std::vector<std::string> ZTSWebRequest::getAll(const std::string& acrName) const {
    std::vector<std::string> lValues;
    for (const auto& [lName, lValue] : mParameters) {
        if (lName == acrName) {
            lValues.push_back(lValue);
        }
    }
    return lValues;
}

std::string ZTSWebRequest::get(const std::string& acrName) const {
    const std::vector<std::string> lValues = getAll(acrName);
    return lValues.empty() ? std::string() : lValues.back();
}

class ZTCWebServer::ZTCImplementation {
public:
    ZTCImplementation(const ZTSWebOptions& acrOptions, Handler aHandler)
        : mOptions(acrOptions), mHandler(std::move(aHandler)), mSocket(openListenSocket(acrOptions.mListen)) {
        mpDaemon = MHD_start_daemon(
            MHD_USE_INTERNAL_POLLING_THREAD | MHD_USE_EPOLL | MHD_USE_ITC | MHD_ALLOW_SUSPEND_RESUME, 0, nullptr,
            nullptr, &sAnswer, this, MHD_OPTION_LISTEN_SOCKET, mSocket.mSocket.get(), MHD_OPTION_CONNECTION_LIMIT,
            static_cast<unsigned>(mOptions.mLimits.mConnections), MHD_OPTION_CONNECTION_MEMORY_LIMIT,
            mOptions.mLimits.mRequestBytes, MHD_OPTION_NOTIFY_CONNECTION, &sConnectionChanged, this,
            MHD_OPTION_NOTIFY_COMPLETED, &sRequestCompleted, this, MHD_OPTION_END);
        if (mpDaemon == nullptr) {
            throw ZTCSystemCallEx("cannot start the web server on " + mOptions.mListen, errno);
        }
        mWatcher = std::thread([this] { watch(); });
    }

    ~ZTCImplementation() {
        {
            const std::lock_guard lLock(mMutex);
            mIsStopping = true;
            for (Stream& lrStream : mStreams) {
                wake(lrStream);
            }
            mChanged.notify_all();
        }
        // The listening socket stays ours, and is closed with its owner.
        MHD_quiesce_daemon(mpDaemon);
        MHD_stop_daemon(mpDaemon);
        mWatcher.join();
        if (!mSocket.mUnixPath.empty()) {
            unlink(mSocket.mUnixPath.c_str());
        }
    }
    ZTCImplementation(const ZTCImplementation&) = delete;
    ZTCImplementation& operator=(const ZTCImplementation&) = delete;

    unsigned getPort() const { return mSocket.mPort; }

    bool hasStreams() const {
        const std::lock_guard lLock(mMutex);
        return countStreams() != 0;
    }

    void send(const std::string& acrText) {
        const std::lock_guard lLock(mMutex);
        for (Stream& lrStream : mStreams) {
            if (lrStream.mPending.size() + acrText.size() > mOptions.mLimits.mStreamBytes) {
                lrStream.mIsDropped = true;
                hangUp(lrStream.mpConnection);
            } else {
                lrStream.mPending += acrText;
            }
            wake(lrStream);
        }
    }

private:
    /// One connection, from its acceptance to its end.
    struct Connection {
        int mDescriptor = -1;
        ZTCClock::time_point mDeadline;
    };

    /// One reader of the stream.
    struct Stream {
        ZTCImplementation* mpOwner = nullptr;
        MHD_Connection* mpConnection = nullptr;
        std::string mPending;
        bool mIsSuspended = false;
        bool mIsDropped = false;
        std::list<Stream>::iterator mPlace{};
    };

    // ---- called by the HTTP library, on its thread ----

    static void sConnectionChanged(void* apThis, MHD_Connection* apConnection, void**,
                                   MHD_ConnectionNotificationCode aCode) {
        auto& lrThis = *static_cast<ZTCImplementation*>(apThis);
        const std::lock_guard lLock(lrThis.mMutex);
        if (aCode == MHD_CONNECTION_NOTIFY_CLOSED) {
            lrThis.mConnections.erase(apConnection);
            return;
        }
        const MHD_ConnectionInfo* lpInfo = MHD_get_connection_info(apConnection, MHD_CONNECTION_INFO_CONNECTION_FD);
        lrThis.mConnections[apConnection] = {.mDescriptor = lpInfo == nullptr ? -1 : lpInfo->connect_fd,
                                             .mDeadline = ZTCClock::now() + lrThis.mOptions.mLimits.mRequestTime};
        lrThis.mChanged.notify_all();
    }

    static void sRequestCompleted(void* apThis, MHD_Connection* apConnection, void**, MHD_RequestTerminationCode) {
        auto& lrThis = *static_cast<ZTCImplementation*>(apThis);
        lrThis.setDeadline(apConnection, lrThis.mOptions.mLimits.mRequestTime);
    }

    static MHD_Result sAnswer(void* apThis, MHD_Connection* apConnection, const char* apPath, const char* apMethod,
                              const char*, const char*, size_t* apUploadSize, void** appState) {
        auto& lrThis = *static_cast<ZTCImplementation*>(apThis);
        const bool lIsGet = std::strcmp(apMethod, MHD_HTTP_METHOD_GET) == 0;
        if (!lIsGet && std::strcmp(apMethod, MHD_HTTP_METHOD_HEAD) != 0) {
            return lrThis.respond(apConnection, {.mStatus = MHD_HTTP_METHOD_NOT_ALLOWED,
                                                 .mBody = "Only GET and HEAD are served here.\n"});
        }
        // The headers come first, then the request's body, if it has one, then its end.
        if (*appState == nullptr) {
            *appState = apThis;
            return MHD_YES;
        }
        if (*apUploadSize != 0) {
            *apUploadSize = 0;
            return MHD_YES;
        }
        if (lrThis.mSocket.mUnixPath.empty()) {
            const char* lpHost = MHD_lookup_connection_value(apConnection, MHD_HEADER_KIND, MHD_HTTP_HEADER_HOST);
            if (lpHost == nullptr || !isHostAccepted(lpHost, lrThis.mOptions.mHosts)) {
                return lrThis.respond(apConnection,
                                      {.mStatus = MHD_HTTP_FORBIDDEN,
                                       .mBody = "This Host name is not served here: add it to http.hosts.\n"});
            }
        }
        ZTSWebRequest lRequest;
        lRequest.mPath = apPath;
        MHD_get_connection_values(apConnection, MHD_GET_ARGUMENT_KIND, &sAddParameter, &lRequest);
        ZTSWebResponse lResponse;
        try {
            lResponse = lrThis.mHandler(lRequest);
        } catch (const std::exception& lrEx) {
            lResponse = {.mStatus = MHD_HTTP_INTERNAL_SERVER_ERROR, .mBody = std::string(lrEx.what()) + "\n"};
        }
        if (lResponse.mIsStream && lIsGet) {
            return lrThis.openStream(apConnection, lResponse);
        }
        return lrThis.respond(apConnection, lResponse);
    }

    static MHD_Result sAddParameter(void* apRequest, MHD_ValueKind, const char* apName, const char* apValue) {
        static_cast<ZTSWebRequest*>(apRequest)->mParameters.emplace_back(apName, apValue == nullptr ? "" : apValue);
        return MHD_YES;
    }

    static ssize_t sReadStream(void* apStream, std::uint64_t, char* apPlace, size_t aSize) {
        auto& lrStream = *static_cast<Stream*>(apStream);
        const std::lock_guard lLock(lrStream.mpOwner->mMutex);
        if (lrStream.mIsDropped || lrStream.mpOwner->mIsStopping) {
            return MHD_CONTENT_READER_END_OF_STREAM;
        }
        if (lrStream.mPending.empty()) {
            lrStream.mIsSuspended = true;
            MHD_suspend_connection(lrStream.mpConnection);
            return 0;
        }
        const std::size_t lCount = std::min(aSize, lrStream.mPending.size());
        std::copy_n(lrStream.mPending.data(), lCount, apPlace);
        lrStream.mPending.erase(0, lCount);
        return static_cast<ssize_t>(lCount);
    }

    static void sFreeStream(void* apStream) {
        const auto* lpStream = static_cast<Stream*>(apStream);
        ZTCImplementation& lrThis = *lpStream->mpOwner;
        const std::lock_guard lLock(lrThis.mMutex);
        lrThis.mStreams.erase(lpStream->mPlace);
    }

    // ---- the rest ----

    MHD_Result respond(MHD_Connection* apConnection, const ZTSWebResponse& acrResponse) {
        MHD_Response* lpResponse = MHD_create_response_from_buffer(
            acrResponse.mBody.size(), const_cast<char*>(acrResponse.mBody.data()), MHD_RESPMEM_MUST_COPY);
        return queue(apConnection, acrResponse, lpResponse, mOptions.mLimits.mResponseTime);
    }

    MHD_Result openStream(MHD_Connection* apConnection, const ZTSWebResponse& acrResponse) {
        Stream* lpStream = nullptr;
        {
            const std::lock_guard lLock(mMutex);
            dropGoneStreams();  // a page that was loaded again has left the stream that it had
            if (countStreams() < mOptions.mLimits.mStreams) {
                mStreams.emplace_back();
                lpStream = &mStreams.back();
                lpStream->mpOwner = this;
                lpStream->mpConnection = apConnection;
                lpStream->mPending = acrResponse.mBody;
                lpStream->mPlace = std::prev(mStreams.end());
            }
        }
        if (lpStream == nullptr) {
            return respond(apConnection, {.mStatus = MHD_HTTP_SERVICE_UNAVAILABLE,
                                          .mBody = "All " + std::to_string(mOptions.mLimits.mStreams) +
                                                   " streams are taken. Try again later.\n"});
        }
        MHD_Response* lpResponse =
            MHD_create_response_from_callback(MHD_SIZE_UNKNOWN, 4096, &sReadStream, lpStream, &sFreeStream);
        if (lpResponse == nullptr) {
            sFreeStream(lpStream);
            return MHD_NO;
        }
        return queue(apConnection, acrResponse, lpResponse, std::chrono::hours(24 * 365));
    }

    MHD_Result queue(MHD_Connection* apConnection, const ZTSWebResponse& acrResponse, MHD_Response* apResponse,
                     std::chrono::milliseconds aTime) {
        if (apResponse == nullptr) {
            return MHD_NO;
        }
        MHD_add_response_header(apResponse, MHD_HTTP_HEADER_CONTENT_TYPE, acrResponse.mType.c_str());
        MHD_add_response_header(apResponse, MHD_HTTP_HEADER_CACHE_CONTROL, acrResponse.mCacheControl.c_str());
        for (const auto& [lpName, lpValue] : scSecurityHeaders) {
            MHD_add_response_header(apResponse, lpName, lpValue);
        }
        if (acrResponse.mStatus == MHD_HTTP_METHOD_NOT_ALLOWED) {
            MHD_add_response_header(apResponse, MHD_HTTP_HEADER_ALLOW, "GET, HEAD");
        }
        setDeadline(apConnection, aTime);
        const MHD_Result lResult = MHD_queue_response(apConnection, acrResponse.mStatus, apResponse);
        MHD_destroy_response(apResponse);
        return lResult;
    }

    void setDeadline(MHD_Connection* apConnection, std::chrono::milliseconds aTime) {
        const std::lock_guard lLock(mMutex);
        const auto lFound = mConnections.find(apConnection);
        if (lFound != mConnections.end()) {
            lFound->second.mDeadline = ZTCClock::now() + aTime;
        }
    }

    /// With mMutex held: the descriptor is open as long as the connection is in the table.
    void hangUp(MHD_Connection* apConnection) {
        const auto lFound = mConnections.find(apConnection);
        if (lFound != mConnections.end()) {
            shutdown(lFound->second.mDescriptor, SHUT_RDWR);
        }
    }

    /// With mMutex held. A place is free as soon as its reader is known to have gone.
    std::size_t countStreams() const {
        return static_cast<std::size_t>(
            std::ranges::count_if(mStreams, [](const Stream& acrStream) { return !acrStream.mIsDropped; }));
    }

    /// With mMutex held. The library does not look at a stream's connection while there is nothing to send.
    void dropGoneStreams() {
        for (Stream& lrStream : mStreams) {
            const auto lFound = mConnections.find(lrStream.mpConnection);
            pollfd lFd{.fd = lFound == mConnections.end() ? -1 : lFound->second.mDescriptor,
                       .events = POLLRDHUP,
                       .revents = 0};
            if (!lrStream.mIsDropped && poll(&lFd, 1, 0) > 0) {
                lrStream.mIsDropped = true;
                wake(lrStream);
            }
        }
    }

    /// With mMutex held.
    static void wake(Stream& arStream) {
        if (arStream.mIsSuspended) {
            arStream.mIsSuspended = false;
            MHD_resume_connection(arStream.mpConnection);
        }
    }

    /// Ends connections whose time is over: the library itself only knows how long one was silent, and a client that
    /// sends a byte a second never is.
    void watch() {
        std::unique_lock lLock(mMutex);
        ZTCClock::time_point lNextBeat = ZTCClock::now() + scStreamBeat;
        while (!mIsStopping) {
            if (mConnections.empty()) {
                mChanged.wait(lLock);
            } else {
                mChanged.wait_for(lLock, scWatchPeriod);
            }
            const auto lNow = ZTCClock::now();
            for (const auto& [lpConnection, lrConnection] : mConnections) {
                if (lNow >= lrConnection.mDeadline) {
                    shutdown(lrConnection.mDescriptor, SHUT_RDWR);
                }
            }
            dropGoneStreams();
            if (lNow >= lNextBeat) {
                lNextBeat = lNow + scStreamBeat;
                lLock.unlock();
                send(": still here\n\n");
                lLock.lock();
            }
        }
    }

    const ZTSWebOptions mOptions;
    const Handler mHandler;
    ZTSListenSocket mSocket;
    MHD_Daemon* mpDaemon = nullptr;
    std::thread mWatcher;

    mutable std::mutex mMutex;
    std::condition_variable mChanged;
    bool mIsStopping = false;                            // under mMutex
    std::map<MHD_Connection*, Connection> mConnections;  // under mMutex
    std::list<Stream> mStreams;                          // under mMutex
};

ZTCWebServer::ZTCWebServer(const ZTSWebOptions& acrOptions, Handler aHandler)
    : mpImplementation(std::make_unique<ZTCImplementation>(acrOptions, std::move(aHandler))) {}

ZTCWebServer::~ZTCWebServer() = default;

void ZTCWebServer::publish(const std::string& acrEvent, const std::string& acrData) {
    mpImplementation->send("event: " + acrEvent + "\ndata: " + acrData + "\n\n");
}

bool ZTCWebServer::hasStreams() const {
    return mpImplementation->hasStreams();
}

unsigned ZTCWebServer::getPort() const {
    return mpImplementation->getPort();
}
