#include "sensor/topology/include/TopologyScan.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>
#include <deque>
#include <functional>
#include <set>

#include "sensor/topology/src/MountTable.h"
#include "sensor/topology/src/SysfsFiles.h"

/// Most devices that are followed from one disk: a tree may lead in a circle.
static constexpr std::size_t scMostHolders = 256;

static std::string sReadLink(const std::string& acrPath) {
    std::array<char, PATH_MAX> lTarget;
    const ssize_t lCount = readlink(acrPath.c_str(), lTarget.data(), lTarget.size());
    return lCount <= 0 ? std::string() : std::string(lTarget.data(), static_cast<std::size_t>(lCount));
}

/// The component of a path that begins so, or an empty text.
static std::string sComponent(const std::string& acrPath, const std::string& acrBegin) {
    const std::size_t lStart = acrPath.find("/" + acrBegin);
    if (lStart == std::string::npos) {
        return {};
    }
    return acrPath.substr(lStart + 1, acrPath.find('/', lStart + 1) - lStart - 1);
}

// ---- attributes: collected first, read in one go, then each put into its place ----

/// What is to be read, and where each text goes.
class ZTCWishes {
public:
    using Use = std::function<void(const std::string& acrText)>;

    void add(std::string aPath, Use aUse) {
        mPaths.push_back(std::move(aPath));
        mUses.push_back(std::move(aUse));
    }

    void addText(std::string aPath, std::optional<std::string>& arPlace) {
        add(std::move(aPath), [&arPlace](const std::string& acrText) {
            if (!acrText.empty()) {
                arPlace = acrText;
            }
        });
    }

    /// A world wide name. All ones, and zero, are what the kernel shows before the port has a name.
    void addName(std::string aPath, std::optional<ZTSFcName>& arPlace) {
        add(std::move(aPath), [&arPlace](const std::string& acrText) {
            const auto lValue = parseAttribute<std::uint64_t>(acrText, 16);
            if (!lValue || *lValue == 0 || *lValue == UINT64_MAX) {
                return;
            }
            ZTSFcName lName;
            for (std::size_t i = 0; i < lName.mBytes.size(); ++i) {
                lName.mBytes[i] = static_cast<std::uint8_t>(*lValue >> (8 * (lName.mBytes.size() - 1 - i)));
            }
            arPlace = lName;
        });
    }

    /// An FC id. 0 is what the kernel shows while there is none.
    void addFcId(std::string aPath, std::optional<std::uint32_t>& arPlace) {
        add(std::move(aPath), [&arPlace](const std::string& acrText) {
            const auto lValue = parseAttribute<std::uint32_t>(acrText, 16);
            if (lValue && *lValue != 0 && *lValue <= 0xFFFFFFU) {
                arPlace = lValue;
            }
        });
    }

    void addCount(std::string aPath, std::optional<std::uint32_t>& arPlace) {
        add(std::move(aPath),
            [&arPlace](const std::string& acrText) { arPlace = parseAttribute<std::uint32_t>(acrText); });
    }

    void fulfil(ZTCPatientReader& arReader) {
        const std::vector<std::optional<std::string>> lTexts = arReader.readAll(std::move(mPaths));
        for (std::size_t i = 0; i < lTexts.size(); ++i) {
            if (lTexts[i]) {
                mUses[i](*lTexts[i]);
            }
        }
    }

private:
    std::vector<std::string> mPaths;
    std::vector<Use> mUses;
};

static void sFindInitiators(const std::string& acrSysfs, ZTSTopology& arTopology, ZTCWishes& arWishes) {
    const std::string lClass = acrSysfs + "/class/fc_host/";
    for (const std::string& lrHost : listDirectory(lClass)) {
        arTopology.mInitiators.push_back({.mHost = lrHost});
    }
    for (ZTSTopologyInitiator& lrPort : arTopology.mInitiators) {
        const std::string lPath = lClass + lrPort.mHost + "/";
        arWishes.addName(lPath + "port_name", lrPort.mWwpn);
        arWishes.addName(lPath + "node_name", lrPort.mWwnn);
        arWishes.addText(lPath + "port_state", lrPort.mState);
        arWishes.addText(lPath + "speed", lrPort.mSpeed);
        arWishes.addText(lPath + "symbolic_name", lrPort.mSymbolicName);
        arWishes.addName(lPath + "fabric_name", lrPort.mFabric);
        arWishes.addText(lPath + "model", lrPort.mModel);
        arWishes.addFcId(lPath + "port_id", lrPort.mFcId);
    }
}

