/// A scope record: one event kind with one set of identifying data, how often it was seen, and when first and last.
#ifndef TAVIK_INCLUDE_TAVIKRECORD_H
#define TAVIK_INCLUDE_TAVIKRECORD_H

#include <cstdint>

#include "common/include/DateTime.h"
#include "common/include/EncodableStream.h"
#include "common/include/Pointer.h"
#include "sensor/agentcommon/include/ScopeData.h"

/// No lock of its own: guarded by the system's previous-data lock until a retrieval has taken it out of the maps.
class ZTCTavikRecord {
public:
    using ZTMadeWithItsCount = void;

    /// Encoded bytes of the occurrences and the times.
    static constexpr Size gcFixedSize = sizeof(std::uint32_t) + ZTCDateTime::gcEncodedSize + ZTCDateTime::gcEncodedSize;

    /// Encoded bytes beside the event data, at most.
    static constexpr Size gcMostBesideData = gcFixedSize + ZTCScopeData::gcFixedSizeWithNames;

    /// One occurrence, now. Shares the data. Throws ZTCNoMemoryEx.
    explicit ZTCTavikRecord(const ZTCPointer<ZTCScopeData>& acrData);
    virtual ~ZTCTavikRecord() = default;
    ZTCTavikRecord(const ZTCTavikRecord&) = delete;
    ZTCTavikRecord& operator=(const ZTCTavikRecord&) = delete;

    virtual const ZTCPointer<ZTCScopeData>& getScopeData() const { return mScopeData; }
    virtual ZTCPointer<ZTCScopeData>& getScopeData() { return mScopeData; }

    /// When the latest occurrence came.
    const ZTCDateTime& getEndTime() const { return *mEndTimeStamp; }
    std::uint32_t getOccurrences() const { return mOccurences; }

    /// One occurrence more, now. The count wraps at 2^32. Cannot fail, so that the changes around it can be committed
    /// together.
    void incrementOccurrences() noexcept;

    /// Occurrences, begin time, end time, scope data.
    void encode(ZTCEncodableOutStream& arStream) const;

private:
    // The times live in the record itself, and longer than the pointers to them.
    ZTCCounted<ZTCDateTime> mBeginTime;
    ZTCCounted<ZTCDateTime> mEndTime;

    ZTCPointer<ZTCDateTime> mBeginTimeStamp;
    ZTCPointer<ZTCDateTime> mEndTimeStamp;
    std::uint32_t mOccurences;
    ZTCPointer<ZTCScopeData> mScopeData;
};

#endif
