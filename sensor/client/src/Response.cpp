#include "sensor/client/include/Response.h"

#include <cstdio>

#include "sensor/client/include/ClientErrors.h"

std::string ZTSReceivedTime::toText() const {
    char lText[64];
    std::snprintf(lText, sizeof(lText), "%04u-%02u-%02u %02u:%02u:%02u.%03u%03u", mYear, mMonth, mDay, mHour, mMinute,
                  mSecond, mMilliseconds, mMicroseconds);
    return lText;
}

std::optional<ZTSReceivedNames> ZTSReceivedList::getInitiatorNames() const {
    const std::size_t lStop = mInitiatorKey.find('.');
    if (lStop == std::string::npos) {
        return std::nullopt;
    }
    try {
        const std::string_view lKey = mInitiatorKey;
        return ZTSReceivedNames{.mPortName = ZTSFcName::fromText(lKey.substr(lStop + 1)),
                                .mNodeName = ZTSFcName::fromText(lKey.substr(0, lStop))};
    } catch (const ZTCBadInputEx&) {
        return std::nullopt;
    }
}

std::uint64_t ZTSResponse::countRecords() const {
    std::uint64_t lCount = 0;
    for (const ZTSReceivedList& lrList : mLists) {
        lCount += lrList.mRecords.size();
    }
    return lCount;
}

std::uint64_t ZTSResponse::countOccurrences() const {
    std::uint64_t lCount = 0;
    for (const ZTSReceivedList& lrList : mLists) {
        for (const ZTSReceivedRecord& lrRecord : lrList.mRecords) {
            lCount += lrRecord.mOccurrences;
        }
    }
    return lCount;
}

const char* getStatusName(std::uint16_t aStatus) {
    static constexpr struct {
        ZTESensorAgentProtocolStatus mStatus;
        const char* mpName;
    } scNames[] = {
        {ZTSAPS_Success, "ZTSAPS_Success"},
        {ZTSAPS_VarCreate, "ZTSAPS_VarCreate"},
        {ZTSAPS_Invalid, "ZTSAPS_Invalid"},
        {ZTSAPS_NotFound, "ZTSAPS_NotFound"},
        {ZTSAPS_NotAllowed, "ZTSAPS_NotAllowed"},
        {ZTSAPS_Exists, "ZTSAPS_Exists"},
        {ZTSAPS_Repeat, "ZTSAPS_Repeat"},
        {ZTSAPS_NotSupported, "ZTSAPS_NotSupported"},
        {ZTSAPS_ConnectFailed, "ZTSAPS_ConnectFailed"},
        {ZTSAPS_OpenFailed, "ZTSAPS_OpenFailed"},
        {ZTSAPS_LockFailed, "ZTSAPS_LockFailed"},
        {ZTSAPS_UnlockFailed, "ZTSAPS_UnlockFailed"},
        {ZTSAPS_RefreshFailed, "ZTSAPS_RefreshFailed"},
    };
    for (const auto& lrEntry : scNames) {
        if (lrEntry.mStatus == aStatus) {
            return lrEntry.mpName;
        }
    }
    return "unknown status";
}
