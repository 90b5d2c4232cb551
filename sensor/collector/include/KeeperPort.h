/// The collector's end of the link to the keeper. Messages wait here until the link takes them. One thread.
#ifndef SENSOR_COLLECTOR_INCLUDE_KEEPERPORT_H
#define SENSOR_COLLECTOR_INCLUDE_KEEPERPORT_H

#include <chrono>
#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "sensor/link/include/Link.h"

class ZTCKeeperPort {
public:
    using ZTCTime = std::chrono::steady_clock::time_point;

    explicit ZTCKeeperPort(ZTCLink aLink) : mLink(std::move(aLink)) {}

    /// To be polled for these events.
    int getDescriptor() const { return mLink.getDescriptor(); }
    short getEvents() const;
    /// The keeper has ended, or nothing can be received from it any more.
    bool isGone() const { return mIsGone; }

    /// Hands every message that has come to the function. Returns a line for the log for each that is no message.
    std::vector<std::string> receive(const std::function<void(ZTSLinkMessage)>& acrHandle);

    void send(ZTELinkMessageType aType, std::uint64_t aStart, const std::string& acrText = {});
    /// A text that is the same as the last one is not sent again.
    void sendText(const std::string& acrText);
    /// One Look waits at most.
    void sendLook(ZTCTime aNow);
    /// A Look is due at this time, whatever happens.
    ZTCTime getNextLook() const { return mLastLook + gcLookPeriod; }
    /// Sends what the link takes.
    void flush();
    bool isFlushed() const { return mOutgoing.empty(); }

private:
    ZTCLink mLink;
    std::deque<ZTSLinkMessage> mOutgoing;
    ZTCTime mLastLook{};
    std::string mToldText;
    bool mIsGone = false;
};

#endif
