#include "sensor/store/src/ThingBody.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>

#include "sensor/client/include/ClientErrors.h"

/// The numbers are those in the database: new ones go to the end.
enum ZTEAttribute : std::uint8_t {
    ZTTA_Host,
    ZTTA_Wwpn,
    ZTTA_Wwnn,
    ZTTA_State,
    ZTTA_Speed,
    ZTTA_SymbolicName,
    ZTTA_Model,
    ZTTA_FcId,
    ZTTA_Roles,
    ZTTA_DevLoss,
    ZTTA_RemotePort,
    ZTTA_Lun,
    ZTTA_Vendor,
    ZTTA_Wwid,
    ZTTA_QueueDepth,
    ZTTA_Disk,
    ZTTA_Holders,
    ZTTA_Name,
    ZTTA_Uuid,
    ZTTA_Slaves,
    ZTTA_MountPoints,
    ZTTA_Fabric,
    ZTTA_Count
};

struct ZTSAttributeFacts {
    const char* mpName;
    bool mIsFromFile;
};

static constexpr std::array<ZTSAttributeFacts, ZTTA_Count> scAttributes = {{
    {"host", false},        {"wwpn", true},     {"wwnn", true},   {"state", true}, {"speed", true},
    {"symbolicName", true}, {"model", true},    {"fcId", true},   {"roles", true}, {"devLossSeconds", true},
    {"remotePort", false},  {"lun", false},     {"vendor", true}, {"wwid", true},  {"queueDepth", true},
    {"disk", false},        {"holders", false}, {"name", true},   {"uuid", true},  {"slaves", false},
    {"mountPoints", true},  {"fabric", true},
}};

const char* getTopologyThingName(ZTETopologyThing aThing) {
    static constexpr std::array<const char*, ZTTT_Count> scNames = {"initiator", "remote-port", "path", "mapping",
                                                                    "mount"};
    return aThing < scNames.size() ? scNames[aThing] : "unknown";
}

std::string getAttributeName(std::uint64_t aAttribute) {
    return aAttribute < scAttributes.size() ? scAttributes[aAttribute].mpName : "";
}

bool isFromFile(std::uint64_t aAttribute) {
    return aAttribute < scAttributes.size() && scAttributes[aAttribute].mIsFromFile;
}

// ---- values as texts ----

static std::string sToText(const std::string& acrText) {
    return acrText;
}

static std::string sToText(std::uint64_t aNumber) {
    return std::to_string(aNumber);
}

static std::string sToText(const ZTSFcName& acrName) {
    return acrName.toText();
}

static std::string sToText(const std::vector<std::string>& acrList) {
    std::string lText;
    for (const std::string& lrMember : acrList) {
        lText += (lText.empty() ? "" : "\n") + lrMember;
    }
    return lText;
}

static std::string sFcIdText(std::uint32_t aFcId) {
    std::array<char, 16> lText;
    std::snprintf(lText.data(), lText.size(), "%06x", aFcId);
    return lText.data();
}

static void sRead(const std::string& acrText, std::string& arPlace) {
    arPlace = acrText;
}

static void sRead(const std::string& acrText, std::optional<std::string>& arPlace) {
    arPlace = acrText;
}

static void sRead(const std::string& acrText, std::vector<std::string>& arPlace) {
    for (std::size_t lBegin = 0; lBegin <= acrText.size();) {
        const std::size_t lEnd = std::min(acrText.find('\n', lBegin), acrText.size());
        arPlace.push_back(acrText.substr(lBegin, lEnd - lBegin));
        lBegin = lEnd + 1;
    }
}

static void sRead(const std::string& acrText, std::optional<ZTSFcName>& arPlace) {
    try {
        arPlace = ZTSFcName::fromText(acrText);
    } catch (const ZTCBadInputEx& lrEx) {
        throw ZTCStoreDamagedEx(std::string("history: a stored name of a port: ") + lrEx.what());
    }
}

