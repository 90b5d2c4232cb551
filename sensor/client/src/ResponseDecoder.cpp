#include "sensor/client/include/ResponseDecoder.h"

#include <algorithm>

#include "sensor/client/src/WireBytes.h"

static ZTSReceivedTime sReadTime(ZTCWireReader& arReader, const char* apWhat) {
    ZTCWireReader lFields(arReader.readBytes(20, apWhat));
    ZTSReceivedTime lTime;
    lTime.mYear = lFields.readNumber<std::uint16_t>(apWhat);
    lTime.mMonth = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mDay = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mHour = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mMinute = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mSecond = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mSeparator = lFields.readNumber<std::uint8_t>(apWhat);
    lTime.mMilliseconds = lFields.readNumber<std::uint16_t>(apWhat);
    lTime.mMicroseconds = lFields.readNumber<std::uint16_t>(apWhat);
    lTime.mEpochSeconds = lFields.readNumber<std::uint64_t>(apWhat);
    return lTime;
}

static ZTSFcName sReadName(ZTCWireReader& arReader, const char* apWhat) {
    ZTSFcName lName;
    std::ranges::copy(arReader.readBytes(lName.mBytes.size(), apWhat), lName.mBytes.begin());
    return lName;
}

static ZTSReceivedRecord sReadRecord(ZTCWireReader& arReader) {
    ZTSReceivedRecord lRecord;
    lRecord.mOccurrences = arReader.readNumber<std::uint32_t>("a record's occurrence count");
    lRecord.mBegin = sReadTime(arReader, "a record's begin time");
    lRecord.mEnd = sReadTime(arReader, "a record's end time");
    lRecord.mCategory = arReader.readNumber<std::uint8_t>("a record's category");
    lRecord.mSubcategory = arReader.readNumber<std::uint8_t>("a record's subcategory");
    const std::size_t lFlagOffset = arReader.getOffset();
    const auto lHasNames = arReader.readNumber<std::uint8_t>("a record's names flag");
    if (lHasNames > 1) {
        throw ZTCDecodeEx(lFlagOffset, "response holds a record's names flag " + std::to_string(lHasNames) +
                                           " at offset " + std::to_string(lFlagOffset) + ", wanted 0 or 1");
    }
    if (lHasNames == 1) {
        lRecord.mNames.emplace();
        lRecord.mNames->mPortName = sReadName(arReader, "a remote port's port name");
        lRecord.mNames->mNodeName = sReadName(arReader, "a remote port's node name");
    }
    const auto lLength = arReader.readNumber<std::uint32_t>("an event data length");
    const auto lData = arReader.readBytes(lLength, "event data");
    lRecord.mEventData.assign(lData.begin(), lData.end());
    return lRecord;
}

static void sReadList(ZTCWireReader& arReader, std::vector<ZTSReceivedList>& arLists) {
    const auto lKeyLength = arReader.readNumber<std::uint32_t>("an initiator key's length");
    const auto lKey = arReader.readBytes(lKeyLength, "an initiator key");
    const auto lRecords = arReader.readNumber<std::uint32_t>("a list's record count");
    ZTSReceivedList& lrList = arLists.emplace_back();
    lrList.mInitiatorKey.assign(lKey.begin(), lKey.end());
    for (std::uint32_t i = 0; i < lRecords; ++i) {
        lrList.mRecords.push_back(sReadRecord(arReader));
    }
}

static void sReadResponse(ZTCWireReader& arReader, ZTSResponse& arResponse) {
    const auto lOutcome = arReader.readNumber<std::uint8_t>("the outcome");
    if (lOutcome > ZTRO_ScopeData) {
        throw ZTCDecodeEx(0, "response holds the outcome " + std::to_string(lOutcome) +
                                 " at offset 0, wanted 0 (success), 1 (failed) or 2 (scope data)");
    }
    arResponse.mOutcome = static_cast<ZTEResponseOutcome>(lOutcome);
    if (lOutcome == ZTRO_Success) {
        arResponse.mResult = static_cast<std::int32_t>(arReader.readNumber<std::uint32_t>("the result"));
    } else if (lOutcome == ZTRO_Failed) {
        arResponse.mStatus = arReader.readNumber<std::uint16_t>("the status");
    } else {
        arResponse.mAnnouncedLists = arReader.readNumber<std::uint32_t>("the list count");
        for (std::uint32_t i = 0; i < arResponse.mAnnouncedLists && arReader.remaining() != 0; ++i) {
            sReadList(arReader, arResponse.mLists);
        }
    }
    arResponse.mUnreadBytes = arReader.remaining();
}

ZTSDecodeResult decodeAsFarAsPossible(std::span<const std::uint8_t> aBody) {
    ZTSDecodeResult lResult;
    ZTCWireReader lReader(aBody);
    try {
        sReadResponse(lReader, lResult.mResponse);
    } catch (const ZTCDecodeEx& lrProblem) {
        lResult.mProblem = lrProblem;
    }
    return lResult;
}

ZTSResponse decodeResponse(std::span<const std::uint8_t> aBody) {
    ZTSDecodeResult lResult = decodeAsFarAsPossible(aBody);
    if (lResult.mProblem) {
        throw ZTCDecodeEx(*lResult.mProblem);
    }
    return std::move(lResult.mResponse);
}
