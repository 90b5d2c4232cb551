// Scenarios of the simulated library: a text is refused with a line and a reason, or it plays. Each event has the bytes
// that it claims, is the same event each time it is made, and its line is taken as an injected line too.
//
// Input: the text of a scenario.
#include <algorithm>
#include <cstring>
#include <string>

#include "fuzz/support/FuzzInput.h"
#include "libkpm/sim/src/Delivery.h"
#include "libkpm/sim/src/Engine.h"
#include "libkpm/sim/src/Scenario.h"
#include "libkpm/sim/src/ScenarioFile.h"

static constexpr std::size_t scPlayedLines = 16;
static constexpr std::uint64_t scPlayedOccurrences = 4;

static std::uint64_t sCallbacks = 0;
static std::uint64_t sSum = 0;  // of all bytes that the callbacks were lent, so that each is read

static void sReadBytes(const void* apBytes, std::size_t aSize) {
    for (std::size_t lByte = 0; lByte < aSize; ++lByte) {
        sSum += static_cast<const std::uint8_t*>(apBytes)[lByte];
    }
}

static void sOnScope(unsigned, HBA_wwn, unsigned, unsigned, void*, ZT_event* apEvent) {
    ++sCallbacks;
    ZT_event lEvent;
    std::memcpy(&lEvent, apEvent, sizeof lEvent);
    if (lEvent.zt_evt_payload == nullptr) {
        return;
    }
    ZT_event_payload lPayload;
    std::memcpy(&lPayload, lEvent.zt_evt_payload, sizeof lPayload);
    const auto lSize = static_cast<std::uint32_t>(lEvent.zt_evt_size);
    if (lPayload.zt_payload_data != nullptr && lSize > ZT_EVENT_HEADER_SIZE) {
        sReadBytes(lPayload.zt_payload_data, lSize - ZT_EVENT_HEADER_SIZE);
    }
}

static void sOnLink(unsigned, void* apInfo) {
    ++sCallbacks;
    sReadBytes(apInfo, sizeof(LINKINFO));
}

static void sOnRscn(unsigned, void* apPayload, unsigned aLength) {
    ++sCallbacks;
    sReadBytes(apPayload, aLength);
    if (aLength >= 8) {
        const auto* lpPayload = static_cast<const std::uint8_t*>(apPayload);
        sReadBytes(lpPayload, lpPayload[2] * 256u + lpPayload[3]);
    }
}

static void sOnTemperature(unsigned, unsigned, unsigned) {
    ++sCallbacks;
}

static void sRegisterAll(ZTCSimEngine& arEngine) {
    for (std::uint32_t lBoard = 0; lBoard < arEngine.getNumberOfAdapters(); ++lBoard) {
        for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
            const ZTSScopeEventKind& lrPair = gcScopeEventKinds[lKind];
            std::uint32_t lHandle = 0;
            switch (getSimKind(lKind).mDelivery) {
                case ZTSD_Scope:
                    arEngine.registerForPort(lBoard, arEngine.getScenario().mAdapters[lBoard].mWwpn,
                                             lrPair.mRegisteredCategory, lrPair.mRegisteredSubcategory, nullptr,
                                             &lHandle, sOnScope);
                    break;
                case ZTSD_Link:
                    arEngine.registerForBoard(lBoard, FC_REG_LINK_EVENT, nullptr,
                                              reinterpret_cast<KPM_EventCallback>(sOnLink));
                    break;
                case ZTSD_Rscn:
                    arEngine.registerForBoard(lBoard, FC_REG_RSCN_EVENT, nullptr,
                                              reinterpret_cast<KPM_EventCallback>(sOnRscn));
                    break;
                case ZTSD_Temperature:
                    arEngine.registerForBoard(lBoard, FC_REG_TEMPERATURE_EVENT, nullptr,
                                              reinterpret_cast<KPM_EventCallback>(sOnTemperature));
                    break;
            }
        }
    }
}

static bool sIsSame(const ZTSSimDelivery& acrOne, const ZTSSimDelivery& acrOther) {
    return acrOne.mKind == acrOther.mKind && acrOne.mToldBoard == acrOther.mToldBoard &&
           acrOne.mCategory == acrOther.mCategory && acrOne.mSubcategory == acrOther.mSubcategory &&
           acrOne.mEventSize == acrOther.mEventSize && acrOne.mLength == acrOther.mLength &&
           acrOne.mData == acrOther.mData;
}

