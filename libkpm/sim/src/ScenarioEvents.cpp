#include "libkpm/sim/src/ScenarioEvents.h"

#include <array>
#include <iterator>
#include <limits>
#include <utility>

#include "libkpm/sim/src/ScenarioFields.h"

static constexpr std::size_t scSimMaxPages = 16382;  // the length field of an RSCN holds no more

static std::vector<std::uint8_t> sStoredNumber(const ZTSSimField& acrField, std::uint32_t aNumber) {
    std::vector<std::uint8_t> lBytes(acrField.mWidth);
    storeSimNumber(acrField, aNumber, lBytes.data());
    return lBytes;
}

static ZTSSimSetting sSetting(const ZTSSimField& acrField, std::string_view aText, const ZTSSimScenario& acrScenario) {
    ZTSSimSetting lSetting;
    lSetting.mpField = &acrField;
    switch (acrField.mForm) {
        case ZTSFF_Number:
        case ZTSFF_BigEndian: {
            const std::uint32_t lMost = acrField.mWidth >= 4 ? gcSimMax32 : (1u << (8 * acrField.mWidth)) - 1;
            for (const std::uint32_t lNumber : readSimNumberList(acrField.mpName, aText, lMost)) {
                lSetting.mValues.push_back(sStoredNumber(acrField, lNumber));
            }
            break;
        }
        case ZTSFF_Wwn:
            forEachSimPart(acrField.mpName, aText, [&](std::string_view aPart) {
                const bool lIsNodeName = acrField.mDefault == ZTSDF_RemoteNode || acrField.mDefault == ZTSDF_LocalNode;
                const HBA_wwn lWwn = readSimWwn(acrField.mpName, aPart, acrScenario, lIsNodeName);
                lSetting.mValues.emplace_back(std::begin(lWwn.wwn), std::end(lWwn.wwn));
                checkSimListSize(acrField.mpName, lSetting.mValues.size());
            });
            break;
        case ZTSFF_Bytes:
            forEachSimPart(acrField.mpName, aText, [&](std::string_view aPart) {
                lSetting.mValues.push_back(readSimBytes(acrField.mpName, aPart, acrField.mWidth));
                checkSimListSize(acrField.mpName, lSetting.mValues.size());
            });
            break;
    }
    return lSetting;
}

/// A page of an RSCN: port:ID, area:ID, domain:ID, fabric, word:NUMBER.
static std::uint32_t sPage(std::string_view aText, const ZTSSimScenario& acrScenario) {
    static constexpr std::array<std::pair<std::string_view, std::uint32_t>, 5> scFormats{{
        {"port", 0x00000000},
        {"area", 0x01000000},
        {"domain", 0x02000000},
        {"fabric", 0x03000000},
        {"word", 0},
    }};
    const std::size_t lColon = aText.find(':');
    const std::string_view lFormat = aText.substr(0, lColon);
    for (const auto& [lrName, lrBits] : scFormats) {
        if (lFormat != lrName) {
            continue;
        }
        if (lColon == std::string_view::npos) {
            if (lrName == "fabric") {
                return lrBits;
            }
            break;
        }
        const std::string_view lId = aText.substr(lColon + 1);
        if (const ZTSSimPort* lpPort = findSimPort(acrScenario.mPorts, lId)) {
            return lrBits | lpPort->mFcId;
        }
        const std::uint32_t lMost = lrName == "word" ? gcSimMax32 : gcSimMaxFcId;
        return lrBits | static_cast<std::uint32_t>(readSimNumber("pages", lId, 0, lMost));
    }
    refuseSim("pages= takes port:ID, area:ID, domain:ID, fabric or word:NUMBER, not " + quoteSimWord(aText));
}