template <std::unsigned_integral Number>
static Number sNumber(const std::string& acrText, int aBase = 10) {
    Number lNumber{};
    const auto [lpEnd, lError] = std::from_chars(acrText.data(), acrText.data() + acrText.size(), lNumber, aBase);
    if (lError != std::errc() || lpEnd != acrText.data() + acrText.size()) {
        throw ZTCStoreDamagedEx("history: a stored attribute is not a number: " + acrText);
    }
    return lNumber;
}

static void sRead(const std::string& acrText, std::uint64_t& arPlace) {
    arPlace = sNumber<std::uint64_t>(acrText);
}

static void sRead(const std::string& acrText, std::optional<std::uint32_t>& arPlace) {
    arPlace = sNumber<std::uint32_t>(acrText);
}

// ---- bytes ----

/// Collects the known attributes of one thing.
class ZTCBodyWriter {
public:
    template <typename T>
    ZTCBodyWriter& add(ZTEAttribute aAttribute, const T& acrValue) {
        return addText(aAttribute, sToText(acrValue));
    }
    template <typename T>
    ZTCBodyWriter& add(ZTEAttribute aAttribute, const std::optional<T>& acrValue) {
        return acrValue ? add(aAttribute, *acrValue) : *this;
    }
    /// Left out where there are none.
    ZTCBodyWriter& add(ZTEAttribute aAttribute, const std::vector<std::string>& acrList) {
        return acrList.empty() ? *this : addText(aAttribute, sToText(acrList));
    }
    ZTCBodyWriter& addFcId(const std::optional<std::uint32_t>& acrFcId) {
        return acrFcId ? addText(ZTTA_FcId, sFcIdText(*acrFcId)) : *this;
    }
    ZTCStoreBytes take() { return std::move(mBytes); }

    ZTCBodyWriter& addText(std::uint64_t aAttribute, const std::string& acrText) {
        appendVarint(mBytes, aAttribute);
        appendVarint(mBytes, acrText.size());
        mBytes.insert(mBytes.end(), acrText.begin(), acrText.end());
        return *this;
    }

private:
    ZTCStoreBytes mBytes;
};

ZTCThingValues readValues(std::span<const std::uint8_t> aBody) {
    ZTCThingValues lValues;
    while (!aBody.empty()) {
        const std::uint64_t lAttribute = takeVarint(aBody);
        const std::uint64_t lSize = takeVarint(aBody);
        if (lSize > aBody.size()) {
            throw ZTCStoreDamagedEx("history: a stored attribute ends early");
        }
        const auto lEnd = aBody.begin() + static_cast<std::ptrdiff_t>(lSize);
        lValues[lAttribute] = std::string(aBody.begin(), lEnd);
        aBody = aBody.subspan(lSize);
    }
    return lValues;
}

ZTCStoreBytes writeValues(const ZTCThingValues& acrValues) {
    ZTCBodyWriter lBody;
    for (const auto& [lAttribute, lText] : acrValues) {
        lBody.addText(lAttribute, lText);
    }
    return lBody.take();
}

// ---- things ----

// The order of the attributes of each thing is rising, so that equal things have equal bytes.

static ZTSThing sThing(const ZTSTopologyInitiator& acrPort) {
    return {ZTTT_Initiator, acrPort.mHost,
            ZTCBodyWriter()
                .add(ZTTA_Wwpn, acrPort.mWwpn)
                .add(ZTTA_Wwnn, acrPort.mWwnn)
                .add(ZTTA_State, acrPort.mState)
                .add(ZTTA_Speed, acrPort.mSpeed)
                .add(ZTTA_SymbolicName, acrPort.mSymbolicName)
                .add(ZTTA_Model, acrPort.mModel)
                .addFcId(acrPort.mFcId)
                .add(ZTTA_Fabric, acrPort.mFabric)
                .take()};
}

