#include "libkpm/sim/src/Scenario.h"

#include <algorithm>
#include <array>
#include <utility>

#include "libkpm/sim/src/ScenarioEvents.h"
#include "libkpm/sim/src/ScenarioFields.h"
#include "libkpm/sim/src/ScenarioLine.h"

static void sCheckNewName(std::string_view aName, const ZTSSimScenario& acrScenario) {
    const bool lStartsWithLetter =
        (aName.front() >= 'a' && aName.front() <= 'z') || (aName.front() >= 'A' && aName.front() <= 'Z');
    const bool lHasMark = aName.find_first_of(",:") != std::string_view::npos;
    if (!lStartsWithLetter || lHasMark || aName == "all" || aName == "none") {
        refuseSim(quoteSimWord(aName) +
                  " is not a name: a name begins with a letter, has no comma or colon, and is not all or none");
    }
    if (findSimPort(acrScenario.mAdapters, aName) != nullptr || findSimPort(acrScenario.mPorts, aName) != nullptr) {
        refuseSim("the name " + quoteSimWord(aName) + " is given twice");
    }
}

static ZTSSimPort sParsePort(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    ZTSSimPort lPort;
    lPort.mName = arLine.takeWord("a name");
    sCheckNewName(lPort.mName, acrScenario);
    lPort.mWwpn = takeSimWwn(arLine, "wwpn");
    lPort.mWwnn = takeSimWwn(arLine, "wwnn");
    lPort.mFcId = static_cast<std::uint32_t>(takeSimNumber(arLine, "fcid", 0, gcSimMaxFcId, 0));
    return lPort;
}

static std::uint32_t sParseStatus(ZTCSimLine& arLine) {
    return readSimNumber32("status", arLine.takeRequired("status"));
}

static ZTSSimAnswer sParseAnswer(ZTCSimLine& arLine, ZTESimOperation aOperation, const ZTSSimScenario& acrScenario) {
    ZTSSimAnswer lAnswer;
    lAnswer.mOperation = aOperation;
    if (aOperation != ZTSO_GetAdapterInfo) {
        lAnswer.mKind = takeSimKind(arLine);
    }
    if (const auto lText = arLine.take("board"); lText && *lText != "all") {
        lAnswer.mBoard = readSimBoard("board", *lText, acrScenario);
    }
    lAnswer.mStatus = sParseStatus(arLine);
    lAnswer.mTimes = takeSimNumber(arLine, "times", 1, gcSimMaxTimes, 0);
    if (aOperation == ZTSO_Register) {
        if (const auto lText = arLine.take("handle")) {
            lAnswer.mHandle = readSimNumber32("handle", *lText);
        }
    }
    return lAnswer;
}

static void sParseCount(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    const std::string_view lText = arLine.takeWord("a number of boards");
    const std::uint32_t lCount = readSimNumber32("count", lText);
    if (lCount > arScenario.mAdapters.size()) {
        refuseSim("count " + std::to_string(lCount) + " is more than the " +
                  std::to_string(arScenario.mAdapters.size()) + " adapters of the lines above");
    }
    if (const auto lAt = arLine.take("at")) {
        arScenario.mCountChanges.push_back({readSimNumber("at", *lAt, 0, gcSimMaxMilliseconds), lCount});
    } else {
        arScenario.mCount = lCount;
    }
}

static void sParseAdapter(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    if (arScenario.mAdapters.size() >= gcSimMaxAdapters) {
        refuseSim("there are more than " + std::to_string(gcSimMaxAdapters) + " adapters");
    }
    arScenario.mAdapters.push_back(sParsePort(arLine, arScenario));
}

static void sParseRemotePort(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    if (arScenario.mPorts.size() >= gcSimMaxPorts) {
        refuseSim("there are more than " + std::to_string(gcSimMaxPorts) + " ports");
    }
    arScenario.mPorts.push_back(sParsePort(arLine, arScenario));
}

static void sParseInit(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mInitStatus = sParseStatus(arLine);
}

static void sParseInfo(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_GetAdapterInfo, arScenario));
}

static void sParseRegister(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_Register, arScenario));
}

static void sParseUnregister(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    arScenario.mAnswers.push_back(sParseAnswer(arLine, ZTSO_Unregister, arScenario));
}

static void sParseZtapi(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, bool>, 2> scChoices{{{"yes", true}, {"no", false}}};
    arScenario.mIsZtapiSupported = takeSimChoice(arLine, scChoices);
}

static void sParseStart(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, ZTESimStart>, 3> scChoices{
        {{"registered", ZTSS_Registered}, {"first", ZTSS_First}, {"init", ZTSS_Init}}};
    arScenario.mStart = takeSimChoice(arLine, scChoices);
}

static void sParseAddresses(ZTCSimLine& arLine, ZTSSimScenario& arScenario) {
    static constexpr std::array<std::pair<std::string_view, bool>, 2> scChoices{{{"odd", true}, {"aligned", false}}};
    arScenario.mHasOddAddresses = takeSimChoice(arLine, scChoices);
}

struct ZTSSimDirective {
    std::string_view mName;
    void (*mpParse)(ZTCSimLine& arLine, ZTSSimScenario& arScenario);
};

static constexpr std::array<ZTSSimDirective, 10> scDirectives{{
    {"adapter", sParseAdapter},
    {"port", sParseRemotePort},
    {"count", sParseCount},
    {"init", sParseInit},
    {"ztapi", sParseZtapi},
    {"info", sParseInfo},
    {"register", sParseRegister},
    {"unregister", sParseUnregister},
    {"start", sParseStart},
    {"addresses", sParseAddresses},
}};