/// The fields that replace what the kind's callback would be given.
static void sParseOverrides(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario, ZTSSimEvent& arEvent) {
    const ZTESimDelivery lDelivery = getSimKind(arEvent.mKind).mDelivery;
    if (lDelivery == ZTSD_Temperature) {
        return;
    }
    if (const auto lText = arLine.take("data")) {
        if (*lText == "null" && lDelivery == ZTSD_Scope) {
            arEvent.mDataNull = true;
        } else {
            const std::size_t lMost = lDelivery == ZTSD_Link ? sizeof(LINKINFO) : gcSimMaxDataSize;
            arEvent.mData = readSimBytes("data", *lText, lMost);
        }
    }
    if (lDelivery == ZTSD_Link) {
        return;
    }
    if (const auto lText = arLine.take("length")) {
        arEvent.mLength = static_cast<std::uint32_t>(readSimNumber("length", *lText, 0, gcSimMaxDataSize));
    }
    if (lDelivery == ZTSD_Rscn) {
        if (const auto lText = arLine.take("pages")) {
            arEvent.mPages.emplace();
            if (*lText == "none") {
                return;
            }
            forEachSimPart("pages", *lText, [&](std::string_view aPart) {
                arEvent.mPages->push_back(sPage(aPart, acrScenario));
                if (arEvent.mPages->size() > scSimMaxPages) {
                    refuseSim("pages= lists more than " + std::to_string(scSimMaxPages) + " pages");
                }
            });
        }
        return;
    }
    if (const auto lText = arLine.take("category")) {
        arEvent.mCategory = readSimNumber32("category", *lText);
    }
    if (const auto lText = arLine.take("subcategory")) {
        arEvent.mSubcategory = readSimNumber32("subcategory", *lText);
    }
    if (const auto lText = arLine.take("local")) {
        arEvent.mLocal = readSimWwn("local", *lText, acrScenario, false);
    }
    if (const auto lText = arLine.take("payload")) {
        if (*lText != "null") {
            refuseSim("payload= takes null, not " + quoteSimWord(*lText));
        }
        arEvent.mPayloadNull = true;
    }
    if (const auto lText = arLine.take("size")) {
        arEvent.mSize = readSimNumber("size", *lText, 0, std::numeric_limits<std::uint64_t>::max());
        const std::uint64_t lClaimed = *arEvent.mSize & gcSimMax32;
        if (lClaimed > ZT_EVENT_HEADER_SIZE + gcSimMaxDataSize) {
            refuseSim("size= has low 32 bits of " + std::to_string(lClaimed) + ", more than " +
                      std::to_string(ZT_EVENT_HEADER_SIZE + gcSimMaxDataSize));
        }
    }
}

/// The fields that say when a line takes effect, and how often.
template <class Line>
static void sTakeTimes(ZTCSimLine& arLine, Line& arHappening) {
    if (const auto lText = arLine.take("at")) {
        arHappening.mAt = readSimNumber("at", *lText, 0, gcSimMaxMilliseconds);
        arHappening.mIsTimed = true;
    }
    if (const auto lText = arLine.take("every")) {
        arHappening.mEvery = readSimNumber("every", *lText, 0, gcSimMaxMilliseconds);
        arHappening.mIsTimed = true;
    }
    if (const auto lText = arLine.take("times")) {
        arHappening.mTimes = *lText == "forever" ? 0 : readSimNumber("times", *lText, 1, gcSimMaxTimes);
    }
    if (arHappening.mTimes == 0 && arHappening.mEvery == 0) {
        refuseSim("times=forever needs every= of at least 1");
    }
}

ZTSSimEvent parseSimEvent(ZTCSimLine& arLine, std::size_t aKind, const ZTSSimScenario& acrScenario) {
    ZTSSimEvent lEvent;
    lEvent.mKind = aKind;
    lEvent.mBoards = takeSimBoards(arLine, acrScenario, false);
    lEvent.mPorts = takeSimPorts(arLine, acrScenario, false);
    if (const auto lText = arLine.take("as")) {
        lEvent.mAs = readSimNumber32("as", *lText);
    }
    sTakeTimes(arLine, lEvent);
    lEvent.mThreads = takeSimNumber(arLine, "threads", 1, gcSimMaxThreads, 1);
    for (const ZTSSimField& lrField : getSimKind(aKind).mFields) {
        if (const auto lText = arLine.take(lrField.mpName)) {
            lEvent.mSettings.push_back(sSetting(lrField, *lText, acrScenario));
        }
    }
    sParseOverrides(arLine, acrScenario, lEvent);
    arLine.finish();
    if (lEvent.mData && (!lEvent.mSettings.empty() || lEvent.mPages)) {
        refuseSim(std::string(arLine.getDirective()) + " takes either data= or fields of its data, not both");
    }
    return lEvent;
}

