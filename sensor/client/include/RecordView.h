/// Reads scope data in place, list by list and record by record: it copies and allocates nothing for a record. For
/// receivers that take in tens of thousands of records at once. decodeResponse() makes values of the same bytes.
#ifndef SENSOR_CLIENT_INCLUDE_RECORDVIEW_H
#define SENSOR_CLIENT_INCLUDE_RECORDVIEW_H

#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/Response.h"

/// A record; its spans point into the bytes that it was read from.
struct ZTSRecordView {
    std::uint32_t mOccurrences = 0;
    ZTSReceivedTime mBegin;
    ZTSReceivedTime mEnd;
    std::uint8_t mCategory = 0;
    std::uint8_t mSubcategory = 0;
    std::optional<ZTSReceivedNames> mNames;
    std::span<const std::uint8_t> mEventData;
    std::span<const std::uint8_t> mBytes;  ///< the whole record, as readRecordView() reads it

    ZTSReceivedRecord toRecord() const;
};

/// Reads the record at the front of the bytes. Throws ZTCDecodeEx where there is no whole record.
ZTSRecordView readRecordView(std::span<const std::uint8_t> aBytes);

/// Gets a response's fields in their order.
class ZTCResponseVisitor {
public:
    virtual ~ZTCResponseVisitor() = default;

    /// First, and once: the outcome, with the fields of that outcome. mLists is empty.
    virtual void visitOutcome(const ZTSResponse& acrResponse) = 0;
    /// Before its records.
    virtual void visitList(std::string_view aInitiatorKey) = 0;
    virtual void visitRecord(const ZTSRecordView& acrRecord) = 0;
};

/// Visits every list and record in front of the problem. Returns the problem; nothing where the whole body was read.
/// `arUnreadBytes` becomes the number of bytes behind the last field; 0 where there was a problem.
std::optional<ZTCDecodeEx> visitResponse(std::span<const std::uint8_t> aBody, ZTCResponseVisitor& arVisitor,
                                         std::size_t& arUnreadBytes);

#endif
