#include "libkpm/sim/src/Delivery.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <utility>

static void sStore(std::vector<std::uint8_t>& arData, const ZTSSimField& acrField, std::uint32_t aNumber) {
    if (acrField.mForm != ZTSFF_Bytes) {
        storeSimNumber(acrField, aNumber, arData.data() + acrField.mOffset);
    }
}

static void sStore(std::vector<std::uint8_t>& arData, const ZTSSimField& acrField, const HBA_wwn& acrName) {
    std::memcpy(arData.data() + acrField.mOffset, acrName.wwn, sizeof acrName.wwn);
}

/// The defaults of an event's fields are made from these.
struct ZTSSimSurroundings {
    const ZTSSimPort* mpLocal;
    const ZTSSimPort* mpRemote;
    std::uint32_t mLinkTag;
    std::size_t mPages;
};

static void sStoreDefault(std::vector<std::uint8_t>& arData, const ZTSSimField& acrField,
                          const ZTSSimSurroundings& acrSurroundings) {
    const bool lIsLinkUp = acrSurroundings.mLinkTag % 2 == 0;
    switch (acrField.mDefault) {
        case ZTSDF_Constant:
        case ZTSDF_Lun:
            return sStore(arData, acrField, acrField.mConstant);
        case ZTSDF_RemotePort:
            return sStore(arData, acrField, acrSurroundings.mpRemote->mWwpn);
        case ZTSDF_RemoteNode:
            return sStore(arData, acrField, acrSurroundings.mpRemote->mWwnn);
        case ZTSDF_LocalPort:
            return sStore(arData, acrField, acrSurroundings.mpLocal->mWwpn);
        case ZTSDF_LocalNode:
            return sStore(arData, acrField, acrSurroundings.mpLocal->mWwnn);
        case ZTSDF_LocalId:
            return sStore(arData, acrField, lIsLinkUp ? acrSurroundings.mpLocal->mFcId : 0);
        case ZTSDF_LinkTag:
            return sStore(arData, acrField, acrSurroundings.mLinkTag);
        case ZTSDF_LinkUp:
            return sStore(arData, acrField, acrSurroundings.mLinkTag / 2);
        case ZTSDF_LinkDown:
            return sStore(arData, acrField, acrSurroundings.mLinkTag / 2 + (lIsLinkUp ? 0 : 1));
        case ZTSDF_RscnLength:
            return sStore(arData, acrField, static_cast<std::uint32_t>(4 + 4 * acrSurroundings.mPages));
    }
}

/// The data that the fields of a line make, with an RSCN's pages behind them.
static std::vector<std::uint8_t> sFieldData(const ZTSSimEvent& acrEvent, const ZTSSimPort& acrLocal,
                                            std::uint64_t aOccurrence, std::uint32_t aLinkTag) {
    const ZTSSimKind& lrKind = getSimKind(acrEvent.mKind);
    const ZTSSimPort& lrRemote = acrEvent.mPorts[aOccurrence % acrEvent.mPorts.size()];
    std::vector<std::uint32_t> lPages;
    if (lrKind.mDelivery == ZTSD_Rscn) {
        lPages = acrEvent.mPages.value_or(std::vector<std::uint32_t>{lrRemote.mFcId});
    }
    std::vector<std::uint8_t> lData(gcScopeEventKinds[acrEvent.mKind].mDataSize);
    const ZTSSimSurroundings lSurroundings{&acrLocal, &lrRemote, aLinkTag, lPages.size()};
    for (const ZTSSimField& lrField : lrKind.mFields) {
        const auto lSetting =
            std::find_if(acrEvent.mSettings.begin(), acrEvent.mSettings.end(),
                         [&](const ZTSSimSetting& acrSetting) { return acrSetting.mpField == &lrField; });
        if (lSetting == acrEvent.mSettings.end()) {
            sStoreDefault(lData, lrField, lSurroundings);
        } else {
            const std::vector<std::uint8_t>& lrValue = lSetting->mValues[aOccurrence % lSetting->mValues.size()];
            std::copy(lrValue.begin(), lrValue.end(), lData.begin() + lrField.mOffset);
        }
    }
    for (const std::uint32_t lPage : lPages) {
        for (int lShift = 24; lShift >= 0; lShift -= 8) {
            lData.push_back(static_cast<std::uint8_t>(lPage >> lShift));
        }
    }
    return lData;
}

static void sGrow(std::vector<std::uint8_t>& arData, std::size_t aSize) {
    if (arData.size() < aSize) {
        arData.resize(aSize);
    }
}

static std::uint32_t sRscnLength(const std::vector<std::uint8_t>& acrData) {
    return acrData.size() < 4 ? 0 : acrData[2] * 256u + acrData[3];
}

