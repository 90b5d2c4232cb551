#include "sensor/collector/include/PageCounts.h"

#include <algorithm>
#include <array>

static_assert(ZTRF_Count == gcStatusRefusals && ZTRF_CollectionOff == +ZTSR_CollectionOff &&
              ZTRF_TotalLimit == +ZTSR_TotalLimit && ZTRF_UnknownBoard == +ZTSR_UnknownBoard &&
              ZTRF_NoList == +ZTSR_NoList && ZTRF_TooShort == +ZTSR_TooShort && ZTRF_UnknownKind == +ZTSR_UnknownKind &&
              ZTRF_Failed == +ZTSR_Failed);

ZTCKindKey getRowKind(std::size_t aRow) {
    static const std::array<ZTCKindKey, gcStatusRowsPerBoard> scKeys = [] {
        std::array<ZTCKindKey, gcStatusRowsPerBoard> lKeys{};
        for (std::size_t i = 0; i < lKeys.size(); ++i) {
            lKeys[i] = findKind(getStatusRowName(i)).value_or(0);
        }
        return lKeys;
    }();
    return scKeys.at(aRow);
}

static ZTSFcName sName(const std::array<std::uint8_t, 8>& acrBytes) {
    return {.mBytes = acrBytes};
}

static ZTEKindState sState(ZTEStatusState aState) {
    switch (aState) {
        case ZTSS_Off:
            return ZTKST_Off;
        case ZTSS_Listening:
            return ZTKST_Listening;
        case ZTSS_NoRights:
            return ZTKST_NoRights;
        case ZTSS_NoSource:
            return ZTKST_NoSource;
        case ZTSS_Failed:
            break;
    }
    return ZTKST_Failed;
}

static void sAppend(std::vector<ZTSPageCounts>& arCounts, const ZTSStatusBoardCopy* apBoard, ZTCKindKey aKind,
                    const ZTSStatusRowCopy& acrRow) {
    if (acrRow.getReceived() == 0) {
        return;
    }
    ZTSPageCounts lCounts;
    if (apBoard != nullptr) {
        lCounts.mWwpn = sName(apBoard->mWwpn);
        lCounts.mWwnn = sName(apBoard->mWwnn);
    }
    lCounts.mKind = aKind;
    lCounts.mReceived = acrRow.getReceived();
    std::ranges::copy(acrRow.mRefused, lCounts.mRefused.begin());
    lCounts.mConsolidated = acrRow.mConsolidated;
    lCounts.mHandedOver = acrRow.mHandedOver;
    lCounts.mHeld = acrRow.getHeld();
    lCounts.mDropped = acrRow.mDropped;
    arCounts.push_back(lCounts);
}

std::vector<ZTSPageCounts> toPageCounts(const ZTSStatusSnapshot& acrPage) {
    std::vector<ZTSPageCounts> lCounts;
    sAppend(lCounts, nullptr, 0, acrPage.mUnknownBoards);
    for (const ZTSStatusBoardCopy& lrBoard : acrPage.mBoards) {
        for (std::size_t i = 0; i < lrBoard.mRows.size(); ++i) {
            sAppend(lCounts, &lrBoard, getRowKind(i), lrBoard.mRows[i]);
        }
    }
    return lCounts;
}

std::vector<ZTSKindStateNow> toKindStates(const ZTSStatusSnapshot& acrPage) {
    std::vector<ZTSKindStateNow> lStates;
    for (const ZTSStatusBoardCopy& lrBoard : acrPage.mBoards) {
        for (std::size_t i = 0; i < gcStatusKinds; ++i) {
            lStates.push_back({.mWwpn = sName(lrBoard.mWwpn),
                               .mWwnn = sName(lrBoard.mWwnn),
                               .mKind = getRowKind(i),
                               .mState = sState(lrBoard.mRows[i].mState)});
        }
    }
    return lStates;
}

bool holdsNothing(const ZTSStatusSnapshot& acrPage, const ZTSInitiator& acrInitiator, ZTCKindKey aKind) {
    for (const ZTSStatusBoardCopy& lrBoard : acrPage.mBoards) {
        if (acrInitiator.mWwpn != sName(lrBoard.mWwpn)) {
            continue;
        }
        for (std::size_t i = 0; i < lrBoard.mRows.size(); ++i) {
            if (getRowKind(i) == aKind && lrBoard.mRows[i].getHeld() != 0) {
                return false;
            }
        }
    }
    return true;
}
