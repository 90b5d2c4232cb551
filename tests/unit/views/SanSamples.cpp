#include "tests/unit/views/SanSamples.h"

#include <algorithm>
#include <array>
#include <cstdio>

static ZTSFcName sName(const char* apBegin, unsigned aGroup, unsigned aNumber) {
    std::array<char, 32> lText;
    std::snprintf(lText.data(), lText.size(), "%s:00:00:%02x:%02x", apBegin, aGroup, aNumber);
    return ZTSFcName::fromText(lText.data());
}

static void sAddHost(ZTSTopology& arSan, const ZTSSanShape& acrShape, unsigned aHost) {
    const unsigned lNumber = acrShape.mFirstHost + aHost;
    const std::string lHost = "host" + std::to_string(lNumber);
    arSan.mInitiators.push_back({.mHost = lHost,
                                 .mWwpn = sName("10:00:00:00", 0, lNumber),
                                 .mWwnn = sName("20:00:00:00", 0, lNumber),
                                 .mState = "Online",
                                 .mSpeed = "16 Gbit",
                                 .mSymbolicName = {},
                                 .mModel = {},
                                 .mFcId = 0x010000 + lNumber});
    for (unsigned lPort = 0; lPort < acrShape.mPortsOfAHost; ++lPort) {
        arSan.mRemotePorts.push_back({.mName = "rport-" + std::to_string(lNumber) + ":0-" + std::to_string(lPort),
                                      .mHost = lHost,
                                      .mWwpn = sName("50:06:01:60", acrShape.mIsOneFabric ? 0 : aHost, lPort),
                                      .mWwnn = sName("50:06:01:00", 0, 0),
                                      .mState = "Online",
                                      .mRoles = "FCP Target",
                                      .mFcId = 0x020000 + lPort,
                                      .mDevLossSeconds = 60});
    }
}

static void sAddLun(ZTSTopology& arSan, const ZTSSanShape& acrShape, unsigned aLun) {
    const std::string lLun = std::to_string(aLun);
    const std::string lDevice = "dm-" + lLun;
    std::array<char, 16> lWwid;
    std::snprintf(lWwid.data(), lWwid.size(), "naa.%03u", aLun);
    ZTSTopologyMapping& lrMapping = arSan.mMappings[lDevice];
    lrMapping = {.mDevice = lDevice, .mName = "mpath" + lLun, .mUuid = "mpath-" + lLun, .mSlaves = {}};
    arSan.mMounts[lDevice] = {"/data/" + lLun};
    for (unsigned lHost = acrShape.mFirstHost; lHost < acrShape.mFirstHost + acrShape.mHosts; ++lHost) {
        for (unsigned lPort = 0; lPort < acrShape.mPortsOfAHost; ++lPort) {
            const std::string lWay = std::to_string(lHost) + ":0:" + std::to_string(lPort);
            const std::string lDisk = "sd" + lLun + "-" + std::to_string(lHost) + "-" + std::to_string(lPort);
            arSan.mPaths.push_back({.mAddress = lWay + ":" + lLun,
                                    .mHost = "host" + std::to_string(lHost),
                                    .mRemotePort = "rport-" + std::to_string(lHost) + ":0-" + std::to_string(lPort),
                                    .mLun = aLun,
                                    .mVendor = "ACME",
                                    .mModel = "LUNBOX",
                                    .mWwid = lWwid.data(),
                                    .mState = "running",
                                    .mQueueDepth = 32,
                                    .mDisk = lDisk,
                                    .mHolders = {lDevice}});
            lrMapping.mSlaves.push_back(lDisk);
        }
    }
}

ZTSTopology makeSan(const ZTSSanShape& acrShape) {
    ZTSTopology lSan;
    for (unsigned lHost = 0; lHost < acrShape.mHosts; ++lHost) {
        sAddHost(lSan, acrShape, lHost);
    }
    for (unsigned lLun = 0; lLun < acrShape.mLuns; ++lLun) {
        sAddLun(lSan, acrShape, lLun);
    }
    return lSan;
}

static ZTSTopologyRemotePort& sFind(ZTSTopology& arTopology, const std::string& acrName) {
    return *std::ranges::find(arTopology.mRemotePorts, acrName, &ZTSTopologyRemotePort::mName);
}

void losePort(ZTSTopology& arTopology, const std::string& acrName) {
    sFind(arTopology, acrName).mState = "Blocked";
    for (ZTSTopologyPath& lrPath : arTopology.mPaths) {
        if (lrPath.mRemotePort == acrName) {
            lrPath.mState = "blocked";
        }
    }
}

void removePort(ZTSTopology& arTopology, const std::string& acrName) {
    sFind(arTopology, acrName).mState = "Not Present";
    sFind(arTopology, acrName).mRoles = "unknown";
    std::erase_if(arTopology.mPaths,
                  [&acrName](const ZTSTopologyPath& acrPath) { return acrPath.mRemotePort == acrName; });
}
