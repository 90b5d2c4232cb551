/// What a command works with: the settings, the history, the names, and what is known of the sensor.
#ifndef SENSOR_TAVIK_SRC_CONTEXT_H
#define SENSOR_TAVIK_SRC_CONTEXT_H

#include <memory>
#include <optional>
#include <string>

#include "sensor/settings/include/Settings.h"
#include "sensor/tavik/src/Tavik.h"
#include "sensor/views/include/StatusFacts.h"

/// Longest wait for the sensor's answer: `status` has to answer within 2 seconds in all.
inline constexpr std::chrono::milliseconds gcAskLimit{1200};

class ZTCContext {
public:
    /// Reads the settings. Throws ZTCWrongUseEx.
    explicit ZTCContext(const ZTSTavikOptions& acrOptions);

    const ZTSSettings& getSettings() const { return mSettings; }
    /// This host's name.
    const std::string& getHost() const { return mHost; }

    /// The history, read-only. Throws what ZTCHistory throws.
    std::unique_ptr<ZTCHistory> openHistory() const;
    /// The id of the history; empty, after saying why, where it cannot be read.
    std::string findStoreId() const;
    /// The names of the settings, and the ports and the topology that the history knows. @param apHistory  null: none;
    /// otherwise it outlives the names
    ZTCNameBook makeNames(const ZTCHistory* apHistory) const;
    /// Asks the sensor and reads the history. Never throws, whatever it meets: the facts say what is not known.
    /// @param aLossesSince  losses from then on; absent: of the last 24 hours
    ZTSStatusFacts gatherFacts(std::optional<ZTCHistoryTime> aLossesSince = {}) const;

private:
    void addLeftPage(ZTSStatusFacts& arFacts) const;

    ZTSSettings mSettings;
    std::string mSettingsFile;
    std::string mHost;
};

#endif
