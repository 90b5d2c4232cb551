#include "tests/support/ScriptedSettings.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <string_view>

#include "tests/support/Bytes.h"

std::uint32_t readNumber(std::istream& arLine) {
    std::uint32_t lValue = 0;
    if (!(arLine >> lValue)) {
        throw std::runtime_error("a number is missing");
    }
    return lValue;
}

HBA_wwn hbaNameOf(const ZTSWwn& acrName) {
    HBA_wwn lName{};
    std::memcpy(lName.wwn, acrName.mBytes.data(), sizeof(lName.wwn));
    return lName;
}

ZTSWwn wwnOfHbaName(const HBA_wwn& acrName) {
    ZTSWwn lName;
    std::memcpy(lName.mBytes.data(), acrName.wwn, sizeof(acrName.wwn));
    return lName;
}

static std::string sReadWord(std::istream& arLine) {
    std::string lWord;
    arLine >> lWord;
    return lWord;
}

static HBA_wwn sReadName(std::istream& arLine) {
    const ZTCBytes lBytes = bytesOf(sReadWord(arLine));
    ZTSWwn lName;
    if (lBytes.size() != lName.mBytes.size()) {
        throw std::runtime_error("a name has 16 hex digits");
    }
    std::copy(lBytes.begin(), lBytes.end(), lName.mBytes.begin());
    return hbaNameOf(lName);
}

static ZTCKindKey sReadKind(std::istream& arLine) {
    const std::uint32_t lBoard = readNumber(arLine);
    const std::uint32_t lCategory = readNumber(arLine);
    return {lBoard, lCategory, readNumber(arLine)};
}

// ---- The shapes of lines ----

template <std::uint32_t ZTSScriptedSettings::*TMember>
static void sSetNumber(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    arSettings.*TMember = readNumber(arLine);
}

template <std::uint32_t KPM_FunctionList::*TMember>
static void sSetInList(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    arSettings.mList.*TMember = readNumber(arLine);
}

template <std::map<ZTCKindKey, std::uint32_t> ZTSScriptedSettings::*TMember>
static void sSetOfKind(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    const ZTCKindKey lKind = sReadKind(arLine);
    (arSettings.*TMember)[lKind] = readNumber(arLine);
}

template <std::map<ZTCKindKey, std::vector<ZTSLibraryEvent>> ZTSScriptedSettings::*TMember>
static void sAddEventOfKind(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    const ZTCKindKey lKind = sReadKind(arLine);
    (arSettings.*TMember)[lKind].push_back(ZTSLibraryEvent::parse(arLine));
}

static void sAddAdapter(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    const HBA_wwn lNodeName = sReadName(arLine);
    arSettings.mAdapters.push_back({lNodeName, sReadName(arLine)});
    arSettings.mNumberOfAdapters = static_cast<std::uint32_t>(arSettings.mAdapters.size());
}

static void sClearEntry(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    const std::size_t lOffset = offsetof(KPM_FunctionList, Init) + readNumber(arLine) * sizeof(void*);
    std::memset(reinterpret_cast<unsigned char*>(&arSettings.mList) + lOffset, 0, sizeof(void*));
}

static void sSetInfoStatus(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    const std::uint32_t lIndex = readNumber(arLine);
    arSettings.mInfoStatuses[lIndex] = readNumber(arLine);
}

static void sAddCloseDelivery(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    arSettings.mCloseThreads = readNumber(arLine);
    arSettings.mCloseDeliveries.push_back(ZTSLibraryEvent::parse(arLine));
}

static void sHold(ZTSScriptedSettings& arSettings, std::istream& arLine) {
    arSettings.mHeldFunctions.insert(sReadWord(arLine));
}

static void sHoldNothing(ZTSScriptedSettings& arSettings, std::istream&) {
    arSettings.mHeldFunctions.clear();
}

struct ZTSScriptedLine {
    std::string_view mName;
    void (*mpApply)(ZTSScriptedSettings& arSettings, std::istream& arLine);
};

static constexpr ZTSScriptedLine scLines[] = {
    {"adapter", sAddAdapter},
    {"adapters", sSetNumber<&ZTSScriptedSettings::mNumberOfAdapters>},
    {"function-list-status", sSetNumber<&ZTSScriptedSettings::mFunctionListStatus>},
    {"version", sSetInList<&KPM_FunctionList::version>},
    {"size", sSetInList<&KPM_FunctionList::size>},
    {"null-entry", sClearEntry},
    {"init-status", sSetNumber<&ZTSScriptedSettings::mInitStatus>},
    {"ztapi-supported", sSetNumber<&ZTSScriptedSettings::mIsZtapiSupported>},
    {"info-status", sSetInfoStatus},
    {"register-status", sSetOfKind<&ZTSScriptedSettings::mRegisterStatuses>},
    {"register-handle", sSetOfKind<&ZTSScriptedSettings::mRegisterHandles>},
    {"deliver-on-register", sAddEventOfKind<&ZTSScriptedSettings::mDeliveries>},
    {"deliver-in-register", sAddEventOfKind<&ZTSScriptedSettings::mInlineDeliveries>},
    {"deliver-in-close", sAddCloseDelivery},
    {"hold", sHold},
    {"hold-nothing", sHoldNothing},
};

void ZTSScriptedSettings::apply(const std::string& acrLine) {
    std::istringstream lLine(acrLine);
    const std::string lName = sReadWord(lLine);
    if (lName.empty()) {
        return;
    }
    const auto* const lpFound = std::find_if(std::begin(scLines), std::end(scLines),
                                             [&](const ZTSScriptedLine& acrRow) { return acrRow.mName == lName; });
    if (lpFound == std::end(scLines)) {
        throw std::runtime_error("no such configuration: " + lName);
    }
    lpFound->mpApply(*this, lLine);
}
