#include "sensor/client/include/RecordJson.h"

#include <nlohmann/json.hpp>

#include "sensor/client/include/RecordFields.h"

using ZTCJson = nlohmann::ordered_json;

std::string toHex(std::span<const std::uint8_t> aBytes) {
    static constexpr char scDigits[] = "0123456789abcdef";
    std::string lText;
    lText.reserve(2 * aBytes.size());
    for (const std::uint8_t lByte : aBytes) {
        lText += scDigits[lByte >> 4];
        lText += scDigits[lByte & 0x0F];
    }
    return lText;
}

static ZTCJson sTime(const ZTSReceivedTime& acrTime) {
    return {{"local", acrTime.toText()},
            {"epochSeconds", acrTime.mEpochSeconds},
            {"microseconds", acrTime.mMilliseconds * 1000U + acrTime.mMicroseconds}};
}

static ZTCJson sNames(const std::optional<ZTSReceivedNames>& acrNames) {
    if (!acrNames) {
        return nullptr;
    }
    return {{"portName", acrNames->mPortName.toText()}, {"nodeName", acrNames->mNodeName.toText()}};
}

static ZTCJson sFields(const std::vector<ZTSFieldValue>& acrFields) {
    ZTCJson lObject = ZTCJson::object();
    for (const ZTSFieldValue& lrField : acrFields) {
        const std::string lName = lrField.mpRule->mpName;
        if (const auto* lpName = std::get_if<ZTSFcName>(&lrField.mValue)) {
            lObject[lName] = lpName->toText();
        } else if (const auto* lpBits = std::get_if<std::vector<std::uint32_t>>(&lrField.mValue)) {
            lObject[lName] = *lpBits;
        } else {
            lObject[lName] = std::get<std::uint32_t>(lrField.mValue);
            if (!lrField.mpRule->mValueNames.empty()) {
                const char* lpValueName = lrField.findValueName();
                lObject[lName + "Name"] = lpValueName != nullptr ? ZTCJson(lpValueName) : ZTCJson(nullptr);
            }
        }
    }
    return lObject;
}

ZTCJson toJson(const ZTSReceivedRecord& acrRecord) {
    const ZTSDecodedData lData = decodeEventData(acrRecord.mCategory, acrRecord.mSubcategory, acrRecord.mEventData);
    ZTCJson lRecord = {
        {"kind", lData.mpKind != nullptr ? ZTCJson(lData.mpKind->mpName) : ZTCJson(nullptr)},
        {"category", acrRecord.mCategory},
        {"subcategory", acrRecord.mSubcategory},
        {"occurrences", acrRecord.mOccurrences},
        {"begin", sTime(acrRecord.mBegin)},
        {"end", sTime(acrRecord.mEnd)},
        {"remotePort", sNames(acrRecord.mNames)},
        {"data", nullptr},
        {"dataProblem", lData.mProblem.empty() ? ZTCJson(nullptr) : ZTCJson(lData.mProblem)},
        {"dataHex", toHex(acrRecord.mEventData)},
    };
    if (lData.mpRule != nullptr) {
        lRecord["data"] = sFields(lData.mFields);
        if (lData.mpRule->mpEntriesName != nullptr) {
            ZTCJson& lrEntries = lRecord["data"][lData.mpRule->mpEntriesName] = ZTCJson::array();
            for (const std::vector<ZTSFieldValue>& lrEntry : lData.mEntries) {
                lrEntries.push_back(sFields(lrEntry));
            }
        }
    }
    return lRecord;
}

ZTCJson toJson(const ZTSResponse& acrResponse) {
    if (acrResponse.mOutcome == ZTRO_Success) {
        return {{"outcome", "success"}, {"result", acrResponse.mResult}};
    }
    if (acrResponse.mOutcome == ZTRO_Failed) {
        return {{"outcome", "failed"},
                {"status", {{"code", acrResponse.mStatus}, {"name", getStatusName(acrResponse.mStatus)}}}};
    }
    ZTCJson lLists = ZTCJson::array();
    for (const ZTSReceivedList& lrList : acrResponse.mLists) {
        ZTCJson lRecords = ZTCJson::array();
        for (const ZTSReceivedRecord& lrRecord : lrList.mRecords) {
            lRecords.push_back(toJson(lrRecord));
        }
        const auto lNames = lrList.getInitiatorNames();
        lLists.push_back(
            {{"initiatorKey", lrList.mInitiatorKey}, {"initiator", sNames(lNames)}, {"records", std::move(lRecords)}});
    }
    return {{"outcome", "scope-data"},
            {"announcedLists", acrResponse.mAnnouncedLists},
            {"lists", std::move(lLists)},
            {"totals",
             {{"lists", acrResponse.mLists.size()},
              {"records", acrResponse.countRecords()},
              {"occurrences", acrResponse.countOccurrences()}}}};
}

std::string dumpJson(const ZTCJson& acrValue, int aIndent) {
    return acrValue.dump(aIndent, ' ', false, ZTCJson::error_handler_t::replace);
}