static void sFindRemotePorts(const std::string& acrSysfs, ZTSTopology& arTopology, ZTCWishes& arWishes) {
    const std::string lClass = acrSysfs + "/class/fc_remote_ports/";
    for (const std::string& lrName : listDirectory(lClass)) {
        // "rport-HOST:CHANNEL-NUMBER"
        const std::size_t lStart = lrName.find('-') + 1;
        arTopology.mRemotePorts.push_back(
            {.mName = lrName, .mHost = "host" + lrName.substr(lStart, lrName.find(':') - lStart)});
    }
    for (ZTSTopologyRemotePort& lrPort : arTopology.mRemotePorts) {
        const std::string lPath = lClass + lrPort.mName + "/";
        arWishes.addName(lPath + "port_name", lrPort.mWwpn);
        arWishes.addName(lPath + "node_name", lrPort.mWwnn);
        arWishes.addText(lPath + "port_state", lrPort.mState);
        arWishes.addText(lPath + "roles", lrPort.mRoles);
        arWishes.addFcId(lPath + "port_id", lrPort.mFcId);
        arWishes.addCount(lPath + "dev_loss_tmo", lrPort.mDevLossSeconds);
    }
}

static void sFindPaths(const std::string& acrSysfs, ZTSTopology& arTopology, ZTCWishes& arWishes) {
    const std::string lClass = acrSysfs + "/class/scsi_device/";
    for (const std::string& lrAddress : listDirectory(lClass)) {
        const std::string lRemotePort = sComponent(sReadLink(lClass + lrAddress), "rport-");
        const std::string lLun = lrAddress.substr(lrAddress.rfind(':') + 1);
        const auto lNumber = parseAttribute<std::uint64_t>(lLun);
        if (lRemotePort.empty() || !lNumber) {
            continue;  // not behind a remote port
        }
        arTopology.mPaths.push_back({.mAddress = lrAddress,
                                     .mHost = "host" + lrAddress.substr(0, lrAddress.find(':')),
                                     .mRemotePort = lRemotePort,
                                     .mLun = *lNumber});
    }
    for (ZTSTopologyPath& lrPath : arTopology.mPaths) {
        const std::string lDevice = lClass + lrPath.mAddress + "/device/";
        arWishes.addText(lDevice + "vendor", lrPath.mVendor);
        arWishes.addText(lDevice + "model", lrPath.mModel);
        arWishes.addText(lDevice + "wwid", lrPath.mWwid);
        arWishes.addText(lDevice + "state", lrPath.mState);
        arWishes.addCount(lDevice + "queue_depth", lrPath.mQueueDepth);
        const std::vector<std::string> lDisks = listDirectory(lDevice + "block");
        if (!lDisks.empty()) {
            lrPath.mDisk = lDisks.front();
        }
    }
}

/// What is built on each block device: its holders and its partitions.
class ZTCHolders {
public:
    explicit ZTCHolders(const std::string& acrSysfs) : mBlock(acrSysfs + "/class/block/") {
        for (std::string& lrDevice : listDirectory(mBlock)) {
            mDevices.insert(std::move(lrDevice));
        }
    }

