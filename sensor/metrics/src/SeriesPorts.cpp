#include "sensor/metrics/include/SeriesPorts.h"

#include "sensor/client/include/ClientErrors.h"

ZTCSeriesPorts::ZTCSeriesPorts(std::string_view aStored) {
    while (!aStored.empty()) {
        const std::size_t lEnd = std::min(aStored.find(' '), aStored.size());
        try {
            const ZTSFcName lPort = ZTSFcName::fromText(aStored.substr(0, lEnd));
            if (mPorts.insert(lPort.mBytes).second) {
                mOrder.push_back(lPort);
            }
        } catch (const ZTCBadInputEx&) {
            // Not written by this program: nothing is lost with it.
        }
        aStored.remove_prefix(std::min(lEnd + 1, aStored.size()));
    }
}

bool ZTCSeriesPorts::extend(std::span<const ZTSTotal> aTotals, std::size_t aLimit) {
    std::set<std::array<std::uint8_t, 8>> lNew;
    for (const ZTSTotal& lrTotal : aTotals) {
        if (lrTotal.mRemotePort && !has(lrTotal.mRemotePort->mWwpn)) {
            lNew.insert(lrTotal.mRemotePort->mWwpn.mBytes);
        }
    }
    const std::size_t lBefore = mOrder.size();
    for (const auto& lrBytes : lNew) {
        if (mOrder.size() >= aLimit) {
            break;
        }
        mPorts.insert(lrBytes);
        mOrder.push_back({.mBytes = lrBytes});
    }
    return mOrder.size() != lBefore;
}

std::string ZTCSeriesPorts::toText() const {
    std::string lText;
    for (const ZTSFcName& lrPort : mOrder) {
        lText += (lText.empty() ? "" : " ") + lrPort.toText();
    }
    return lText;
}