static const ZTSSimDirective* sFindDirective(std::string_view aName) {
    const auto lFound = std::find_if(scDirectives.begin(), scDirectives.end(),
                                     [&](const ZTSSimDirective& acrDirective) { return acrDirective.mName == aName; });
    return lFound == scDirectives.end() ? nullptr : &*lFound;
}

static std::optional<ZTSSimEventLine> sParseEventLine(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    if (arLine.getDirective() == "storm") {
        return parseSimStorm(arLine, acrScenario);
    }
    if (arLine.getDirective() == "state") {
        return parseSimState(arLine, acrScenario);
    }
    if (arLine.getDirective() == "loss") {
        return parseSimLoss(arLine);
    }
    if (const std::optional<std::size_t> lKind = findKindIndex(arLine.getDirective())) {
        return parseSimEvent(arLine, *lKind, acrScenario);
    }
    return std::nullopt;
}

static void sCountThreads(std::uint64_t aThreads, ZTSSimScenario& arScenario) {
    arScenario.mThreads += aThreads;
    if (arScenario.mThreads > gcSimMaxTotalThreads) {
        refuseSim("threads= of all lines so far make " + std::to_string(arScenario.mThreads) + ", more than " +
                  std::to_string(gcSimMaxTotalThreads));
    }
}

static void sAdd(ZTSSimEvent aEvent, ZTSSimScenario& arScenario) {
    if (aEvent.mBoards.mAll && arScenario.mAdapters.empty()) {
        refuseSim("board=all needs an adapter in the lines above");
    }
    sCountThreads(aEvent.mThreads > 1 ? aEvent.mThreads : 0, arScenario);
    arScenario.mEvents.push_back(std::move(aEvent));
}

static void sAdd(ZTSSimStorm aStorm, ZTSSimScenario& arScenario) {
    sCountThreads(aStorm.mThreads, arScenario);
    arScenario.mStorms.push_back(std::move(aStorm));
}

static void sAdd(ZTSSimState aState, ZTSSimScenario& arScenario) {
    arScenario.mStates.push_back(std::move(aState));
}

static void sAdd(ZTSSimLoss aLoss, ZTSSimScenario& arScenario) {
    arScenario.mLosses.push_back(std::move(aLoss));
}

static void sParseLine(std::string_view aText, ZTSSimScenario& arScenario) {
    ZTCSimLine lLine(aText);
    if (lLine.isEmpty()) {
        return;
    }
    if (const ZTSSimDirective* lpDirective = sFindDirective(lLine.getDirective())) {
        lpDirective->mpParse(lLine, arScenario);
        lLine.finish();
        return;
    }
    std::optional<ZTSSimEventLine> lEventLine = sParseEventLine(lLine, arScenario);
    if (!lEventLine) {
        refuseSim(quoteSimWord(lLine.getDirective()) + " is neither a directive nor an event kind");
    }
    const std::size_t lLines =
        arScenario.mEvents.size() + arScenario.mStorms.size() + arScenario.mStates.size() + arScenario.mLosses.size();
    if (lLines >= gcSimMaxEventLines) {
        refuseSim("there are more than " + std::to_string(gcSimMaxEventLines) +
                  " lines with events, states and losses");
    }
    std::visit([&arScenario](auto& arHappening) { sAdd(std::move(arHappening), arScenario); }, *lEventLine);
}

ZTSSimScenario parseSimScenario(std::string_view aText) {
    if (aText.size() > gcSimMaxTextSize) {
        throw ZTCSimRefusal(0, "the scenario has " + std::to_string(aText.size()) + " bytes, more than " +
                                   std::to_string(gcSimMaxTextSize));
    }
    ZTSSimScenario lScenario;
    std::size_t lLine = 0;
    while (!aText.empty()) {
        ++lLine;
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        try {
            sParseLine(aText.substr(0, lEnd), lScenario);
        } catch (const ZTCSimRefusal& lrRefusal) {
            throw ZTCSimRefusal(lLine, lrRefusal.what());
        }
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    return lScenario;
}

ZTSSimEventLine parseSimEventLine(std::string_view aLine, const ZTSSimScenario& acrScenario) {
    ZTCSimLine lLine(aLine);
    if (lLine.isEmpty()) {
        refuseSim("the line is empty");
    }
    std::optional<ZTSSimEventLine> lEventLine = sParseEventLine(lLine, acrScenario);
    if (!lEventLine) {
        refuseSim(quoteSimWord(lLine.getDirective()) + " is neither an event kind nor storm, state or loss");
    }
    return std::move(*lEventLine);
}

std::string_view getDefaultSimScenario() {
    return "adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80 fcid=0x010000\n"
           "adapter hba1 wwpn=30:00:00:00:00:01:00:01 wwnn=30:00:00:00:00:01:00:81 fcid=0x020000\n"
           "port disk0 wwpn=30:00:00:00:00:02:00:00 wwnn=30:00:00:00:00:02:00:80 fcid=0x010100\n"
           "port disk1 wwpn=30:00:00:00:00:02:00:01 wwnn=30:00:00:00:00:02:00:81 fcid=0x010200\n"
           "port disk2 wwpn=30:00:00:00:00:02:00:02 wwnn=30:00:00:00:00:02:00:82 fcid=0x020100\n"
           "port disk3 wwpn=30:00:00:00:00:02:00:03 wwnn=30:00:00:00:00:02:00:83 fcid=0x020200\n";
}
