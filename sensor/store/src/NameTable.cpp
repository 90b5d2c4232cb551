#include "sensor/store/src/NameTable.h"

#include <cstring>

#include "sensor/client/include/RecordJson.h"

/// Bytes of a list key that holds no names, which are kept.
static constexpr std::size_t scKeptKeyBytes = 200;

std::size_t ZTCNameTable::Hash::operator()(const ZTSFcName& acrName) const {
    std::uint64_t lValue;
    std::memcpy(&lValue, acrName.mBytes.data(), sizeof lValue);
    return static_cast<std::size_t>(lValue * 0x9E3779B97F4A7C15U >> 16);
}

void ZTCNameTable::load() {
    mInitiators.clear();
    mInitiatorIds.clear();
    mPorts.clear();
    mPortIds.clear();
    ZTCStatement lInitiators(mrDatabase, "SELECT id, key, wwpn, wwnn, host FROM initiator");
    lInitiators.query();
    while (lInitiators.step()) {
        const auto lId = lInitiators.number<std::uint32_t>(0);
        mInitiatorIds[lInitiators.text(1)] = lId;
        mInitiators[lId] = {.mWwpn = lInitiators.name(2), .mWwnn = lInitiators.name(3), .mHost = lInitiators.text(4)};
    }
    ZTCStatement lPorts(mrDatabase, "SELECT id, wwpn, wwnn, fcId FROM port");
    lPorts.query();
    while (lPorts.step()) {
        const auto lId = lPorts.number<std::uint32_t>(0);
        const std::optional<ZTSFcName> lWwpn = lPorts.name(1);
        if (!lWwpn) {
            throw ZTCStoreDamagedEx(mrDatabase.getPath() + ": remote port " + std::to_string(lId) + " has no name");
        }
        ZTSRemotePort& lrPort = mPorts[lId];
        lrPort = {.mWwpn = *lWwpn, .mWwnn = lPorts.name(2), .mFcId = std::nullopt};
        if (!lPorts.isNull(3)) {
            lrPort.mFcId = lPorts.number<std::uint32_t>(3);
        }
        mPortIds[*lWwpn] = lId;
    }
}

std::uint32_t ZTCNameTable::findOrAddListKey(std::string_view aKey) {
    ZTSReceivedList lList;
    lList.mInitiatorKey = aKey;
    if (const std::optional<ZTSReceivedNames> lNames = lList.getInitiatorNames()) {
        return findOrAddInitiator({.mWwpn = lNames->mPortName, .mWwnn = lNames->mNodeName, .mHost = {}});
    }
    const std::string_view lKept = aKey.substr(0, scKeptKeyBytes);
    return findOrAdd("?" + toHex({reinterpret_cast<const std::uint8_t*>(lKept.data()), lKept.size()}), {});
}

std::uint32_t ZTCNameTable::findOrAddInitiator(const ZTSInitiator& acrInitiator) {
    return findOrAdd(acrInitiator.mWwpn ? acrInitiator.mWwpn->toText() : std::string(), acrInitiator);
}

std::uint32_t ZTCNameTable::findOrAdd(const std::string& acrKey, const ZTSInitiator& acrInitiator) {
    const auto lFound = mInitiatorIds.find(acrKey);
    if (lFound == mInitiatorIds.end()) {
        ZTCStatement(mrDatabase, "INSERT INTO initiator(key, wwpn, wwnn, host) VALUES (?, ?, ?, ?)")
            .run(acrKey, acrInitiator.mWwpn, acrInitiator.mWwnn, acrInitiator.mHost);
        const auto lId = static_cast<std::uint32_t>(sqlite3_last_insert_rowid(mrDatabase.handle()));
        mInitiatorIds[acrKey] = lId;
        mInitiators[lId] = acrInitiator;
        return lId;
    }
    ZTSInitiator lMerged = mInitiators.at(lFound->second);
    if (acrInitiator.mWwnn) {
        lMerged.mWwnn = acrInitiator.mWwnn;
    }
    if (!acrInitiator.mHost.empty()) {
        lMerged.mHost = acrInitiator.mHost;
    }
    if (lMerged != mInitiators.at(lFound->second)) {
        ZTCStatement(mrDatabase, "UPDATE initiator SET wwnn = ?, host = ? WHERE id = ?")
            .run(lMerged.mWwnn, lMerged.mHost, lFound->second);
        mInitiators[lFound->second] = lMerged;
    }
    return lFound->second;
}

std::uint32_t ZTCNameTable::findOrAddPort(const ZTSFcName& acrWwpn, const std::optional<ZTSFcName>& acrWwnn,
                                          std::optional<std::uint32_t> aFcId) {
    const auto lFound = mPortIds.find(acrWwpn);
    if (lFound == mPortIds.end()) {
        ZTCStatement(mrDatabase, "INSERT INTO port(wwpn, wwnn, fcId) VALUES (?, ?, ?)").run(acrWwpn, acrWwnn, aFcId);
        const auto lId = static_cast<std::uint32_t>(sqlite3_last_insert_rowid(mrDatabase.handle()));
        mPortIds[acrWwpn] = lId;
        mPorts[lId] = {.mWwpn = acrWwpn, .mWwnn = acrWwnn, .mFcId = aFcId};
        return lId;
    }
    const std::uint32_t lId = lFound->second;
    if (acrWwnn || aFcId) {
        ZTSRemotePort& lrPort = mPorts.at(lId);
        const ZTSRemotePort lMerged = {
            .mWwpn = acrWwpn, .mWwnn = acrWwnn ? acrWwnn : lrPort.mWwnn, .mFcId = aFcId ? aFcId : lrPort.mFcId};
        if (lMerged != lrPort) {
            ZTCStatement(mrDatabase, "UPDATE port SET wwnn = ?, fcId = ? WHERE id = ?")
                .run(lMerged.mWwnn, lMerged.mFcId, lId);
            lrPort = lMerged;
        }
    }
    return lId;
}

const ZTSInitiator& ZTCNameTable::getInitiator(std::uint32_t aId) const {
    const auto lFound = mInitiators.find(aId);
    return lFound == mInitiators.end() ? mNone : lFound->second;
}

std::optional<ZTSRemotePort> ZTCNameTable::getPort(std::uint32_t aId) const {
    const auto lFound = mPorts.find(aId);
    return lFound == mPorts.end() ? std::nullopt : std::optional(lFound->second);
}
