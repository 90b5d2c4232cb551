/// Local and remote ports and the short numbers that stand for them in the other tables. Kept in memory and in the
/// database; new ones are inserted at once, within the caller's transaction.
#ifndef SENSOR_STORE_SRC_NAMETABLE_H
#define SENSOR_STORE_SRC_NAMETABLE_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

#include "sensor/store/include/Episode.h"
#include "sensor/store/src/Database.h"

class ZTCNameTable {
public:
    explicit ZTCNameTable(ZTCDatabase& arDatabase) : mrDatabase(arDatabase) {}

    /// Forgets everything and reads the tables.
    void load();

    /// The initiator of a list: node name, a full stop, port name. Any other key gets a number of its own.
    std::uint32_t findOrAddListKey(std::string_view aKey);
    /// Without a WWPN: the one number that stands for unknown boards.
    std::uint32_t findOrAddInitiator(const ZTSInitiator& acrInitiator);
    /// Fields that are present replace what is known.
    std::uint32_t findOrAddPort(const ZTSFcName& acrWwpn, const std::optional<ZTSFcName>& acrWwnn = std::nullopt,
                                std::optional<std::uint32_t> aFcId = std::nullopt);

    /// What stands for the number; empty where there is no such number.
    const ZTSInitiator& getInitiator(std::uint32_t aId) const;
    /// Absent for 0 and for a number that there is not.
    std::optional<ZTSRemotePort> getPort(std::uint32_t aId) const;

    const std::map<std::uint32_t, ZTSInitiator>& getInitiators() const { return mInitiators; }
    const std::map<std::uint32_t, ZTSRemotePort>& getPorts() const { return mPorts; }

private:
    struct Hash {
        std::size_t operator()(const ZTSFcName& acrName) const;
    };
    std::uint32_t findOrAdd(const std::string& acrKey, const ZTSInitiator& acrInitiator);

    const ZTSInitiator mNone;
    ZTCDatabase& mrDatabase;
    std::map<std::uint32_t, ZTSInitiator> mInitiators;
    std::map<std::string, std::uint32_t> mInitiatorIds;
    std::map<std::uint32_t, ZTSRemotePort> mPorts;
    std::unordered_map<ZTSFcName, std::uint32_t, Hash> mPortIds;
};

#endif
