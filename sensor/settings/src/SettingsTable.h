/// The one table of keys: name, member, range, default and meaning of each. Reading, checking, comparing and the text
/// of the installed file all walk it.
#ifndef SENSOR_SETTINGS_SRC_SETTINGSTABLE_H
#define SENSOR_SETTINGS_SRC_SETTINGSTABLE_H

#include <span>
#include <string>
#include <variant>

#include "sensor/settings/include/Settings.h"
#include "sensor/settings/src/SettingsTexts.h"

enum ZTEQuantity {
    ZTQ_Count,         ///< a whole number
    ZTQ_Seconds,       ///< a duration
    ZTQ_WholeSeconds,  ///< a duration without a fraction of a second
    ZTQ_Bytes          ///< a size
};

/// Which values a key takes. Numbers, seconds or bytes have least and most; texts, and each text of a list, have a
/// rule.
struct ZTSRange {
    ZTEQuantity mQuantity = ZTQ_Count;
    double mLeast = 0;
    double mMost = 0;
    const ZTSTextRule* mpRule = nullptr;
};

using ZTSMember =
    std::variant<bool ZTSSettings::*, std::uint64_t ZTSSettings::*, std::chrono::milliseconds ZTSSettings::*,
                 std::string ZTSSettings::*, std::vector<std::string> ZTSSettings::*>;

struct ZTSKey {
    const char* mpSection;
    const char* mpName;
    ZTSMember mMember;
    ZTSRange mRange;
    const char* mpDefault;  ///< as it stands in the file
    const char* mpMeaning;  ///< for the file; lines of at most 100 characters

    std::string toText() const { return std::string(mpSection) + "." + mpName; }
};

/// In the order of the file. The keys of one section stand together.
std::span<const ZTSKey> settingsTable();

#endif
