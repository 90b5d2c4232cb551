#include "sensor/topology/include/Topology.h"

#include <algorithm>
#include <set>

const ZTSTopologyInitiator* ZTSTopology::findInitiator(const std::string& acrHost) const {
    const auto lFound = std::ranges::find(mInitiators, acrHost, &ZTSTopologyInitiator::mHost);
    return lFound == mInitiators.end() ? nullptr : &*lFound;
}

const ZTSTopologyRemotePort* ZTSTopology::findRemotePort(const std::string& acrName) const {
    const auto lFound = std::ranges::find(mRemotePorts, acrName, &ZTSTopologyRemotePort::mName);
    return lFound == mRemotePorts.end() ? nullptr : &*lFound;
}

const ZTSTopologyMapping* ZTSTopology::findMultipath(const ZTSTopologyPath& acrPath) const {
    for (const std::string& lrHolder : acrPath.mHolders) {
        const auto lFound = mMappings.find(lrHolder);
        if (lFound != mMappings.end() && lFound->second.isMultipath()) {
            return &lFound->second;
        }
    }
    return nullptr;
}

std::vector<std::string> ZTSTopology::findMounts(const ZTSTopologyPath& acrPath) const {
    std::set<std::string> lMounts;
    const auto lAdd = [&](const std::string& acrDevice) {
        const auto lFound = mMounts.find(acrDevice);
        if (lFound != mMounts.end()) {
            lMounts.insert(lFound->second.begin(), lFound->second.end());
        }
    };
    if (acrPath.mDisk) {
        lAdd(*acrPath.mDisk);
    }
    std::ranges::for_each(acrPath.mHolders, lAdd);
    return {lMounts.begin(), lMounts.end()};
}