static void sCheckDelivery(const ZTSSimScenario& acrScenario, const ZTSSimEvent& acrEvent, std::uint32_t aBoard,
                           std::uint64_t aOccurrence) {
    const ZTSSimDelivery lDelivery = makeSimDelivery(acrScenario, acrEvent, aBoard, aOccurrence, 1);
    ZT_FUZZ_REQUIRE(sIsSame(lDelivery, makeSimDelivery(acrScenario, acrEvent, aBoard, aOccurrence, 1)),
                    "made again it is another");
    const auto lClaimed = static_cast<std::uint32_t>(lDelivery.mEventSize);
    ZT_FUZZ_REQUIRE(lClaimed <= ZT_EVENT_HEADER_SIZE || lDelivery.mData.size() >= lClaimed - ZT_EVENT_HEADER_SIZE,
                    std::to_string(lClaimed));
    ZT_FUZZ_REQUIRE(lDelivery.mData.size() >= lDelivery.mLength, std::to_string(lDelivery.mLength));
}

static void sPlay(const ZTSSimScenario& acrScenario) {
    if (acrScenario.mAdapters.empty()) {
        return;
    }
    ZTCSimEngine lEngine(acrScenario);
    sRegisterAll(lEngine);
    sCallbacks = 0;
    std::uint64_t lDelivered = 0;
    for (std::size_t lLine = 0; lLine < std::min(acrScenario.mEvents.size(), scPlayedLines); ++lLine) {
        ZTSSimEvent lEvent = acrScenario.mEvents[lLine];
        const auto lLast = static_cast<std::uint32_t>(acrScenario.mAdapters.size() - 1);
        for (const std::uint64_t lOccurrence : {std::uint64_t{0}, std::uint64_t{1}, gcSimMaxTimes}) {
            sCheckDelivery(acrScenario, lEvent, lLast, lOccurrence);
        }
        lEvent.mTimes = lEvent.mTimes == 0 ? scPlayedOccurrences : std::min(lEvent.mTimes, scPlayedOccurrences);
        lEvent.mThreads = 1;
        lDelivered += lEngine.inject(lEvent);
    }
    for (std::size_t lLine = 0; lLine < std::min(acrScenario.mStorms.size(), scPlayedLines); ++lLine) {
        ZTSSimStorm lStorm = acrScenario.mStorms[lLine];
        lStorm.mCount = std::min(lStorm.mCount, scPlayedOccurrences);
        lStorm.mThreads = 1;
        lDelivered += lEngine.inject(lStorm);
    }
    ZT_FUZZ_REQUIRE(lDelivered == sCallbacks, std::to_string(lDelivered) + " told, " + std::to_string(sCallbacks));
    ZT_FUZZ_REQUIRE(lEngine.getStatus().mDelivered == lDelivered, std::to_string(lDelivered));
}

/// The lines that deliver or report are injected lines as well.
static void sCheckLines(std::string_view aText, const ZTSSimScenario& acrScenario) {
    std::size_t lEventLines = 0;
    while (!aText.empty()) {
        const std::size_t lEnd = std::min(aText.find('\n'), aText.size());
        try {
            parseSimEventLine(aText.substr(0, lEnd), acrScenario);
            ++lEventLines;
        } catch (const ZTCSimRefusal& lrRefusal) {
            ZT_FUZZ_REQUIRE(lrRefusal.getLine() == 0, lrRefusal.what());
        }
        aText.remove_prefix(std::min(lEnd + 1, aText.size()));
    }
    ZT_FUZZ_REQUIRE(lEventLines == acrScenario.mEvents.size() + acrScenario.mStorms.size() +
                                       acrScenario.mStates.size() + acrScenario.mLosses.size(),
                    std::to_string(lEventLines));
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    const std::string_view lText(reinterpret_cast<const char*>(apData), aSize);
    try {
        const ZTSSimScenario lScenario = parseSimScenario(lText);
        sCheckLines(lText, lScenario);
        sPlay(lScenario);
    } catch (const ZTCSimRefusal& lrRefusal) {
        const std::string lReason = describeSimRefusal("input", lrRefusal);
        for (const char lCharacter : lReason) {
            const auto lByte = static_cast<unsigned char>(lCharacter);
            ZT_FUZZ_REQUIRE(lByte >= 0x20 && lByte != 0x7F, lReason);
        }
    }
    return 0;
}
