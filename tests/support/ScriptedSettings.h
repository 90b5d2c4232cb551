/// What a test has told the scripted adapters' library to be and to answer: one configuration line, one setting.
/// ScriptedLibrary.h lists the lines.
#ifndef TESTS_SUPPORT_SCRIPTEDSETTINGS_H
#define TESTS_SUPPORT_SCRIPTEDSETTINGS_H

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "tests/support/LibraryEvent.h"

/// Board, category, subcategory as registered; category 0 and the event type for a registration per board.
using ZTCKindKey = std::tuple<unsigned, unsigned, unsigned>;

struct ZTSScriptedAdapter {
    HBA_wwn mNodeName{};
    HBA_wwn mPortName{};
};

struct ZTSScriptedSettings {
    /// Applies one line; an empty one changes nothing. Throws std::runtime_error where it is something else.
    void apply(const std::string& acrLine);

    KPM_FunctionList mList{};  ///< the table of functions that the library gives
    std::uint32_t mFunctionListStatus = 0;
    std::uint32_t mInitStatus = 0;
    std::uint32_t mIsZtapiSupported = 1;
    std::uint32_t mNumberOfAdapters = 0;
    std::vector<ZTSScriptedAdapter> mAdapters;
    std::map<std::uint32_t, std::uint32_t> mInfoStatuses;  ///< by adapter
    std::map<ZTCKindKey, std::uint32_t> mRegisterStatuses;
    std::map<ZTCKindKey, std::uint32_t> mRegisterHandles;
    std::map<ZTCKindKey, std::vector<ZTSLibraryEvent>> mDeliveries;
    std::map<ZTCKindKey, std::vector<ZTSLibraryEvent>> mInlineDeliveries;
    std::uint32_t mCloseThreads = 0;
    std::vector<ZTSLibraryEvent> mCloseDeliveries;
    std::set<std::string> mHeldFunctions;
};

/// The number of this key in the map, or `aDefault`.
template <class Key>
std::uint32_t findSetting(const std::map<Key, std::uint32_t>& acrMap, const Key& acrKey, std::uint32_t aDefault) {
    const auto lFound = acrMap.find(acrKey);
    return lFound != acrMap.end() ? lFound->second : aDefault;
}

/// The next number of a line. Throws std::runtime_error where there is none.
std::uint32_t readNumber(std::istream& arLine);

/// A name as the library hands it over, and back.
HBA_wwn hbaNameOf(const ZTSWwn& acrName);
ZTSWwn wwnOfHbaName(const HBA_wwn& acrName);

#endif
