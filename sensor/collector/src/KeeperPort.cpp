#include "sensor/collector/include/KeeperPort.h"

#include <poll.h>

#include <algorithm>

#include "sensor/client/include/ClientErrors.h"

short ZTCKeeperPort::getEvents() const {
    return mOutgoing.empty() ? POLLIN : POLLIN | POLLOUT;
}

std::vector<std::string> ZTCKeeperPort::receive(const std::function<void(ZTSLinkMessage)>& acrHandle) {
    std::vector<std::string> lLines;
    while (!mIsGone) {
        ZTSLinkMessage lMessage;
        try {
            const ZTELinkResult lResult = mLink.receive(lMessage);
            if (lResult != ZTLR_Done) {
                mIsGone = lResult == ZTLR_PeerGone;
                return lLines;
            }
            acrHandle(std::move(lMessage));
        } catch (const ZTCSystemCallEx& lrEx) {
            // The next try could fail for ever. A new collector gets a new link, and is told everything anew.
            lLines.emplace_back(lrEx.what());
            mIsGone = true;
        } catch (const ZTCClientEx& lrEx) {
            lLines.push_back(std::string("a message of the keeper is passed over: ") + lrEx.what());
        }
    }
    return lLines;
}

void ZTCKeeperPort::send(ZTELinkMessageType aType, std::uint64_t aStart, const std::string& acrText) {
    ZTSLinkMessage lMessage;
    lMessage.mType = aType;
    lMessage.mStart = aStart;
    lMessage.mText = acrText;
    mOutgoing.push_back(std::move(lMessage));
}

void ZTCKeeperPort::sendText(const std::string& acrText) {
    if (acrText != mToldText) {
        mToldText = acrText;
        send(ZTLM_Text, 0, acrText);
    }
}

void ZTCKeeperPort::sendLook(ZTCTime aNow) {
    mLastLook = aNow;
    const auto lIsLook = [](const ZTSLinkMessage& acrMessage) { return acrMessage.mType == ZTLM_Look; };
    if (std::ranges::none_of(mOutgoing, lIsLook)) {
        send(ZTLM_Look, 0);
    }
}

void ZTCKeeperPort::flush() {
    while (!mOutgoing.empty()) {
        const ZTELinkResult lResult = mLink.send(mOutgoing.front());
        if (lResult == ZTLR_PeerGone) {
            mIsGone = true;
        }
        if (lResult != ZTLR_Done) {
            return;
        }
        mOutgoing.pop_front();
    }
}
