/// A scope-data response taken apart, strictly: every byte of it has to be accounted for.
#ifndef TESTS_SUPPORT_SCOPEDATARESPONSE_H
#define TESTS_SUPPORT_SCOPEDATARESPONSE_H

#include <cstdint>
#include <string>
#include <vector>

#include "tests/support/Bytes.h"

/// The 20 bytes of a date-time.
struct ZTSEncodedDateTime {
    std::uint16_t mYear = 0;
    std::uint8_t mMonth = 0;
    std::uint8_t mDay = 0;
    std::uint8_t mHour = 0;
    std::uint8_t mMinute = 0;
    std::uint8_t mSecond = 0;
    std::uint8_t mSeparator = 0;
    std::uint16_t mMilliseconds = 0;
    std::uint16_t mMicroseconds = 0;
    std::uint64_t mEpochSeconds = 0;

    /// Microseconds since the epoch.
    std::uint64_t total() const { return mEpochSeconds * 1000000 + mMilliseconds * 1000u + mMicroseconds; }
};

struct ZTSEncodedRecord {
    std::uint32_t mOccurrences = 0;
    ZTSEncodedDateTime mBegin;
    ZTSEncodedDateTime mEnd;
    std::uint8_t mCategory = 0;
    std::uint8_t mSubcategory = 0;
    bool mHasNames = false;
    ZTSWwn mPortName;
    ZTSWwn mNodeName;
    ZTCBytes mData;

    std::string dataHex() const { return hexOf(mData); }
    /// "CATEGORY/SUBCATEGORY xOCCURRENCES [names PORT NODE] DATA": the whole record but its times, for comparison.
    std::string text() const;
};

struct ZTSEncodedRecordList {
    std::string mInitiatorKey;
    std::vector<ZTSEncodedRecord> mRecords;
};

struct ZTSScopeDataResponse {
    std::uint32_t mListCount = 0;
    std::vector<ZTSEncodedRecordList> mLists;

    /// Decodes a response's body. Throws std::runtime_error where the outcome is not 2, where it ends early, or where a
    /// byte has a value that no response holds. More or fewer lists than the list count are the caller's to judge.
    static ZTSScopeDataResponse decode(const ZTCBytes& acrBody);

    /// The texts of all records of the list at this position.
    std::vector<std::string> texts(std::size_t aList = 0) const;
    /// Sum of the occurrences of all records of this kind, in all lists.
    std::uint64_t occurrences(unsigned aCategory, unsigned aSubcategory) const;
};

#endif