    /// Directly or not, nearest first, each once.
    std::vector<std::string> findAll(const std::string& acrDisk) {
        std::vector<std::string> lAll;
        std::set<std::string> lSeen{acrDisk};
        std::deque<std::string> lOpen{acrDisk};
        while (!lOpen.empty() && lAll.size() < scMostHolders) {
            for (const std::string& lrHolder : findDirect(lOpen.front())) {
                if (lSeen.insert(lrHolder).second) {
                    lAll.push_back(lrHolder);
                    lOpen.push_back(lrHolder);
                }
            }
            lOpen.pop_front();
        }
        return lAll;
    }

private:
    const std::vector<std::string>& findDirect(const std::string& acrDevice) {
        const auto [lPlace, lIsNew] = mDirect.try_emplace(acrDevice);
        if (lIsNew) {
            lPlace->second = listDirectory(mBlock + acrDevice + "/holders");
            // A partition has its disk's name in front: "sdc" and "sdc1", "nvme0n1" and "nvme0n1p1".
            for (auto lOther = mDevices.upper_bound(acrDevice);
                 lOther != mDevices.end() && lOther->starts_with(acrDevice); ++lOther) {
                struct stat lStatus {};
                if (stat((mBlock + acrDevice + "/" + *lOther).c_str(), &lStatus) == 0) {
                    lPlace->second.push_back(*lOther);
                }
            }
        }
        return lPlace->second;
    }

    std::string mBlock;
    std::set<std::string> mDevices;
    std::map<std::string, std::vector<std::string>> mDirect;
};

static void sFindMappings(const std::string& acrSysfs, ZTSTopology& arTopology, ZTCWishes& arWishes) {
    ZTCHolders lHolders(acrSysfs);
    std::set<std::string> lMapped;
    for (ZTSTopologyPath& lrPath : arTopology.mPaths) {
        if (lrPath.mDisk) {
            lrPath.mHolders = lHolders.findAll(*lrPath.mDisk);
            lMapped.insert(lrPath.mHolders.begin(), lrPath.mHolders.end());
        }
    }
    for (const std::string& lrDevice : lMapped) {
        if (!lrDevice.starts_with("dm-")) {
            continue;
        }
        const std::string lPath = acrSysfs + "/class/block/" + lrDevice;
        ZTSTopologyMapping& lrMapping = arTopology.mMappings[lrDevice];
        lrMapping.mDevice = lrDevice;
        lrMapping.mSlaves = listDirectory(lPath + "/slaves");
        arWishes.addText(lPath + "/dm/name", lrMapping.mName);
        arWishes.addText(lPath + "/dm/uuid", lrMapping.mUuid);
    }
}

ZTSTopology scanTopology(const ZTSTopologyRoots& acrRoots, ZTCPatientReader& arReader) {
    ZTSTopology lTopology;
    ZTCWishes lWishes;
    sFindInitiators(acrRoots.mSysfs, lTopology, lWishes);
    sFindRemotePorts(acrRoots.mSysfs, lTopology, lWishes);
    sFindPaths(acrRoots.mSysfs, lTopology, lWishes);
    sFindMappings(acrRoots.mSysfs, lTopology, lWishes);
    lWishes.fulfil(arReader);

    // mountinfo names devices by number: look the numbers up of those that belong to a path.
    std::map<std::string, std::string> lDeviceOfNumber;
    ZTCWishes lNumbers;
    std::set<std::string> lDevices;
    for (const ZTSTopologyPath& lrPath : lTopology.mPaths) {
        if (lrPath.mDisk) {
            lDevices.insert(*lrPath.mDisk);
            lDevices.insert(lrPath.mHolders.begin(), lrPath.mHolders.end());
        }
    }
    for (const std::string& lrDevice : lDevices) {
        lNumbers.add(
            acrRoots.mSysfs + "/class/block/" + lrDevice + "/dev",
            [&lDeviceOfNumber, &lrDevice](const std::string& acrText) { lDeviceOfNumber[acrText] = lrDevice; });
    }
    lNumbers.fulfil(arReader);
    lTopology.mMounts = readMounts(acrRoots.mProcfs + "/mountinfo", acrRoots.mSwaps, lDeviceOfNumber);
    lTopology.mBlocked = arReader.getBlockedPaths();
    return lTopology;
}

ZTSTopology scanPorts(const std::string& acrSysfs, ZTCPatientReader& arReader) {
    ZTSTopology lTopology;
    ZTCWishes lWishes;
    sFindInitiators(acrSysfs, lTopology, lWishes);
    sFindRemotePorts(acrSysfs, lTopology, lWishes);
    lWishes.fulfil(arReader);
    lTopology.mBlocked = arReader.getBlockedPaths();
    return lTopology;
}