ZTSSimStorm parseSimStorm(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    ZTSSimStorm lStorm;
    lStorm.mCount = readSimNumber("count", arLine.takeRequired("count"), 1, gcSimMaxTimes);
    lStorm.mSeed = takeSimNumber(arLine, "seed", 0, std::numeric_limits<std::uint64_t>::max(), lStorm.mSeed);
    lStorm.mThreads = takeSimNumber(arLine, "threads", 1, gcSimMaxThreads, lStorm.mThreads);
    if (const auto lText = arLine.take("at")) {
        lStorm.mAt = readSimNumber("at", *lText, 0, gcSimMaxMilliseconds);
        lStorm.mIsTimed = true;
    }
    if (const auto lText = arLine.take("over")) {
        lStorm.mOver = readSimNumber("over", *lText, 0, gcSimMaxMilliseconds);
        lStorm.mIsTimed = true;
    }
    const std::string_view lKinds = arLine.take("kind").value_or("all");
    if (lKinds == "all") {
        for (std::size_t lKind = 0; lKind < gcSimKindCount; ++lKind) {
            lStorm.mKinds.push_back(lKind);
        }
    } else {
        forEachSimPart("kind", lKinds, [&](std::string_view aPart) {
            const std::optional<std::size_t> lKind = findKindIndex(aPart);
            if (!lKind) {
                refuseSim("kind= names " + quoteSimWord(aPart) + ", which is not an event kind");
            }
            lStorm.mKinds.push_back(*lKind);
            checkSimListSize("kind", lStorm.mKinds.size());
        });
    }
    ZTSSimBoards lBoards = takeSimBoards(arLine, acrScenario, true);
    if (lBoards.mAll) {
        for (std::uint32_t lBoard = 0; lBoard < acrScenario.mAdapters.size(); ++lBoard) {
            lBoards.mBoards.push_back(lBoard);
        }
    }
    if (lBoards.mBoards.empty()) {
        refuseSim("storm needs an adapter in the lines above");
    }
    lStorm.mBoards = std::move(lBoards.mBoards);
    lStorm.mPorts = takeSimPorts(arLine, acrScenario, true);
    lStorm.mLuns = readSimNumberList("lun", arLine.take("lun").value_or("0-15"), gcSimMax32);
    arLine.finish();
    return lStorm;
}

static std::string sText(std::string_view aWhat, std::string_view aText) {
    if (aText.size() > gcSimMaxTextValue) {
        refuseSim(std::string(aWhat) + " has " + std::to_string(aText.size()) + " bytes, more than " +
                  std::to_string(gcSimMaxTextValue));
    }
    return std::string(aText);
}

ZTSSimState parseSimState(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario) {
    static constexpr std::array<std::pair<std::string_view, std::uint32_t>, 4> scStates{
        {{"working", KPM_STATE_WORKING},
         {"no-source", KPM_STATE_NO_SOURCE},
         {"no-rights", KPM_STATE_NO_RIGHTS},
         {"failed", KPM_STATE_FAILED}}};
    ZTSSimState lState;
    lState.mKind = takeSimKind(arLine);
    lState.mState = takeSimChoice(arLine, scStates);
    lState.mBoards = takeSimBoards(arLine, acrScenario, true);
    if (const auto lText = arLine.take("reason")) {
        lState.mReason = sText("reason=", *lText);
    }
    if (const auto lText = arLine.take("at")) {
        lState.mAt = readSimNumber("at", *lText, 0, gcSimMaxMilliseconds);
        lState.mIsTimed = true;
    }
    arLine.finish();
    return lState;
}

ZTSSimLoss parseSimLoss(ZTCSimLine& arLine) {
    ZTSSimLoss lLoss;
    lLoss.mName = sText("the name of a loss", arLine.takeWord("a name"));
    lLoss.mCount = readSimNumber("count", arLine.takeRequired("count"), 1, gcSimMaxTimes);
    sTakeTimes(arLine, lLoss);
    arLine.finish();
    return lLoss;
}
