/// Turns one command of the sensor into one response.
#ifndef TAVIK_INCLUDE_TAVIKPROTOCOLHANDLER_H
#define TAVIK_INCLUDE_TAVIKPROTOCOLHANDLER_H

#include <atomic>

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "sensor/agentcommon/include/SensorAgentProtocol.h"

class ZTCTavikSystem;

/// The system object for the library's callbacks, which get no context that leads to it. Set by the protocol handler's
/// constructor, before anything is registered.
extern ZTCTavikSystem* gpTavikSystem;

/// Whether events are collected: the callbacks drop every event while it is false. Read without a lock, so atomic; an
/// event that races a stop command may be counted on either side of it.
extern std::atomic<bool> mDoScopeCollection;

/// Seconds of a collection period. The command that sets one neither checks nor stores it.
inline constexpr unsigned int ZT_COLLECTION_PERIOD_MIN = 60;
inline constexpr unsigned int ZT_COLLECTION_PERIOD_MAX = 65535;
inline constexpr unsigned int ZT_DEFAULT_COLLECTION_PERIOD = 3600;

/// Bytes a response with record lists is meant to stay below; not applied.
inline constexpr unsigned int ZT_DEFAULT_RESP_LIST_SIZE = 100 * 1024 * 1024;

/// Used by the command thread alone. A handler leaves a response in its second argument, for a failed command too; the
/// exceptions of streams and containers go on to the caller, without a response.
class ZTCTavikProtocolHandler {
public:
    /// Null ends the process. The system is not owned and outlives the handler.
    explicit ZTCTavikProtocolHandler(ZTCTavikSystem* apSystem);
    virtual ~ZTCTavikProtocolHandler() = default;

    /// Dispatches on the request's command code. An unknown code ends the process: the one sensor is trusted.
    virtual void process(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse);

    /// Sets the per-record limit, switches collection on and registers every kind for every initiator, once.
    virtual void handleStartScopeCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse);

    /// Hands over all record lists and leaves new, empty ones.
    virtual void handleGetScopeDataCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse);

    /// Switches collection off. Registrations stay.
    virtual void handleStopCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse);

    /// Takes all registrations back. No command leads here.
    virtual void handleUnregisterEvents();

    /// Adds the targets of the request.
    virtual void handleRegisterTargetsCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                              ZTCPointer<ZTCBuffer>& arResponse);

    /// Refuses a period of zero and accepts any other. Stores nothing.
    virtual void handleSetCollectionPeriodCommand(const ZTCPointer<ZTCBuffer>& acrRequest,
                                                  ZTCPointer<ZTCBuffer>& arResponse);

    /// Closes the adapters' library, leaves the response and throws ZTCShutDownEx.
    virtual void handleShutDownCommand(const ZTCPointer<ZTCBuffer>& acrRequest, ZTCPointer<ZTCBuffer>& arResponse);

    virtual void createSuccessResponse(ZTCPointer<ZTCBuffer>& arResponse);
    virtual void createFailedResponse(ZTESensorAgentProtocolStatus aStatus, ZTCPointer<ZTCBuffer>& arResponse);

private:
    ZTCTavikSystem* mpTavikSystem;
    bool mEventsRegistered;
};

#endif
