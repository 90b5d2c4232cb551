#include "tests/support/ScopeDataResponse.h"

#include <stdexcept>

static ZTSEncodedDateTime sDecodeDateTime(ZTCByteReader& arReader) {
    ZTSEncodedDateTime lTime;
    lTime.mYear = arReader.u16();
    lTime.mMonth = arReader.u8();
    lTime.mDay = arReader.u8();
    lTime.mHour = arReader.u8();
    lTime.mMinute = arReader.u8();
    lTime.mSecond = arReader.u8();
    lTime.mSeparator = arReader.u8();
    lTime.mMilliseconds = arReader.u16();
    lTime.mMicroseconds = arReader.u16();
    lTime.mEpochSeconds = arReader.u64();
    if (lTime.mMonth < 1 || lTime.mMonth > 12 || lTime.mDay < 1 || lTime.mDay > 31 || lTime.mHour > 23 ||
        lTime.mMinute > 59 || lTime.mSecond > 60 || lTime.mSeparator != 0x2E || lTime.mMilliseconds > 999 ||
        lTime.mMicroseconds > 999) {
        throw std::runtime_error("a date-time field is out of its range");
    }
    return lTime;
}

static ZTSEncodedRecord sDecodeRecord(ZTCByteReader& arReader) {
    ZTSEncodedRecord lRecord;
    lRecord.mOccurrences = arReader.u32();
    lRecord.mBegin = sDecodeDateTime(arReader);
    lRecord.mEnd = sDecodeDateTime(arReader);
    lRecord.mCategory = arReader.u8();
    lRecord.mSubcategory = arReader.u8();
    const std::uint8_t lNames = arReader.u8();
    if (lNames > 1) {
        throw std::runtime_error("names are neither 0 nor 1");
    }
    lRecord.mHasNames = lNames == 1;
    if (lRecord.mHasNames) {
        lRecord.mPortName = arReader.wwn();
        lRecord.mNodeName = arReader.wwn();
    }
    lRecord.mData = arReader.raw(arReader.u32());
    return lRecord;
}

std::string ZTSEncodedRecord::text() const {
    std::string lText =
        std::to_string(mCategory) + "/" + std::to_string(mSubcategory) + " x" + std::to_string(mOccurrences) + " ";
    if (mHasNames) {
        lText += "names " + wwnText(mPortName) + " " + wwnText(mNodeName) + " ";
    }
    return lText + dataHex();
}

ZTSScopeDataResponse ZTSScopeDataResponse::decode(const ZTCBytes& acrBody) {
    ZTCByteReader lReader(acrBody);
    if (lReader.u8() != 2) {
        throw std::runtime_error("not a scope-data response: " + hexOf(acrBody).substr(0, 32));
    }
    ZTSScopeDataResponse lResponse;
    lResponse.mListCount = lReader.u32();
    while (lReader.remaining() != 0) {
        ZTSEncodedRecordList lList;
        lList.mInitiatorKey = lReader.string();
        const std::uint32_t lRecords = lReader.u32();
        for (std::uint32_t i = 0; i < lRecords; ++i) {
            lList.mRecords.push_back(sDecodeRecord(lReader));
        }
        lResponse.mLists.push_back(lList);
    }
    return lResponse;
}

std::vector<std::string> ZTSScopeDataResponse::texts(std::size_t aList) const {
    std::vector<std::string> lTexts;
    for (const ZTSEncodedRecord& lcrRecord : mLists.at(aList).mRecords) {
        lTexts.push_back(lcrRecord.text());
    }
    return lTexts;
}

std::uint64_t ZTSScopeDataResponse::occurrences(unsigned aCategory, unsigned aSubcategory) const {
    std::uint64_t lSum = 0;
    for (const ZTSEncodedRecordList& lcrList : mLists) {
        for (const ZTSEncodedRecord& lcrRecord : lcrList.mRecords) {
            if (lcrRecord.mCategory == aCategory && lcrRecord.mSubcategory == aSubcategory) {
                lSum += lcrRecord.mOccurrences;
            }
        }
    }
    return lSum;
}