static ZTSThing sThing(const ZTSTopologyRemotePort& acrPort) {
    return {ZTTT_RemotePort, acrPort.mWwpn ? acrPort.mName + " " + acrPort.mWwpn->toText() : acrPort.mName,
            ZTCBodyWriter()
                .add(ZTTA_Host, acrPort.mHost)
                .add(ZTTA_Wwpn, acrPort.mWwpn)
                .add(ZTTA_Wwnn, acrPort.mWwnn)
                .add(ZTTA_State, acrPort.mState)
                .addFcId(acrPort.mFcId)
                .add(ZTTA_Roles, acrPort.mRoles)
                .add(ZTTA_DevLoss, acrPort.mDevLossSeconds)
                .take()};
}

static ZTSThing sThing(const ZTSTopologyPath& acrPath) {
    return {ZTTT_Path, acrPath.mAddress,
            ZTCBodyWriter()
                .add(ZTTA_Host, acrPath.mHost)
                .add(ZTTA_State, acrPath.mState)
                .add(ZTTA_Model, acrPath.mModel)
                .add(ZTTA_RemotePort, acrPath.mRemotePort)
                .add(ZTTA_Lun, acrPath.mLun)
                .add(ZTTA_Vendor, acrPath.mVendor)
                .add(ZTTA_Wwid, acrPath.mWwid)
                .add(ZTTA_QueueDepth, acrPath.mQueueDepth)
                .add(ZTTA_Disk, acrPath.mDisk)
                .add(ZTTA_Holders, acrPath.mHolders)
                .take()};
}

static ZTSThing sThing(const ZTSTopologyMapping& acrMapping) {
    return {ZTTT_Mapping, acrMapping.mDevice,
            ZTCBodyWriter()
                .add(ZTTA_Name, acrMapping.mName)
                .add(ZTTA_Uuid, acrMapping.mUuid)
                .add(ZTTA_Slaves, acrMapping.mSlaves)
                .take()};
}

std::vector<ZTSThing> toThings(const ZTSTopology& acrTopology) {
    std::vector<ZTSThing> lThings;
    const auto lAdd = [&](const auto& acrThing) { lThings.push_back(sThing(acrThing)); };
    std::ranges::for_each(acrTopology.mInitiators, lAdd);
    std::ranges::for_each(acrTopology.mRemotePorts, lAdd);
    std::ranges::for_each(acrTopology.mPaths, lAdd);
    for (const auto& [lrDevice, lrMapping] : acrTopology.mMappings) {
        lAdd(lrMapping);
    }
    for (const auto& [lrDevice, lrPoints] : acrTopology.mMounts) {
        lThings.push_back({ZTTT_Mount, lrDevice, ZTCBodyWriter().add(ZTTA_MountPoints, lrPoints).take()});
    }
    return lThings;
}

// ---- and back ----

/// The values of one thing, put into its members.
class ZTCBodyReader {
public:
    explicit ZTCBodyReader(std::span<const std::uint8_t> aBody) : mValues(readValues(aBody)) {}

    template <typename T>
    const ZTCBodyReader& get(ZTEAttribute aAttribute, T& arPlace) const {
        const auto lFound = mValues.find(aAttribute);
        if (lFound != mValues.end()) {
            sRead(lFound->second, arPlace);
        }
        return *this;
    }
    const ZTCBodyReader& getFcId(std::optional<std::uint32_t>& arPlace) const {
        const auto lFound = mValues.find(ZTTA_FcId);
        if (lFound != mValues.end()) {
            arPlace = sNumber<std::uint32_t>(lFound->second, 16);
        }
        return *this;
    }

private:
    ZTCThingValues mValues;
};

