#include "sensor/client/include/RecordTable.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <map>
#include <utility>
#include <vector>

#include "sensor/client/include/RecordFields.h"

static std::string sHex(std::uint32_t aValue, int aDigits) {
    char lText[16];
    std::snprintf(lText, sizeof(lText), "0x%0*x", aDigits, static_cast<unsigned>(aValue));
    return lText;
}

/// "3,9-12", "0x28,0x2a", "all", "none".
static std::string sFormatBits(const std::vector<std::uint32_t>& acrBits, bool aIsHex, std::size_t aRoom) {
    if (acrBits.empty()) {
        return "none";
    }
    if (acrBits.size() == aRoom) {
        return "all";
    }
    std::string lText;
    for (std::size_t i = 0; i < acrBits.size();) {
        std::size_t lLast = i;
        while (lLast + 1 < acrBits.size() && acrBits[lLast + 1] == acrBits[lLast] + 1) {
            ++lLast;
        }
        const auto lOne = [aIsHex](std::uint32_t aBit) { return aIsHex ? sHex(aBit, 2) : std::to_string(aBit); };
        lText += (lText.empty() ? "" : ",") + lOne(acrBits[i]);
        if (lLast != i) {
            lText += (lLast == i + 1 ? "," : "-") + lOne(acrBits[lLast]);
        }
        i = lLast + 1;
    }
    return lText;
}

static std::string sFormatValue(const ZTSFieldValue& acrValue) {
    const ZTEFieldForm lForm = acrValue.mpRule->mForm;
    if (const auto* lpName = std::get_if<ZTSFcName>(&acrValue.mValue)) {
        return lpName->toText();
    }
    if (const auto* lpBits = std::get_if<std::vector<std::uint32_t>>(&acrValue.mValue)) {
        return sFormatBits(*lpBits, lForm == ZTFF_HexBits, std::size_t{8} * acrValue.mpRule->getSize());
    }
    const std::uint32_t lNumber = std::get<std::uint32_t>(acrValue.mValue);
    if (lForm == ZTFF_Lun && lNumber == 0xFFFFFFFFU) {
        return "all";
    }
    std::string lText = lForm == ZTFF_Hex         ? sHex(lNumber, 2)
                        : lForm == ZTFF_FcAddress ? sHex(lNumber, 6)
                                                  : std::to_string(lNumber);
    if (const char* lpName = acrValue.findValueName()) {
        lText += std::string("(") + lpName + ")";
    }
    return lText;
}

/// "a/b c/d*3": the fields of one entry joined by slashes, in the order of first occurrence, equal entries counted.
static std::string sFormatEntries(const std::vector<std::vector<ZTSFieldValue>>& acrEntries) {
    std::vector<std::pair<std::string, std::size_t>> lCounts;
    std::map<std::string, std::size_t> lPlaces;
    for (const std::vector<ZTSFieldValue>& lrEntry : acrEntries) {
        std::string lOne;
        for (const ZTSFieldValue& lrValue : lrEntry) {
            lOne += (lOne.empty() ? "" : "/") + sFormatValue(lrValue);
        }
        const auto lPlace = lPlaces.try_emplace(lOne, lCounts.size());
        if (lPlace.second) {
            lCounts.emplace_back(std::move(lOne), 0);
        }
        ++lCounts[lPlace.first->second].second;
    }
    std::string lText;
    for (const auto& [lOne, lTimes] : lCounts) {
        lText += (lText.empty() ? "" : " ") + lOne + (lTimes > 1 ? "*" + std::to_string(lTimes) : "");
    }
    return lText;
}

std::string escapeText(const std::string& acrText) {
    std::string lText;
    for (const char lChar : acrText) {
        const auto lByte = static_cast<unsigned char>(lChar);
        if (lByte >= 0x20 && lByte < 0x7F) {
            lText += lChar;
        } else {
            char lEscape[8];
            std::snprintf(lEscape, sizeof(lEscape), "\\x%02x", static_cast<unsigned>(lByte));
            lText += lEscape;
        }
    }
    return lText;
}

std::string formatKind(const ZTSReceivedRecord& acrRecord) {
    const ZTSScopeEventKind* lpKind = findDeliveredKind(acrRecord.mCategory, acrRecord.mSubcategory);
    return lpKind != nullptr
               ? lpKind->mpName
               : "unknown-" + std::to_string(acrRecord.mCategory) + "/" + std::to_string(acrRecord.mSubcategory);
}

static std::string sFormatRemotePort(const ZTSReceivedRecord& acrRecord, const ZTSDecodedData& acrData) {
    if (acrRecord.mNames) {
        return acrRecord.mNames->mPortName.toText();
    }
    const ZTSFieldValue* lpName = acrData.find("portName");
    return lpName != nullptr ? sFormatValue(*lpName) : "-";
}

