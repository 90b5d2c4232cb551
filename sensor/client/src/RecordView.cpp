#include "sensor/client/include/RecordView.h"

#include <algorithm>

#include "sensor/client/src/WireBytes.h"

template <std::unsigned_integral T>
static T sNumber(const std::uint8_t* apBytes) {
    std::uint64_t lValue = 0;
    for (std::size_t i = 0; i < sizeof(T); ++i) {
        lValue = lValue << 8 | apBytes[i];
    }
    return static_cast<T>(lValue);
}

static ZTSReceivedTime sReadTime(ZTCWireReader& arReader, const char* apWhat) {
    const std::uint8_t* const lpBytes = arReader.readBytes(20, apWhat).data();
    return {.mYear = sNumber<std::uint16_t>(lpBytes),
            .mMonth = lpBytes[2],
            .mDay = lpBytes[3],
            .mHour = lpBytes[4],
            .mMinute = lpBytes[5],
            .mSecond = lpBytes[6],
            .mSeparator = lpBytes[7],
            .mMilliseconds = sNumber<std::uint16_t>(lpBytes + 8),
            .mMicroseconds = sNumber<std::uint16_t>(lpBytes + 10),
            .mEpochSeconds = sNumber<std::uint64_t>(lpBytes + 12)};
}

static ZTSFcName sReadName(ZTCWireReader& arReader, const char* apWhat) {
    ZTSFcName lName;
    std::ranges::copy(arReader.readBytes(lName.mBytes.size(), apWhat), lName.mBytes.begin());
    return lName;
}

static ZTSRecordView sReadRecord(ZTCWireReader& arReader, std::span<const std::uint8_t> aAll) {
    const std::size_t lStart = arReader.getOffset();
    ZTSRecordView lRecord;
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
    lRecord.mEventData = arReader.readBytes(lLength, "event data");
    lRecord.mBytes = aAll.subspan(lStart, arReader.getOffset() - lStart);
    return lRecord;
}

ZTSReceivedRecord ZTSRecordView::toRecord() const {
    return {.mOccurrences = mOccurrences,
            .mBegin = mBegin,
            .mEnd = mEnd,
            .mCategory = mCategory,
            .mSubcategory = mSubcategory,
            .mNames = mNames,
            .mEventData = {mEventData.begin(), mEventData.end()}};
}

ZTSRecordView readRecordView(std::span<const std::uint8_t> aBytes) {
    ZTCWireReader lReader(aBytes);
    return sReadRecord(lReader, aBytes);
}

static void sReadList(ZTCWireReader& arReader, std::span<const std::uint8_t> aBody, ZTCResponseVisitor& arVisitor) {
    const auto lKeyLength = arReader.readNumber<std::uint32_t>("an initiator key's length");
    const auto lKey = arReader.readBytes(lKeyLength, "an initiator key");
    const auto lRecords = arReader.readNumber<std::uint32_t>("a list's record count");
    arVisitor.visitList({reinterpret_cast<const char*>(lKey.data()), lKey.size()});
    for (std::uint32_t i = 0; i < lRecords; ++i) {
        arVisitor.visitRecord(sReadRecord(arReader, aBody));
    }
}

static void sReadResponse(ZTCWireReader& arReader, std::span<const std::uint8_t> aBody, ZTCResponseVisitor& arVisitor) {
    const auto lOutcome = arReader.readNumber<std::uint8_t>("the outcome");
    if (lOutcome > ZTRO_ScopeData) {
        throw ZTCDecodeEx(0, "response holds the outcome " + std::to_string(lOutcome) +
                                 " at offset 0, wanted 0 (success), 1 (failed) or 2 (scope data)");
    }
    ZTSResponse lResponse;
    lResponse.mOutcome = static_cast<ZTEResponseOutcome>(lOutcome);
    if (lOutcome == ZTRO_Success) {
        lResponse.mResult = static_cast<std::int32_t>(arReader.readNumber<std::uint32_t>("the result"));
    } else if (lOutcome == ZTRO_Failed) {
        lResponse.mStatus = arReader.readNumber<std::uint16_t>("the status");
    } else {
        lResponse.mAnnouncedLists = arReader.readNumber<std::uint32_t>("the list count");
    }
    arVisitor.visitOutcome(lResponse);
    for (std::uint32_t i = 0; i < lResponse.mAnnouncedLists && arReader.remaining() != 0; ++i) {
        sReadList(arReader, aBody, arVisitor);
    }
}

std::optional<ZTCDecodeEx> visitResponse(std::span<const std::uint8_t> aBody, ZTCResponseVisitor& arVisitor,
                                         std::size_t& arUnreadBytes) {
    arUnreadBytes = 0;
    ZTCWireReader lReader(aBody);
    try {
        sReadResponse(lReader, aBody, arVisitor);
    } catch (const ZTCDecodeEx& lrProblem) {
        return lrProblem;
    }
    arUnreadBytes = lReader.remaining();
    return std::nullopt;
}