ZTSSimDelivery makeSimDelivery(const ZTSSimScenario& acrScenario, const ZTSSimEvent& acrEvent, std::uint32_t aBoard,
                               std::uint64_t aOccurrence, std::uint32_t aLinkTag) {
    const ZTSSimKind& lrKind = getSimKind(acrEvent.mKind);
    const ZTSScopeEventKind& lrPair = gcScopeEventKinds[acrEvent.mKind];
    const std::size_t lDataSize = lrPair.mDataSize;
    const ZTSSimPort& lrLocal = acrScenario.mAdapters.at(aBoard);
    ZTSSimDelivery lDelivery;
    lDelivery.mKind = acrEvent.mKind;
    lDelivery.mBoard = aBoard;
    lDelivery.mToldBoard = acrEvent.mAs.value_or(aBoard);
    lDelivery.mLocal = acrEvent.mLocal.value_or(lrLocal.mWwpn);
    lDelivery.mCategory = acrEvent.mCategory.value_or(lrPair.mDeliveredCategory);
    lDelivery.mSubcategory = acrEvent.mSubcategory.value_or(lrPair.mDeliveredSubcategory);
    lDelivery.mData = acrEvent.mData ? *acrEvent.mData : sFieldData(acrEvent, lrLocal, aOccurrence, aLinkTag);
    std::vector<std::uint8_t>& lrData = lDelivery.mData;
    switch (lrKind.mDelivery) {
        case ZTSD_Link:
        case ZTSD_Temperature:
            sGrow(lrData, lDataSize);
            break;
        case ZTSD_Rscn:
            if (acrEvent.mLength) {
                lrData.resize(std::max<std::size_t>(lrData.size(), *acrEvent.mLength));
            }
            lDelivery.mLength = acrEvent.mLength.value_or(static_cast<std::uint32_t>(lrData.size()));
            sGrow(lrData, sRscnLength(lrData));
            break;
        case ZTSD_Scope: {
            if (acrEvent.mLength) {
                lrData.resize(*acrEvent.mLength);
            }
            const bool lHasNoData = lDataSize == 0 && !acrEvent.mData && !acrEvent.mLength && !acrEvent.mSize;
            lDelivery.mIsPayloadNull = acrEvent.mPayloadNull || (lHasNoData && !acrEvent.mDataNull);
            lDelivery.mIsDataNull = acrEvent.mDataNull;
            lDelivery.mEventSize = acrEvent.mSize.value_or(ZT_EVENT_HEADER_SIZE + lrData.size());
            const std::uint64_t lClaimed = lDelivery.mEventSize & 0xFFFFFFFFu;
            sGrow(lrData, static_cast<std::size_t>(lClaimed - std::min<std::uint64_t>(lClaimed, ZT_EVENT_HEADER_SIZE)));
            break;
        }
    }
    return lDelivery;
}

std::uint32_t countSimPages(const ZTSSimDelivery& acrDelivery) {
    if (getSimKind(acrDelivery.mKind).mDelivery != ZTSD_Rscn || acrDelivery.mLength < 8) {
        return 0;
    }
    const std::uint32_t lWords = sRscnLength(acrDelivery.mData) / 4;
    return lWords == 0 ? 0 : lWords - 1;
}

/// A stream of numbers that its seed and its place alone determine.
class ZTCSimRandom {
public:
    ZTCSimRandom(std::uint64_t aSeed, std::uint64_t aPlace) : mState(sMixed(aSeed) ^ sMixed(~aPlace)) {}

    std::uint64_t draw() {
        mState += 0x9E3779B97F4A7C15u;
        return sMixed(mState);
    }

    /// From 0 to aLimit - 1.
    std::uint64_t drawBelow(std::uint64_t aLimit) { return draw() % aLimit; }

    template <class Value>
    const Value& drawFrom(const std::vector<Value>& acrValues) {
        return acrValues[drawBelow(acrValues.size())];
    }

private:
    static std::uint64_t sMixed(std::uint64_t aValue) {
        aValue = (aValue ^ (aValue >> 30)) * 0xBF58476D1CE4E5B9u;
        aValue = (aValue ^ (aValue >> 27)) * 0x94D049BB133111EBu;
        return aValue ^ (aValue >> 31);
    }

    std::uint64_t mState;
};

static std::vector<std::uint32_t> sDrawPages(ZTCSimRandom& arRandom, const ZTSSimStorm& acrStorm) {
    static constexpr std::uint64_t scMostPages = 4;
    std::vector<std::uint32_t> lPages(1 + arRandom.drawBelow(scMostPages));
    for (std::uint32_t& lrPage : lPages) {
        const std::uint32_t lFormat =
            arRandom.drawBelow(4) == 0 ? static_cast<std::uint32_t>(arRandom.drawBelow(4)) : 0;
        lrPage = lFormat << 24 | arRandom.drawFrom(acrStorm.mPorts).mFcId;
    }
    return lPages;
}

ZTSSimEvent drawSimEvent(const ZTSSimStorm& acrStorm, std::uint64_t aNumber) {
    ZTCSimRandom lRandom(acrStorm.mSeed, aNumber);
    ZTSSimEvent lEvent;
    lEvent.mKind = lRandom.drawFrom(acrStorm.mKinds);
    lEvent.mBoards.mBoards = {lRandom.drawFrom(acrStorm.mBoards)};
    lEvent.mPorts = {lRandom.drawFrom(acrStorm.mPorts)};
    const ZTSSimKind& lrKind = getSimKind(lEvent.mKind);
    for (const ZTSSimField& lrField : lrKind.mFields) {
        std::uint32_t lNumber = 0;
        if (lrField.mDefault == ZTSDF_Lun) {
            lNumber = lRandom.drawFrom(acrStorm.mLuns);
        } else if (lrField.mStormLimit != 0) {
            lNumber = static_cast<std::uint32_t>(lRandom.drawBelow(lrField.mStormLimit + 1ull));
        } else {
            continue;
        }
        std::vector<std::uint8_t> lValue(lrField.mWidth);
        storeSimNumber(lrField, lNumber, lValue.data());
        lEvent.mSettings.push_back({&lrField, {std::move(lValue)}});
    }
    if (lrKind.mDelivery == ZTSD_Rscn) {
        lEvent.mPages = sDrawPages(lRandom, acrStorm);
    }
    return lEvent;
}