void addThing(ZTSTopology& arTopology, ZTETopologyThing aThing, const std::string& acrKey,
              std::span<const std::uint8_t> aBody) {
    const ZTCBodyReader lBody(aBody);
    switch (aThing) {
        case ZTTT_Initiator: {
            ZTSTopologyInitiator lPort{.mHost = acrKey};
            lBody.get(ZTTA_Wwpn, lPort.mWwpn).get(ZTTA_Wwnn, lPort.mWwnn).get(ZTTA_State, lPort.mState);
            lBody.get(ZTTA_Speed, lPort.mSpeed).get(ZTTA_SymbolicName, lPort.mSymbolicName);
            lBody.get(ZTTA_Model, lPort.mModel).getFcId(lPort.mFcId).get(ZTTA_Fabric, lPort.mFabric);
            arTopology.mInitiators.push_back(std::move(lPort));
            break;
        }
        case ZTTT_RemotePort: {
            ZTSTopologyRemotePort lPort{.mName = acrKey.substr(0, acrKey.find(' '))};
            lBody.get(ZTTA_Host, lPort.mHost).get(ZTTA_Wwpn, lPort.mWwpn).get(ZTTA_Wwnn, lPort.mWwnn);
            lBody.get(ZTTA_State, lPort.mState).getFcId(lPort.mFcId).get(ZTTA_Roles, lPort.mRoles);
            lBody.get(ZTTA_DevLoss, lPort.mDevLossSeconds);
            arTopology.mRemotePorts.push_back(std::move(lPort));
            break;
        }
        case ZTTT_Path: {
            ZTSTopologyPath lPath{.mAddress = acrKey};
            lBody.get(ZTTA_Host, lPath.mHost).get(ZTTA_State, lPath.mState).get(ZTTA_Model, lPath.mModel);
            lBody.get(ZTTA_RemotePort, lPath.mRemotePort).get(ZTTA_Lun, lPath.mLun).get(ZTTA_Vendor, lPath.mVendor);
            lBody.get(ZTTA_Wwid, lPath.mWwid).get(ZTTA_QueueDepth, lPath.mQueueDepth).get(ZTTA_Disk, lPath.mDisk);
            lBody.get(ZTTA_Holders, lPath.mHolders);
            arTopology.mPaths.push_back(std::move(lPath));
            break;
        }
        case ZTTT_Mapping: {
            ZTSTopologyMapping lMapping{.mDevice = acrKey};
            lBody.get(ZTTA_Name, lMapping.mName).get(ZTTA_Uuid, lMapping.mUuid).get(ZTTA_Slaves, lMapping.mSlaves);
            arTopology.mMappings[acrKey] = std::move(lMapping);
            break;
        }
        case ZTTT_Mount:
            lBody.get(ZTTA_MountPoints, arTopology.mMounts[acrKey]);
            break;
        default:
            break;  // of a later version
    }
}

void removeThing(ZTSTopology& arTopology, ZTETopologyThing aThing, const std::string& acrKey) {
    switch (aThing) {
        case ZTTT_Initiator:
            std::erase_if(arTopology.mInitiators, [&](const auto& acrPort) { return acrPort.mHost == acrKey; });
            break;
        case ZTTT_RemotePort:
            std::erase_if(arTopology.mRemotePorts, [lName = acrKey.substr(0, acrKey.find(' '))](const auto& acrPort) {
                return acrPort.mName == lName;
            });
            break;
        case ZTTT_Path:
            std::erase_if(arTopology.mPaths, [&](const auto& acrPath) { return acrPath.mAddress == acrKey; });
            break;
        case ZTTT_Mapping:
            arTopology.mMappings.erase(acrKey);
            break;
        case ZTTT_Mount:
            arTopology.mMounts.erase(acrKey);
            break;
        default:
            break;
    }
}

void sortTopology(ZTSTopology& arTopology) {
    std::ranges::sort(arTopology.mInitiators, {}, &ZTSTopologyInitiator::mHost);
    std::ranges::sort(arTopology.mRemotePorts, {}, &ZTSTopologyRemotePort::mName);
    std::ranges::sort(arTopology.mPaths, {}, &ZTSTopologyPath::mAddress);
}