std::string formatRemotePort(const ZTSReceivedRecord& acrRecord) {
    return sFormatRemotePort(acrRecord,
                             decodeEventData(acrRecord.mCategory, acrRecord.mSubcategory, acrRecord.mEventData));
}

static std::string sFormatRawBytes(const std::vector<std::uint8_t>& acrBytes) {
    std::string lText;
    for (const std::uint8_t lByte : acrBytes) {
        lText += sHex(lByte, 2).substr(2);
    }
    return lText;
}

static std::string sFormatDetails(const ZTSReceivedRecord& acrRecord, const ZTSDecodedData& acrData) {
    if (acrData.mpRule == nullptr) {
        return "data=" + sFormatRawBytes(acrRecord.mEventData);
    }
    std::string lText;
    const auto lAdd = [&lText](const std::string& acrPart) { lText += (lText.empty() ? "" : " ") + acrPart; };
    const std::string lRemotePort = sFormatRemotePort(acrRecord, acrData);
    for (const ZTSFieldValue& lrValue : acrData.mFields) {
        const std::string lName = lrValue.mpRule->mpName;
        const std::string lValue = sFormatValue(lrValue);
        const bool lIsKnownAnyway =
            lName == "version" || lName == "page" || (lName == "portName" && lValue == lRemotePort);
        if (!lIsKnownAnyway) {
            lAdd(std::string(lName).append("=").append(lValue));
        }
    }
    if (!acrData.mEntries.empty()) {
        lAdd(std::string(acrData.mpRule->mpEntriesName) + "=[" + sFormatEntries(acrData.mEntries) + "]");
    }
    if (!acrData.mProblem.empty()) {
        lAdd("(" + acrData.mProblem + ": data=" + sFormatRawBytes(acrRecord.mEventData) + ")");
    }
    return lText.empty() ? "-" : lText;
}

std::string formatDetails(const ZTSReceivedRecord& acrRecord) {
    return sFormatDetails(acrRecord,
                          decodeEventData(acrRecord.mCategory, acrRecord.mSubcategory, acrRecord.mEventData));
}

static constexpr std::size_t scColumns = 7;
static constexpr std::size_t scCountColumn = 3;
using ZTSTableRow = std::array<std::string, scColumns>;

static ZTSTableRow sMakeRow(const std::string& acrInitiator, const ZTSReceivedRecord& acrRecord) {
    const ZTSDecodedData lData = decodeEventData(acrRecord.mCategory, acrRecord.mSubcategory, acrRecord.mEventData);
    return {acrInitiator,
            formatKind(acrRecord),
            sFormatRemotePort(acrRecord, lData),
            std::to_string(acrRecord.mOccurrences),
            acrRecord.mBegin.toText(),
            acrRecord.mEnd.toText(),
            sFormatDetails(acrRecord, lData)};
}

static std::string sCountOf(std::uint64_t aCount, const std::string& acrOne) {
    return std::to_string(aCount) + " " + acrOne + (aCount == 1 ? "" : "s");
}

std::string formatTable(const ZTSResponse& acrResponse, bool aHasHeading) {
    std::vector<ZTSTableRow> lRows;
    if (aHasHeading) {
        lRows.push_back({"INITIATOR", "KIND", "REMOTE PORT", "COUNT", "FIRST", "LAST", "DETAILS"});
    }
    for (const ZTSReceivedList& lrList : acrResponse.mLists) {
        const auto lNames = lrList.getInitiatorNames();
        const std::string lInitiator = lNames ? lNames->mPortName.toText() : escapeText(lrList.mInitiatorKey);
        for (const ZTSReceivedRecord& lrRecord : lrList.mRecords) {
            lRows.push_back(sMakeRow(lInitiator, lrRecord));
        }
    }
    std::array<std::size_t, scColumns> lWidths{};
    for (const ZTSTableRow& lrRow : lRows) {
        for (std::size_t i = 0; i < scColumns; ++i) {
            lWidths[i] = std::max(lWidths[i], lrRow[i].size());
        }
    }
    std::string lText;
    for (const ZTSTableRow& lrRow : lRows) {
        for (std::size_t i = 0; i < scColumns; ++i) {
            const std::string lPadding(lWidths[i] - lrRow[i].size(), ' ');
            const bool lIsLast = i + 1 == scColumns;
            lText += i == scCountColumn ? lPadding + lrRow[i] : lIsLast ? lrRow[i] : lrRow[i] + lPadding;
            lText += lIsLast ? "\n" : "  ";
        }
    }
    lText += sCountOf(acrResponse.countRecords(), "record") + ", " +
             sCountOf(acrResponse.countOccurrences(), "occurrence") + " from " +
             sCountOf(acrResponse.mLists.size(), "initiator") + "\n";
    return lText;
}
