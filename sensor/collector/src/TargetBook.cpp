#include "sensor/collector/include/TargetBook.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <tuple>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/TargetText.h"

bool ZTCTargetBook::ZTSOrder::operator()(const ZTSTargetPort& acrLeft, const ZTSTargetPort& acrRight) const {
    return std::tie(acrLeft.mFcId, acrLeft.mPortName.mBytes, acrLeft.mNodeName.mBytes) <
           std::tie(acrRight.mFcId, acrRight.mPortName.mBytes, acrRight.mNodeName.mBytes);
}

void ZTCTargetBook::offer(std::span<const ZTSTargetPort> aTargets) {
    for (const ZTSTargetPort& lrTarget : aTargets) {
        if (mKnown.insert(lrTarget).second) {
            mTargets.push_back(lrTarget);
        }
    }
}

std::vector<ZTSTargetPort> ZTCTargetBook::getNext(std::size_t aMost) const {
    const std::size_t lCount = std::min(aMost, mTargets.size() - mRegistered);
    const auto lBegin = mTargets.begin() + static_cast<std::ptrdiff_t>(mRegistered);
    return {lBegin, lBegin + static_cast<std::ptrdiff_t>(lCount)};
}

void ZTCTargetBook::noteRegistered(std::size_t aCount) {
    mRegistered = std::min(mTargets.size(), mRegistered + aCount);
}

std::vector<ZTSTargetPort> toTargets(const ZTSTopology& acrPorts) {
    std::vector<ZTSTargetPort> lTargets;
    for (const ZTSTopologyRemotePort& lrPort : acrPorts.mRemotePorts) {
        if (lrPort.mWwnn && lrPort.mWwpn && lrPort.mFcId) {
            lTargets.push_back({.mNodeName = *lrPort.mWwnn, .mPortName = *lrPort.mWwpn, .mFcId = *lrPort.mFcId});
        }
    }
    return lTargets;
}

std::vector<ZTSTargetPort> readTargetFile(const std::string& acrPath) {
    if (acrPath.empty()) {
        return {};
    }
    std::ifstream lFile(acrPath);
    if (!lFile) {
        throw ZTCBadInputEx(acrPath + ": cannot be opened: " + std::strerror(errno));
    }
    return readTargets(lFile, acrPath);
}
